// SPDX-License-Identifier: Apache-2.0
// A package that the program builds from a manifest opens, and each of its items plays or shows.
import assert from 'node:assert/strict';
import {execFileSync} from 'node:child_process';
import {existsSync, mkdirSync, readFileSync, rmSync, writeFileSync} from 'node:fs';
import {dirname, join} from 'node:path';
import {before, describe, test} from 'node:test';
import {fileURLToPath} from 'node:url';
import {useBrowser, until} from './support.mjs';

const kProgram =
  process.env.QUILT_PROGRAM || join(dirname(fileURLToPath(import.meta.url)), '../../build/release/cli/quilt');
const kFolder = join(process.env.QUILT_BROWSER_BUILD, 'built');
const kMedia = join(process.env.QUILT_BROWSER_BUILD, 'media');
const media = (name) => join(kMedia, name);

const kManifest = {
  title: 'Built </script> by "the program"',
  author: 'Ann',
  description: 'One of each.',
  theme: 'org.quilt.theme.olive',
  formats: ['Desktop', '480p'],
  collection: {title: 'Tests'},
  media: [
    {source: media('grove-desktop.mp4'), title: 'Movie', extras: [join(kFolder, 'paper.pdf')]},
    {category: 'DualSource', title: 'Lecture', sources: [media('speaker.mp4'), media('slides.mp4')]},
    {source: media('song.m4a'), title: 'Sound'},
    {
      category: 'Montage',
      title: 'Walk',
      commentary: media('voice.m4a'),
      sources: [
        {file: media('still-0.jpg'), timecode: 0},
        {file: media('still-1.jpg'), timecode: 2},
      ],
    },
    {source: join(kFolder, 'paper.pdf'), title: 'Paper'},
    {source: media('sea.png'), title: 'Picture <b>&\u2028 of the sea'},
    {source: 'https://example.org/', title: 'Page'},
  ],
};
const kPaper =
  '%PDF-1.4\n1 0 obj<</Type/Catalog/Pages 2 0 R>>endobj\n2 0 obj<</Type/Pages/Kids[3 0 R]/Count 1>>endobj\n3 0 obj<</Type/Page/Parent 2 0 R/MediaBox[0 0 300 400]>>endobj\ntrailer<</Root 1 0 R>>\n%%EOF\n';
const kShown = {
  Movie: '.stage video',
  DualSource: '.dual video',
  Audio: '.record img',
  Montage: '.stills img.front',
  Document: '.sheet img',
  Image: '.sheet img',
  Web: '.web-card a',
};

describe('a package that the program built', {skip: existsSync(kProgram) ? false : 'the program is not built'}, () => {
  const shared = useBrowser();
  const made = {};

  before(() => {
    rmSync(kFolder, {recursive: true, force: true});
    mkdirSync(kFolder, {recursive: true});
    writeFileSync(join(kFolder, 'paper.pdf'), kPaper);
    writeFileSync(join(kFolder, 'manifest.json'), JSON.stringify(kManifest));
    const printed = execFileSync(
      kProgram,
      ['build', join(kFolder, 'manifest.json'), '--output', join(kFolder, 'out'), '--json', '--progress=none'],
      {encoding: 'utf8', env: {...process.env, XDG_DATA_HOME: kFolder}},
    );
    made.folder = JSON.parse(printed).result.path;
  });

  test('says in its data what the manifest says', () => {
    const script = readFileSync(join(made.folder, 'controllers/data.js'), 'utf8');
    const data = new Function(script + ';return appData;')();
    assert.equal(data.Title, kManifest.title);
    assert.deepEqual(
      data.Media.map((item) => item.Title),
      kManifest.media.map((item) => item.title),
    );
  });

  test('opens from disk without complaint and without network, and shows every item', () =>
    shared.visit(made, async (page) => {
      assert.equal(await page.textContent('h1'), kManifest.title);
      const items = await page.evaluate(() =>
        window.appData.Media.map((item) => ({id: item.UUID, title: item.Title, category: item.ContentCategory})),
      );
      assert.equal(items.length, kManifest.media.length);
      for (const item of items) {
        await page.evaluate((id) => {
          location.hash = '#item=' + id;
        }, item.id);
        await until(
          page,
          (title) => {
            const heading = document.querySelector('#item-title');
            return heading && heading.textContent === title;
          },
          item.title,
        );
        const shown = await page.waitForSelector(kShown[item.category]);
        if (item.category !== 'Web')
          await until(page, (node) => (node.localName === 'img' ? node.naturalWidth > 0 : node.videoWidth > 0), shown);
        if (['Movie', 'DualSource', 'Audio', 'Montage'].includes(item.category)) {
          await page.click('.big-play');
          await until(page, () => window.Olive.app.stage.player.time > 0.3);
        }
        assert.equal(await page.locator('.message').count(), 0, item.title);
      }
    }));
});
