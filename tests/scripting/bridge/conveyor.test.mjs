// SPDX-License-Identifier: Apache-2.0
// conveyor.js in Node, against the real "quilt serve". Run by ctest, which names the program in QUILT_PROGRAM.
import assert from 'node:assert/strict';
import {execFileSync, spawn} from 'node:child_process';
import {mkdtempSync, readFileSync, rmSync, writeFileSync} from 'node:fs';
import {createRequire} from 'node:module';
import {tmpdir} from 'node:os';
import {join} from 'node:path';
import {fileURLToPath} from 'node:url';
import {after, before, test} from 'node:test';

const source = fileURLToPath(new URL('../../..', import.meta.url));
const {connect, ConveyorError} = createRequire(import.meta.url)(join(source, 'quilt/resources/scripting/conveyor.js'));
const folder = mkdtempSync(join(tmpdir(), 'quilt-conveyor-'));
const environment = {PATH: '/usr/bin:/bin', HOME: '/nonexistent', QUILT_LIBRARY: join(folder, 'library')};
const quilt = (...words) => execFileSync(process.env.QUILT_PROGRAM, words, {env: environment, encoding: 'utf8'});
const json = (...words) => JSON.parse(quilt(...words, '--json')).result;

let server;
let address;
let record;

function serve() {
  return new Promise((resolve, reject) => {
    server = spawn(process.env.QUILT_PROGRAM, ['serve', 'Talk'], {env: environment});
    server.stdout.once('data', (line) => resolve(String(line).trim()));
    server.once('exit', (code) => reject(new Error(`quilt serve ended with ${code}`)));
  });
}

before(async () => {
  const picture = join(folder, 'dot.png');
  const dot = 'iVBORw0KGgoAAAANSUhEUgAAAAEAAAABCAYAAAAfFcSJAAAADUlEQVR42mNk+M9QDwADhgGAWjR9awAAAABJRU5ErkJggg==';
  writeFileSync(picture, Buffer.from(dot, 'base64'));
  quilt('new', 'document', 'Talk');
  quilt('set', 'Talk', `theme=${source}/quilt/resources/themes/olive.qth`);
  quilt('add', 'Talk', picture, '--title', 'Dot');
  const item = json('show', 'Talk').Media[0].UUID;
  quilt('add', 'Talk', picture, '--extra-of', item);
  record = join(json('list')[0].documents[0].path, 'properties.plist');
  address = await serve();
});

after(() => {
  server.kill('SIGKILL');
  rmSync(folder, {recursive: true});
});

test('reads and edits, and what is edited is saved', async () => {
  const conveyor = connect(address);
  const document = await conveyor.document();
  assert.equal(await document.cvTitle(), 'Talk');
  assert.equal(await document.cvMediaCount(), 1);
  const item = await document.cvMediaAtIndex(0);
  assert.equal(item.className, 'QuiltMedia');
  assert.equal(await document.cvMediaAtIndex(0), item);
  assert.equal(await document.cvMediaAtIndex(1), null);
  assert.equal(await item.cvTitle(), 'Dot');
  assert.equal(await document.cvSetAuthor('Ann & “Bob” </script>'), null);
  assert.match(readFileSync(record, 'utf8'), /Ann &amp; “Bob” &lt;\/script>|Ann &amp; “Bob” &lt;\/script&gt;/);
  assert.equal(await document.cvAuthor(), 'Ann & “Bob” </script>');
  assert.equal(await (await conveyor.collection()).cvTitle(), 'Imports');
  await conveyor.close();
});

