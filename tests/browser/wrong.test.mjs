// SPDX-License-Identifier: Apache-2.0
// Packages that are incomplete, damaged or hostile, and readers without scripts.
import assert from 'node:assert/strict';
import {cpSync, mkdirSync, rmSync} from 'node:fs';
import {join} from 'node:path';
import {describe, test} from 'node:test';
import {fixtures, kShots, playerState, start, until, useBrowser} from './support.mjs';

const shared = useBrowser();
const expected = {quiet: false}; // the browser itself complains about missing files

describe('a reader is told what is wrong', () => {
  test('when index.html is all there is', () => {
    const made = fixtures.incomplete('lonely-page', 'olive', 'controllers', 'media', 'JukeboxArtwork');
    return shared.visit(
      made,
      async (page) => {
        assert.equal(await page.locator('#notice').isVisible(), true);
        assert.match(await page.textContent('#notice'), /extract the whole archive first/);
      },
      expected,
    );
  });

  test('when the data script is missing', () => {
    const made = fixtures.incomplete('no-data', 'controllers/data.js');
    return shared.visit(
      made,
      async (page) => {
        await until(page, () => document.querySelector('#notice-cause').textContent !== '');
        assert.equal(await page.textContent('#notice-cause'), 'Missing in this package: controllers/data.js');
        assert.equal(await page.locator('#notice').isVisible(), true);
        await page.screenshot({path: join(kShots, 'notice-1280.png')});
      },
      expected,
    );
  });

  test('when a script of the theme is missing', () => {
    const made = fixtures.incomplete('no-player', 'olive/player.js');
    return shared.visit(
      made,
      async (page) => {
        await until(
          page,
          () => document.querySelector('#notice-cause').textContent === 'Missing in this package: olive/player.js',
        );
      },
      expected,
    );
  });

  test('when the page lies inside an archive', () => {
    const made = fixtures.incomplete('no-data', 'controllers/data.js');
    const inside = fixtures.path('course.zip');
    rmSync(inside, {recursive: true, force: true});
    mkdirSync(inside, {recursive: true});
    cpSync(made.folder, inside, {recursive: true});
    return shared.visit(
      {folder: inside},
      async (page) => {
        await until(page, () => /inside a zip archive/.test(document.querySelector('#notice-cause').textContent));
      },
      expected,
    );
  });

  test('when scripts are off', () =>
    shared.visit(
      fixtures.single(),
      async (page) => {
        assert.match(await page.innerText('#notice'), /Scripts are switched off/);
      },
      {javaScriptEnabled: false},
    ));

  test('when a media file is missing, with the rest at hand', () => {
    const course = fixtures.course();
    const film = course.data.Media[2].Sources[0].Derivatives[0].RelativePath;
    const made = fixtures.incomplete('no-song', film);
    return shared.visit(
      made,
      async (page) => {
        await page.waitForSelector('.message');
        assert.match(await page.textContent('.message'), /cannot be played here/);
        assert.equal(await page.getAttribute('.message a', 'href'), film);
      },
      {...expected, hash: '#item=' + made.items[2]},
    );
  });
});

test('a picture whose voice is missing is shown all the same', () => {
  const course = fixtures.course();
  const made = fixtures.incomplete('no-voice', course.data.Media[8].AudioCommentarySource.Derivatives[0].RelativePath);
  return shared.visit(
    made,
    async (page) => {
      await page.waitForSelector('.message');
      await until(page, () => document.querySelector('.sheet img').naturalWidth > 0);
      await page.keyboard.press('k');
      assert.equal((await playerState(page)).isPlaying, false);
    },
    {...expected, hash: '#item=' + made.items[8]},
  );
});

