// SPDX-License-Identifier: Apache-2.0
// A document that the real program serves, with the model behind the page.
import {execFileSync, spawn} from 'node:child_process';
import {existsSync, mkdirSync, rmSync, writeFileSync} from 'node:fs';
import {createRequire} from 'node:module';
import {dirname, join} from 'node:path';
import {fileURLToPath} from 'node:url';

const kSource = join(dirname(fileURLToPath(import.meta.url)), '../..');
const {connect} = createRequire(import.meta.url)(join(kSource, 'quilt/resources/scripting/conveyor.js'));

export const kProgram = process.env.QUILT_PROGRAM || join(kSource, 'build/release/cli/quilt');
export const whyNoProgram = existsSync(kProgram) ? false : 'the program is not built';

const kPaper =
  '%PDF-1.4\n1 0 obj<</Type/Catalog/Pages 2 0 R>>endobj\n2 0 obj<</Type/Pages/Kids[3 0 R]/Count 1>>endobj\n3 0 obj<</Type/Page/Parent 2 0 R/MediaBox[0 0 300 400]>>endobj\ntrailer<</Root 1 0 R>>\n%%EOF\n';

/// A property list as another program reads it.
export function readPropertyList(file) {
  const script = 'import json, plistlib, sys; print(json.dumps(plistlib.load(open(sys.argv[1], "rb")), default=str))';
  return JSON.parse(execFileSync('python3', ['-c', script, file], {encoding: 'utf8'}));
}

/// One document in a library of its own. media(name): a file that the fixtures have made.
export class Served {
  constructor(folder, media, manifest) {
    this.folder = folder;
    rmSync(folder, {recursive: true, force: true});
    mkdirSync(folder, {recursive: true});
    writeFileSync(join(folder, 'worksheet.pdf'), kPaper);
    writeFileSync(join(folder, 'notes.pdf'), kPaper);
    writeFileSync(
      join(folder, 'manifest.json'),
      JSON.stringify({
        theme: 'org.quilt.theme.olive',
        ...manifest(media, join(folder, 'worksheet.pdf'), join(folder, 'notes.pdf')),
      }),
    );
    this.environment = {...process.env, XDG_DATA_HOME: folder, QUILT_LIBRARY: join(folder, 'library')};
    this.run(
      'build',
      join(folder, 'manifest.json'),
      '--library',
      this.environment.QUILT_LIBRARY,
      '--output',
      join(folder, 'out'),
      '--json',
      '--progress=none',
    );
    const [{uuid, path}] = JSON.parse(this.run('list', '--json')).result.flatMap((collection) => collection.documents);
    Object.assign(this, {uuid, package: path});
    this.clients = [];
  }

  run(...words) {
    return execFileSync(kProgram, words, {encoding: 'utf8', env: this.environment, stdio: ['ignore', 'pipe', 'pipe']});
  }

  /// The record as Python reads it.
  get record() {
    return readPropertyList(join(this.package, 'properties.plist'));
  }

  async start(...options) {
    this.process = spawn(kProgram, ['serve', this.uuid, ...options], {
      env: this.environment,
      stdio: ['ignore', 'pipe', 'pipe'],
    });
    this.errors = '';
    this.process.stderr.on('data', (data) => {
      this.errors += data;
    });
    this.ended = new Promise((resolve) => this.process.once('exit', resolve));
    this.address = await new Promise((resolve, reject) => {
      this.process.stdout.once('data', (line) => resolve(String(line).trim()));
      this.process.once('exit', (code) => reject(new Error(`quilt serve ended with ${code}: ${this.errors}`)));
    });
    return this.address;
  }

  /// A second client of the model, beside the page.
  async client() {
    const conveyor = connect(this.address);
    this.clients.push(conveyor);
    return conveyor.document();
  }

  async stop(signal = 'SIGINT') {
    for (const client of this.clients.splice(0)) await client.close().catch(() => {});
    if (this.process && this.process.exitCode === null && this.process.signalCode === null) this.process.kill(signal);
    return this.ended;
  }
}
