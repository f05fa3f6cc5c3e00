// SPDX-License-Identifier: Apache-2.0
// For everybody: the accessibility scan, every control by keyboard, narrow screens, writing from right to left, long words,
// paper.
import assert from 'node:assert/strict';
import {mkdirSync, readFileSync} from 'node:fs';
import {createRequire} from 'node:module';
import {join} from 'node:path';
import {describe, test} from 'node:test';
import {fixtures, kShots, start, until, useBrowser} from './support.mjs';

const shared = useBrowser();
const course = fixtures.course();
const kAxe = readFileSync(createRequire(import.meta.url).resolve('axe-core/axe.min.js'), 'utf8');
const kPlaces = [
  ['home', '#'],
  ...['movie', 'lecture', 'audio', 'montage', 'document', 'image', 'web'].map((name, i) => [
    name,
    '#item=' + course.items[i],
  ]),
];
mkdirSync(kShots, {recursive: true});

async function go(page, hash) {
  await page.evaluate((value) => {
    location.hash = value;
  }, hash);
  await page.waitForTimeout(150);
}

async function scan(page, place) {
  await page.evaluate(kAxe);
  const {violations} = await page.evaluate(() =>
    window.axe.run(document, {
      preload: false,
      runOnly: ['wcag2a', 'wcag2aa', 'wcag21a', 'wcag21aa', 'wcag22aa', 'best-practice'],
    }),
  );
  assert.deepEqual(
    violations.map(
      ({id, nodes}) =>
        `${place}: ${id}: ${nodes.map((node) => node.target.join(' ') + ' ' + (node.any[0] ? node.any[0].message : '')).join('; ')}`,
    ),
    [],
  );
}

describe('the accessibility scan finds nothing', () => {
  for (const [name, options, appearance] of [
    ['light', {colorScheme: 'light'}],
    ['dark', {colorScheme: 'dark'}],
    ['high contrast', {}, 'contrast'],
  ]) {
    test(name, () =>
      shared.visit(
        course,
        async (page) => {
          if (appearance) {
            await page.click('button[aria-label="Settings"]');
            await page.selectOption('.settings select >> nth=0', appearance);
            await scan(page, 'settings');
            await page.keyboard.press('Escape');
          }
          for (const [place, hash] of kPlaces) {
            await go(page, hash);
            await scan(page, place);
            if (name !== 'light') await page.screenshot({path: join(kShots, `${place}-${name.replace(' ', '-')}.png`)});
          }
          await page.keyboard.press('/');
          await page.fill('.search-field', 'olive');
          await scan(page, 'search');
          await page.screenshot({path: join(kShots, `search-${name.replace(' ', '-')}.png`)});
          await page.keyboard.press('Escape');
          await page.keyboard.press('?');
          await scan(page, 'help');
          await page.screenshot({path: join(kShots, `help-${name.replace(' ', '-')}.png`)});
        },
        options,
      ));
  }
});