describe('one broken film among ten', () => {
  const broken = fixtures.broken();

  test('says so, keeps its poster, and the other nine play', () =>
    shared.visit(
      broken,
      async (page) => {
        for (const [i, id] of broken.items.entries()) {
          await page.evaluate((hash) => {
            location.hash = hash;
          }, '#item=' + id);
          await until(
            page,
            (title) =>
              document.querySelector('#item-title') && document.querySelector('#item-title').textContent === title,
            `Film ${i + 1}`,
          );
          if (i === 3) {
            await page.waitForSelector('.message');
            assert.equal(await page.evaluate(() => document.querySelector('.cover-picture').naturalWidth > 0), true);
            assert.equal(await page.locator('.message button').isVisible(), true);
            await page.screenshot({path: join(kShots, 'broken-1280.png')});
          } else {
            await start(page);
            assert.equal(await page.locator('.message').count(), 0);
          }
        }
      },
      expected,
    ));

  test('falls to another grade when the chosen one is damaged', () =>
    shared.visit(
      broken,
      async (page) => {
        await start(page);
        assert.deepEqual(await page.evaluate(() => window.Olive.app.stage.player.leader.grades.current.grades), [
          '480p',
        ]);
      },
      {...expected, hash: '#item=' + broken.items[6]},
    ));
});

describe('hostile texts', () => {
  const hostile = fixtures.hostile();

  test('stay texts: no script runs, no address but those of the web is a link', () =>
    shared.visit(hostile, async (page) => {
      assert.match(await page.textContent('h1'), /<img src=x onerror/);
      for (const id of hostile.items) {
        await page.evaluate((hash) => {
          location.hash = hash;
        }, '#item=' + encodeURIComponent(id));
        await page.waitForSelector('#item-title');
        await page.waitForTimeout(100);
      }
      await page.keyboard.press('/');
      await page.fill('.search-field', 'script');
      await page.waitForSelector('.hit');
      assert.equal(await page.evaluate(() => window.hacked), undefined);
      const links = await page.evaluate(() => [...document.links].map((link) => link.protocol));
      assert.ok(
        links.every((protocol) => ['file:', 'http:', 'https:', 'mailto:'].includes(protocol)),
        links.join(),
      );
      assert.equal(
        await page.evaluate(
          () => document.querySelectorAll('#app script, dialog script, #app [onerror], #app [onclick]').length,
        ),
        0,
      );
    }));

  test('do not burst the page', () =>
    shared.visit(
      hostile,
      async (page) => {
        for (const hash of ['#', '#item=' + encodeURIComponent('a b&c=<d>'), '#item=' + hostile.items[2]]) {
          await page.evaluate((value) => {
            location.hash = value;
          }, hash);
          await page.waitForTimeout(200);
          assert.ok(await page.evaluate(() => document.documentElement.scrollWidth <= innerWidth), hash);
        }
      },
      {viewport: {width: 320, height: 640}},
    ));

  test('a file name with spaces, signs and foreign letters plays', () =>
    shared.visit(
      hostile,
      async (page) => {
        await start(page);
        assert.ok((await playerState(page)).time > 0);
      },
      {hash: '#item=' + encodeURIComponent('a b&c=<d>')},
    ));

  test('items without anything to show say so', () =>
    shared.visit(
      hostile,
      async (page) => {
        assert.match(await page.textContent('.message'), /nothing to show/);
      },
      {hash: '#item=' + hostile.items[4]},
    ));

  test('a link that is a script is no link', () =>
    shared.visit(
      hostile,
      async (page) => {
        assert.match(await page.textContent('.web-card'), /cannot be opened/);
        assert.equal(await page.locator('.web-card a').count(), 0);
      },
      {hash: '#item=' + hostile.items[1]},
    ));
});

test('a browser that keeps nothing leaves everything working', () => {
  const single = fixtures.single();
  return shared.visit(single, async (page, {context}) => {
    await context.addInitScript(() =>
      Object.defineProperty(window, 'localStorage', {
        get() {
          throw new DOMException('denied', 'SecurityError');
        },
      }),
    );
    await page.reload();
    await start(page);
  });
});