test('offers exactly the accessors that are declared', async () => {
  const declarations = readFileSync(join(source, 'quilt/resources/scripting/conveyor.d.ts'), 'utf8');
  const declared = new Map();
  for (const [, name, body] of declarations.matchAll(/export interface (Quilt\w+) \{\n([^}]*)\}/g)) {
    declared.set(name, [...body.matchAll(/^ {2}(cv\w+)\(/gm)].map((match) => match[1]).sort());
  }
  assert.equal(declared.size, 6);
  const conveyor = connect(address);
  const document = await conveyor.document();
  const item = await document.cvMediaAtIndex(0);
  const part = await item.cvSourceAtIndex(0);
  const objects = [document, await conveyor.collection(), item, part];
  objects.push(await part.cvMainDerivative(), await part.cvPreviewAtIndex(0));
  for (const object of objects) {
    const offered = Object.getOwnPropertyNames(Object.getPrototypeOf(object)).filter((name) => name !== 'constructor');
    assert.deepEqual(offered.sort(), declared.get(object.className), object.className);
    for (const name of offered.filter((one) => !/Set|AtIndex/.test(one))) await object[name]();
  }
  assert.equal(document.update, undefined);
  await conveyor.close();
});

test('tells what is stored from what stands in for it', async () => {
  const conveyor = connect(address);
  const document = await conveyor.document();
  assert.equal(await document.stored('cvTitle'), 'Talk');
  assert.equal(await document.stored('cvDescription'), null);
  const standIn = await document.cvDescription();
  assert.match(standIn, /^Lorem ipsum/);
  await document.cvSetDescription(standIn);
  assert.equal(
    await document.stored('cvDescription'),
    standIn,
    'the same words are a description when they are stored',
  );
  await document.cvSetDescription(null);
  assert.equal(await (await document.cvMediaAtIndex(0)).stored('cvDescription'), null);
  await conveyor.close();
});

test('refuses wrong arguments by a code', async () => {
  const conveyor = connect(address);
  const document = await conveyor.document();
  const refused = (code) => (error) => error instanceof ConveyorError && error.code === code;
  await assert.rejects(document.cvTitle('x'), refused('wrong-arguments'));
  await assert.rejects(document.cvSetTitle(), refused('wrong-arguments'));
  await assert.rejects(document.cvSetTitle(1), refused('wrong-arguments'));
  await assert.rejects(document.cvMediaAtIndex('0'), refused('wrong-arguments'));
  await assert.rejects(document.cvMediaAtIndex(0.5), refused('wrong-arguments'));
  assert.equal(await document.cvTitle(), 'Talk');
  await conveyor.close();
});

test('hears the edits of another client', {timeout: 30000}, async () => {
  const conveyor = connect(address);
  const other = connect(address);
  const document = await conveyor.document();
  const item = await document.cvMediaAtIndex(0);
  const heard = new Promise((resolve) => conveyor.addEventListener('change', resolve));
  const theirs = await (await other.document()).cvMediaAtIndex(0);
  await theirs.cvRemoveExtraAtIndex(0);
  const event = await heard;
  assert.equal(event.type, 'change');
  assert.equal(event.object, item);
  assert.ok(event.accessors.includes('cvExtraCount'));
  assert.equal(await item.cvExtraCount(), 0);
  await Promise.all([conveyor.close(), other.close()]);
});

test('objects end with their session, and the next is another', async () => {
  const conveyor = connect(address);
  const document = await conveyor.document();
  await conveyor.close();
  await assert.rejects(document.cvTitle(), {code: 'no-session'});
  assert.equal(await (await conveyor.document()).cvTitle(), 'Talk');
  await conveyor.close();
});

test('knows addresses from other texts, and a wrong token', async () => {
  assert.throws(() => connect('http://127.0.0.1:80/'), {code: 'bad-address'});
  const wrong = address.replace(/\/[0-9a-f]{32}\//, `/${'0'.repeat(32)}/`);
  await assert.rejects(connect(wrong).document(), {code: 'refused'});
});

test('hears the end of the program, which ends at once', {timeout: 30000}, async () => {
  const conveyor = connect(address);
  await conveyor.document();
  const closed = new Promise((resolve) => conveyor.addEventListener('close', resolve));
  await new Promise((resolve) => setTimeout(resolve, 50));
  const ended = new Promise((resolve) => server.once('exit', resolve));
  server.kill('SIGINT');
  assert.equal((await closed).type, 'close');
  assert.equal(await ended, 130);
});