describe('every control', () => {
  test('is reached by the keyboard, named, seen and large enough', () =>
    shared.visit(course, async (page) => {
      for (const [place, hash] of kPlaces) {
        await go(page, hash);
        await page.waitForTimeout(200);
        const all = await page.evaluate(() => {
          document.activeElement.blur();
          window.walk = [];
          const shown = (node) => node.getClientRects().length > 0 && getComputedStyle(node).visibility !== 'hidden';
          return [...document.querySelectorAll('a[href], button, input, select, [tabindex]')].filter(
            (node) => shown(node) && !node.disabled && node.tabIndex >= 0 && !node.closest('[inert]'),
          ).length;
        });
        const seen = new Set();
        for (let i = 0; i < all + 3; ++i) {
          await page.keyboard.press('Tab');
          const found = await page.evaluate(() => {
            const node = document.activeElement;
            if (node === document.body) return null;
            const isNew = !window.walk.includes(node);
            window.walk.push(node);
            const box = node.getBoundingClientRect(),
              style = getComputedStyle(node);
            const x = Math.min(Math.max(box.x + box.width / 2, 1), innerWidth - 1),
              y = Math.min(Math.max(box.y + box.height / 2, 1), innerHeight - 1);
            const top = document.elementFromPoint(x, y);
            const name =
              node.getAttribute('aria-label') ||
              (node.labels && [...node.labels].map((label) => label.textContent).join()) ||
              node.textContent ||
              '';
            return {
              isNew,
              name: name.trim(),
              tag: node.outerHTML.slice(0, 120),
              width: box.width,
              height: box.height,
              outline: style.outlineStyle !== 'none' && Number.parseFloat(style.outlineWidth) >= 2,
              isInside: box.bottom > 0 && box.top < innerHeight && box.right > 0 && box.left < innerWidth,
              isUncovered: !!top && (node.contains(top) || top.contains(node) || !!top.closest('.marks, .transport')),
              isInline: style.display === 'inline',
            };
          });
          if (!found || !found.isNew) continue;
          seen.add(found.tag + i);
          assert.ok(found.name, `${place}: no name: ${found.tag}`);
          assert.ok(found.outline, `${place}: focus is not shown: ${found.tag}`);
          assert.ok(found.isInside, `${place}: outside the window: ${found.tag}`);
          assert.ok(found.isUncovered, `${place}: covered: ${found.tag}`);
          assert.ok(
            found.isInline || (found.width >= 24 && found.height >= 20),
            `${place}: ${found.width} × ${found.height}: ${found.tag}`,
          );
        }
        assert.ok(seen.size >= all, `${place}: ${seen.size} of ${all} reached`);
      }
    }));

  test('of the lists is worked by keys: tabs, chapters, filter', () =>
    shared.visit(
      course,
      async (page) => {
        await page.focus('.tab[aria-selected=true]');
        await page.keyboard.press('ArrowRight');
        assert.equal(await page.getAttribute('.tab >> nth=1', 'aria-selected'), 'true');
        assert.equal(await page.locator('#panel-contents').isVisible(), true);
        assert.match(await page.textContent('#panel-contents [aria-current=true]'), /four seasons/);
        await page.keyboard.press('ArrowLeft');
        await page.focus('#panel-chapters .row >> nth=2');
        await page.keyboard.press('Enter');
        assert.ok(Math.abs((await page.evaluate(() => window.Olive.app.stage.player.time)) - 6) < 0.3);
        await page.keyboard.press('h');
        await page.focus('.chip >> text=Image');
        await page.keyboard.press('Enter');
        assert.equal(await page.locator('.card:visible').count(), 2);
      },
      {hash: '#item=' + course.items[0]},
    ));

  test('names items by their titles first', () =>
    shared.visit(
      course,
      async (page) => {
        const begins = (selector) =>
          page.evaluate((links) => [...document.querySelectorAll(links)].map((link) => link.textContent), selector);
        for (const selector of ['#panel-contents .row', '.card a']) {
          if (selector === '.card a') await go(page, '#');
          const texts = await begins(selector);
          assert.deepEqual(
            texts.map((text, i) => text.startsWith(course.data.Media[i].Title)),
            course.data.Media.map(() => true),
          );
        }
        const [thumb, text] = [
          await page.locator('.card .thumb').first().boundingBox(),
          await page.locator('.card-text').first().boundingBox(),
        ];
        assert.ok(thumb.y < text.y, 'the picture is above');
      },
      {hash: '#item=' + course.items[0]},
    ));

  test('of letters lies where it lies on other keyboards; Home and End are the slider’s', () =>
    shared.visit(
      course,
      async (page) => {
        const time = () => page.evaluate(() => window.Olive.app.stage.player.time);
        const type = (key, code) =>
          page.evaluate(
            ([letter, place]) =>
              document
                .querySelector('.player')
                .dispatchEvent(new KeyboardEvent('keydown', {key: letter, code: place, bubbles: true})),
            [key, code],
          );
        await page.evaluate(() => window.Olive.app.stage.player.seek(0));
        for (const [key, expected] of [
          ['д', 10],
          ['م', 20],
          ['λ', 20],
        ]) {
          await type(key, 'KeyL'); // Russian, Arabic, Greek
          assert.ok(Math.abs((await time()) - expected) < 0.3, `${key}: ${await time()}`);
        }
        await type('j', 'KeyC'); // a Latin keyboard with letters elsewhere
        assert.ok(Math.abs((await time()) - 10) < 0.3);
        await page.focus('.volume');
        await page.keyboard.press('Home');
        assert.equal(await page.inputValue('.volume'), '0');
        assert.ok(Math.abs((await time()) - 10) < 0.3, 'the time stays');
        await page.keyboard.press('End');
        assert.equal(await page.inputValue('.volume'), '1');
      },
      {hash: '#item=' + course.items[1]},
    ));

  test('behind a presentation cannot be reached', () =>
    shared.visit(
      course,
      async (page) => {
        await page.keyboard.press('v');
        for (let i = 0; i < 12; ++i) {
          await page.keyboard.press('Tab');
          const place = await page.evaluate(
            () => document.activeElement === document.body || !!document.activeElement.closest('.player'),
          );
          assert.ok(place, 'the focus stays in the player');
        }
        await page.keyboard.press('Escape');
        assert.equal(await page.evaluate(() => document.querySelectorAll('[inert]:not(.stage *)').length), 0);
      },
      {hash: '#item=' + course.items[4]},
    ));

  test('that changes the arrangement tells it, each time', () =>
    shared.visit(
      course,
      async (page) => {
        const told = [];
        for (let i = 0; i < 3; ++i) {
          await page.keyboard.press('s');
          told.push(await page.textContent('#announcements'));
        }
        assert.ok(told.every((text) => text.trim() === 'Pictures swapped'));
        assert.ok(told[0] !== told[1] && told[1] !== told[2], 'it differs from what was said before');
        await page.keyboard.press('d');
        assert.match(await page.textContent('#announcements'), /Second picture in the corner/);
      },
      {hash: '#item=' + course.items[1]},
    ));

  test('gives the focus back when a dialog closes', () =>
    shared.visit(course, async (page) => {
      await page.focus('button[aria-label="Keyboard"]');
      await page.keyboard.press('Enter');
      await page.waitForSelector('.help-dialog');
      await page.keyboard.press('Escape');
      assert.equal(await page.evaluate(() => document.activeElement.getAttribute('aria-label')), 'Keyboard');
    }));
});

describe('narrow and short windows', () => {
  for (const [width, height] of [
    [320, 640],
    [320, 256],
    [568, 320],
    [768, 1024],
  ]) {
    test(`${width} × ${height} lose nothing and do not scroll sideways`, () =>
      shared.visit(
        course,
        async (page) => {
          for (const [place, hash] of kPlaces) {
            await go(page, hash);
            assert.ok(
              await page.evaluate(() => document.documentElement.scrollWidth <= innerWidth),
              `${place} is too wide`,
            );
            const beyond = await page.evaluate(() =>
              [...document.querySelectorAll('#app button, #app a, #app select, #app input')]
                .filter((node) => {
                  const box = node.getBoundingClientRect();
                  return box.width && (box.right > innerWidth + 1 || box.left < -1) && !node.matches('.skip');
                })
                .map((node) => node.outerHTML.slice(0, 100)),
            );
            assert.deepEqual(beyond, [], place);
            const cut = await page.evaluate(() => {
              const stage = document.querySelector('.stage');
              const box = stage?.getBoundingClientRect();
              return [...document.querySelectorAll('.pane, .big-play, .web-card, .record')]
                .filter((node) => {
                  const inner = node.getBoundingClientRect();
                  return inner.top < box.top - 1 || inner.bottom > box.bottom + 1;
                })
                .map((node) => node.className);
            });
            assert.deepEqual(cut, [], `${place} is cut off`);
            if (width === 320 && height === 640)
              await page.screenshot({path: join(kShots, `${place}-320.png`), fullPage: true});
          }
        },
        {viewport: {width, height}},
      ));
  }

  test('a film that stands upright fills a narrow screen', () => {
    const made = fixtures.portrait();
    return shared.visit(
      made,
      async (page) => {
        await start(page);
        const [stage, video] = [
          await page.locator('.stage').boundingBox(),
          await page.evaluate(() => {
            const node = document.querySelector('video');
            return node.videoWidth / node.videoHeight;
          }),
        ];
        assert.ok(stage.height > stage.width, `${stage.width} × ${stage.height}`);
        assert.ok(Math.min(stage.width, stage.height * video) > 0.75 * stage.width, 'the picture is wide enough');
      },
      {viewport: {width: 390, height: 780}},
    );
  });
});

describe('languages', () => {
  test('are taken from the browser; Arabic runs from right to left, its controls do not', () =>
    shared.visit(
      course,
      async (page) => {
        assert.deepEqual(await page.evaluate(() => [document.documentElement.lang, document.documentElement.dir]), [
          'ar',
          'rtl',
        ]);
        assert.match(await page.textContent('.hero .primary'), /ابدأ/);
        await page.screenshot({path: join(kShots, 'home-arabic.png')});
        await go(page, '#item=' + course.items[0]);
        assert.equal(
          await page.evaluate(() => getComputedStyle(document.querySelector('.transport')).direction),
          'ltr',
        );
        const [frame, side] = [await page.locator('.player').boundingBox(), await page.locator('.side').boundingBox()];
        assert.ok(side.x < frame.x, 'the lists stand on the left');
        await page.screenshot({path: join(kShots, 'movie-arabic.png')});
        await scan(page, 'arabic');
        assert.ok(await page.evaluate(() => document.documentElement.scrollWidth <= innerWidth));
      },
      {locale: 'ar-EG'},
    ));

  test('are changed in the settings, and kept', () =>
    shared.visit(course, async (page) => {
      for (const [tag, word] of [
        ['de', 'Beginnen'],
        ['fr', 'Commencer'],
        ['es', 'Empezar'],
        ['ja', '始める'],
        ['ar', 'ابدأ'],
        ['en', 'Start'],
      ]) {
        await page.click('.head-tools .icon-button >> nth=1');
        await page.selectOption('.settings select >> nth=1', tag);
        await until(page, (language) => document.documentElement.lang === language, tag);
        await page.keyboard.press('Escape');
        assert.equal((await page.textContent('.hero .primary')).trim(), word);
        assert.equal(await page.evaluate(() => document.documentElement.lang), tag);
      }
      await page.click('.head-tools .icon-button >> nth=1');
      await page.selectOption('.settings select >> nth=1', 'fr');
      await until(page, () => document.documentElement.lang === 'fr');
      await page.reload();
      assert.match(await page.textContent('.facts'), /9 éléments/);
    }));

  test('with longer words fit as well', () =>
    shared.visit(course, async (page, {context}) => {
      await context.addInitScript(() => {
        addEventListener(
          'DOMContentLoaded',
          () => {
            const {en} = window.Olive.languages;
            const longer = (word) =>
              typeof word === 'string'
                ? `⟦${word.replace(/[aeiou]/g, '$&$&')} ~~~⟧`
                : Object.fromEntries(Object.entries(word).map(([form, text]) => [form, longer(text)]));
            window.Olive.languages.en = {
              ...en,
              words: Object.fromEntries(Object.entries(en.words).map(([key, word]) => [key, longer(word)])),
            };
          },
          true,
        );
      });
      // The listener must run before the theme's own, so the page is loaded anew.
      await page.reload();
      for (const width of [320, 1280]) {
        await page.setViewportSize({width, height: 800});
        for (const [place, hash] of kPlaces) {
          await go(page, hash);
          assert.ok(
            await page.evaluate(() => document.documentElement.scrollWidth <= innerWidth),
            `${place} at ${width}`,
          );
        }
      }
      assert.match(await page.textContent('.search-button'), /⟦Seeaarch/);
      await page.screenshot({path: join(kShots, 'web-pseudo.png')});
    }));
});

describe('preferences of the system', () => {
  test('no motion: nothing moves', () =>
    shared.visit(
      course,
      async (page) => {
        const moving = await page.evaluate(
          () =>
            [...document.querySelectorAll('*')].filter((node) => {
              const style = getComputedStyle(node);
              return style.transitionDuration.split(',').some((value) => Number.parseFloat(value) > 0);
            }).length,
        );
        assert.equal(moving, 0);
      },
      {hash: '#item=' + course.items[3]},
    ));

  test('motion can be switched off by the reader as well', () =>
    shared.visit(
      course,
      async (page) => {
        const duration = () =>
          page.evaluate(() =>
            Number.parseFloat(getComputedStyle(document.querySelector('.icon-button')).transitionDuration),
          );
        assert.ok((await duration()) > 0);
        await page.click('button[aria-label="Settings"]');
        await page.click('text=Animations');
        assert.equal(await duration(), 0);
      },
      {reducedMotion: 'no-preference'},
    ));

  test('forced colours keep the controls', () =>
    shared.visit(
      course,
      async (page) => {
        await page.waitForSelector('.transport');
        assert.equal(await page.evaluate(() => matchMedia('(forced-colors: active)').matches), true);
        await page.screenshot({path: join(kShots, 'movie-forced.png')});
        await scan(page, 'forced colours');
      },
      {forcedColors: 'active', hash: '#item=' + course.items[0]},
    ));
});

describe('on paper', () => {
  test('stand contents, posters, descriptions, chapters, pages and links, but no controls', () =>
    shared.visit(course, async (page) => {
      await page.evaluate(() => {
        window.print = () => {
          window.printed = true;
        };
      });
      await page.click('button[aria-label="Print"]');
      await until(page, () => window.printed);
      await page.emulateMedia({media: 'print'});
      const text = await page.innerText('body');
      for (const expected of [
        'From Tree to Table',
        'Spring, the first blossoms',
        'Stone crushes, steel cleans.',
        'https://example.org/olives?from=quilt',
        'Worksheet',
      ])
        assert.ok(text.includes(expected), expected);
      assert.equal(await page.locator('button:visible, select:visible, input:visible').count(), 0);
      assert.equal(await page.locator('#paper a[href="https://example.org/olives?from=quilt"]').count(), 1);
      assert.ok(
        await page.evaluate(() =>
          [...document.querySelectorAll('#paper img')].every((image) => image.naturalWidth > 0),
        ),
      );
      const pdf = await page.pdf();
      assert.equal(pdf.subarray(0, 4).toString(), '%PDF');
      await page.evaluate(() => dispatchEvent(new Event('afterprint')));
      assert.equal(await page.locator('#paper').count(), 0);
    }));

  test('the browser’s own print command does the same', () =>
    shared.visit(course, async (page) => {
      await page.evaluate(() => dispatchEvent(new Event('beforeprint')));
      assert.equal(await page.locator('#paper .printed-item').count(), 9);
    }));
});
