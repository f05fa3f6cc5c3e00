// SPDX-License-Identifier: Apache-2.0
// How large the pictures are, what lies over them, and what a finger does.
import assert from 'node:assert/strict';
import {rmSync} from 'node:fs';
import {join} from 'node:path';
import {describe, test} from 'node:test';
import {fixtures, playerState, playing, start, until, useBrowser} from './support.mjs';

const shared = useBrowser();
const course = fixtures.course();
const item = (index, options) => ({hash: `#item=${course.items[index]}`, ...options});
const kExpected = {quiet: false}; // the browser itself complains about missing files

const boxOf = (page, selector) => page.locator(selector).boundingBox();
const pictures = (page) =>
  page.evaluate(() =>
    [...document.querySelectorAll('.pane video')].map((video) => {
      const {width, height} = video.getBoundingClientRect();
      const ratio = video.videoWidth / video.videoHeight;
      return {width: Math.min(width, height * ratio), height: Math.min(height, width / ratio)};
    }),
  );
const known = (page) =>
  until(page, () => [...document.querySelectorAll('.pane video')].every((each) => each.videoWidth));

describe('a lecture', () => {
  test('gives the slides two thirds beside the lists, and more in one press', () =>
    shared.visit(
      course,
      async (page) => {
        await known(page);
        const [speaker, slides] = await pictures(page);
        assert.ok(slides.width >= 600 && slides.height >= 338, `${slides.width} × ${slides.height}`);
        assert.ok(Math.abs(slides.width / (slides.width + speaker.width) - 0.67) < 0.01);
        assert.ok((await boxOf(page, '.side')).width > 0);
        await page.click('button[aria-label="Wide stage"]');
        const [, larger] = await pictures(page);
        assert.ok(larger.width >= 820 && larger.height >= 461, `${larger.width} × ${larger.height}`);
        const bar = await boxOf(page, '.transport');
        assert.ok(bar.y + bar.height <= 800, 'the controls are in the window');
        await page.reload();
        await known(page);
        assert.equal(Math.round((await pictures(page))[1].width), Math.round(larger.width), 'the choice is kept');
      },
      item(1),
    ));

  test('has no stage beyond the larger picture', () =>
    shared.visit(
      course,
      async (page) => {
        await known(page);
        for (const view of ['side', 'corner', 'first', 'second']) {
          await page.click(`button[data-view="${view}"]`);
          const stage = await boxOf(page, '.stage');
          const largest = Math.max(...(await pictures(page)).map((picture) => picture.height));
          assert.ok(stage.height - largest < 8, `${view}: ${stage.height} around ${largest}`);
        }
      },
      item(1),
    ));

  for (const [width, height] of [
    [390, 780],
    [768, 1024],
    [1080, 1920],
  ]) {
    test(`stands one above the other at ${width} × ${height}`, () =>
      shared.visit(
        course,
        async (page) => {
          await known(page);
          const [first, second] = await pictures(page);
          assert.ok(Math.abs(first.width - second.width) < 2);
          assert.ok(first.width > width * 0.9, `${first.width}`);
          assert.equal(await page.locator('.divider').isVisible(), false);
        },
        item(1, {viewport: {width, height}}),
      ));
  }

  test('fits the window when it is low', () =>
    shared.visit(
      course,
      async (page) => {
        const bar = await boxOf(page, '.transport');
        assert.ok(bar.y + bar.height <= 600, `${bar.y + bar.height}`);
      },
      item(1, {viewport: {width: 1600, height: 600}}),
    ));

  test('closes the lists beside it, and opens them again', () =>
    shared.visit(
      course,
      async (page) => {
        const before = (await boxOf(page, '.stage')).width;
        await page.click('button[aria-label="Close the lists"]');
        assert.equal(await page.locator('.side').isVisible(), false);
        assert.ok((await boxOf(page, '.stage')).width > before * 1.3);
        assert.equal(await page.evaluate(() => document.activeElement.classList.contains('side-toggle')), true);
        await page.keyboard.press('Enter');
        assert.equal(await page.locator('.side').isVisible(), true);
      },
      item(1),
    ));

  test('is divided by a press as well as by dragging', () =>
    shared.visit(
      course,
      async (page) => {
        await start(page);
        const shares = [];
        for (let i = 0; i < 3; ++i) {
          await page.click('.divider');
          shares.push(await page.getAttribute('.divider', 'aria-valuenow'));
        }
        assert.deepEqual(shares, ['50', '67', '33']);
      },
      item(1),
    ));

  test('of a voice and slides shows the slides alone, without buttons to arrange them', () =>
    shared.visit(fixtures.voiceAndSlides(), async (page) => {
      assert.equal(await page.locator('.views, .divider').count(), 0);
      await start(page);
      const [stage, slides] = [await boxOf(page, '.stage'), await boxOf(page, '.stage video')];
      assert.ok(Math.abs(stage.width - slides.width) < 1 && Math.abs(stage.height - slides.height) < 1);
      assert.equal((await playerState(page)).duration, 20);
    }));
});

describe('the stage', () => {
  test('has the shape of its picture', async () => {
    for (const [index, ratio] of [
      [0, 16 / 9],
      [3, 16 / 9],
      [5, 16 / 9],
    ]) {
      await shared.visit(
        course,
        async (page) => {
          const {width, height} = await boxOf(page, '.stage');
          assert.ok(Math.abs(width / height - ratio) < 0.02, `${index}: ${width} × ${height}`);
        },
        item(index, {viewport: {width: 1280, height: 500}}),
      );
    }
    await shared.visit(fixtures.portrait(), async (page) => {
      const {width, height} = await boxOf(page, '.stage');
      assert.ok(Math.abs(width / height - 9 / 16) < 0.02, `${width} × ${height}`);
    });
  });

  test('is played by a click and fills the screen by two', () =>
    shared.visit(
      course,
      async (page) => {
        await start(page);
        await page.click('.stage', {position: {x: 200, y: 100}});
        assert.equal((await playerState(page)).isPlaying, false);
        await page.dblclick('.stage', {position: {x: 200, y: 100}});
        await until(page, () => document.fullscreenElement?.matches('.player'));
        assert.equal((await playerState(page)).isPlaying, false, 'two clicks leave it as it was');
        await page.dblclick('.stage', {position: {x: 200, y: 100}});
        await until(page, () => !document.fullscreenElement);
      },
      item(0),
    ));
});

describe('on a phone that lies on its side', () => {
  const phone = {viewport: {width: 640, height: 360}, hasTouch: true};
  const isFaded = (page) => page.evaluate(() => getComputedStyle(document.querySelector('.transport')).opacity === '0');

  test('everything needed is in the window, the controls over the picture, and they fade', () =>
    shared.visit(
      course,
      async (page) => {
        const [stage, bar] = [await boxOf(page, '.stage'), await boxOf(page, '.transport')];
        assert.ok(stage.y + stage.height <= 361 && stage.height > 290, `${stage.y} + ${stage.height}`);
        assert.ok(bar.y < stage.y + stage.height && bar.y + bar.height <= 361, `${bar.y} + ${bar.height}`);
        await page.tap('.big-play');
        await playing(page);
        await until(page, () => document.documentElement.classList.contains('idle'));
        assert.equal(await isFaded(page), true);
        await page.tap('.stage', {position: {x: 300, y: 100}});
        assert.equal(await isFaded(page), false, 'the first tap brings the controls');
        await page.waitForTimeout(400);
        assert.equal((await playerState(page)).isPlaying, true, 'and leaves the film alone');
        await page.tap('.stage', {position: {x: 300, y: 100}});
        await until(page, () => !window.Olive.app.stage.player.isPlaying);
        await page.waitForTimeout(2800);
        assert.equal(await isFaded(page), false, 'they stay while it stands');
      },
      item(0, phone),
    ));

  test('two taps at the sides skip ten seconds', () =>
    shared.visit(
      course,
      async (page) => {
        await page.tap('.big-play');
        await playing(page);
        await page.evaluate(() => window.Olive.app.stage.player.pause());
        const time = async () => Math.round((await playerState(page)).time);
        const before = await time();
        const {x, y, width} = await boxOf(page, '.stage');
        const twice = async (share) => {
          for (let i = 0; i < 2; ++i) await page.touchscreen.tap(x + width * share, y + 80);
          await page.waitForTimeout(400);
        };
        await twice(0.9);
        assert.equal(await time(), before + 10);
        await twice(0.1);
        assert.equal(await time(), before);
        assert.equal((await playerState(page)).isPlaying, false);
      },
      item(1, phone),
    ));

  test('a swipe turns pages and pictures', () =>
    shared.visit(
      course,
      async (page, {context}) => {
        const session = await context.newCDPSession(page);
        const swipe = async (by) => {
          const {x, y, width} = await boxOf(page, '.stage');
          const at = (share) => [{x: x + width / 2 + by * share, y: y + 60}];
          await session.send('Input.dispatchTouchEvent', {type: 'touchStart', touchPoints: at(0)});
          for (const share of [0.3, 0.7, 1])
            await session.send('Input.dispatchTouchEvent', {type: 'touchMove', touchPoints: at(share)});
          await session.send('Input.dispatchTouchEvent', {type: 'touchEnd', touchPoints: []});
        };
        await until(page, () => document.querySelector('.page-number')?.value === '1');
        await swipe(-120);
        await until(page, () => document.querySelector('.page-number').value === '2');
        await swipe(120);
        await until(page, () => document.querySelector('.page-number').value === '1');
        await page.evaluate((hash) => {
          location.hash = hash;
        }, `#item=${course.items[3]}`);
        await until(page, () => document.querySelector('.stills img.front'));
        await page.tap('.big-play');
        await swipe(-120);
        await until(page, () => document.querySelector('.stills img.front').alt === 'The gate');
      },
      item(4, phone),
    ));
});

describe('the controls', () => {
  for (const width of [320, 390, 640, 768, 1000, 1280, 1600]) {
    test(`lie in one row at ${width} pixels, and nothing is lost`, () =>
      shared.visit(
        course,
        async (page) => {
          for (const index of [0, 1, 2, 3, 4, 5, 7, 8]) {
            await page.evaluate((hash) => {
              location.hash = hash;
            }, `#item=${course.items[index]}`);
            await until(
              page,
              (title) => document.querySelector('#item-title')?.textContent === title,
              course.data.Media[index].Title,
            );
            const rows = await page.evaluate(() =>
              [...document.querySelectorAll('.player .buttons')].map((row) => {
                const boxes = [...row.children].map((node) => node.getBoundingClientRect()).filter((box) => box.width);
                const middles = boxes.map((box) => box.top + box.height / 2);
                const {right} = row.getBoundingClientRect();
                return {
                  spread: Math.max(...middles) - Math.min(...middles),
                  beyond: Math.max(...boxes.map((box) => box.right)) - right,
                };
              }),
            );
            for (const {spread, beyond} of rows) assert.ok(spread < 3 && beyond < 1, `${index}: ${spread}, ${beyond}`);
          }
          await page.evaluate((hash) => {
            location.hash = hash;
          }, `#item=${course.items[1]}`);
          await until(page, () => document.querySelector('.dual'));
          await page.click('.player .menu-place > button');
          const words = await page.innerText('.menu');
          for (const word of ['Side by side', 'Speed', 'Present', 'Print', 'Picture in picture'])
            assert.ok(words.includes(word), word);
        },
        {viewport: {width, height: 900}},
      ));
  }

  test('have a menu of choices that keys work and Escape leaves', () =>
    shared.visit(
      course,
      async (page) => {
        const button = page.locator('button[aria-label="Speed, quality and more"]');
        await button.focus();
        await page.keyboard.press('Enter');
        assert.equal(await button.getAttribute('aria-expanded'), 'true');
        assert.equal(await page.evaluate(() => document.activeElement.value), '1', 'the focus is on what is chosen');
        await page.keyboard.press('ArrowRight');
        assert.equal((await playerState(page)).speed, 1.25);
        assert.equal((await playerState(page)).time, 0, 'the arrow was for the menu');
        await page.keyboard.press('Escape');
        assert.equal(await button.getAttribute('aria-expanded'), 'false');
        assert.equal(await page.textContent('.menu-badge'), '1.25×');
        await button.click();
        await page.click('h1');
        assert.equal(await button.getAttribute('aria-expanded'), 'false');
      },
      item(0),
    ));

  test('lie over the picture in full screen and fade', () =>
    shared.visit(
      course,
      async (page) => {
        await start(page);
        await page.keyboard.press('f');
        await until(page, () => document.fullscreenElement);
        const [stage, bar] = [await boxOf(page, '.stage'), await boxOf(page, '.transport')];
        assert.ok(stage.y + stage.height >= bar.y + bar.height - 1, 'the picture reaches below the controls');
        await until(page, () => document.documentElement.classList.contains('idle'));
        await page.mouse.move(300, 300);
        assert.equal(await page.evaluate(() => document.documentElement.classList.contains('idle')), false);
      },
      item(0),
    ));
});

describe('what is missing', () => {
  const without = (name, index, pick) => {
    const made = fixtures.incomplete(name);
    rmSync(join(made.folder, pick(made.data.Media[index])));
    return [made, {...kExpected, hash: '#item=' + made.items[index]}];
  };

  test('a film that fails names its file, and its controls are off', () => {
    const [made, options] = without('no-film', 7, (media) => media.Sources[0].Derivatives[0].RelativePath);
    rmSync(join(made.folder, made.data.Media[7].AudioCommentarySource.Derivatives[0].RelativePath));
    return shared.visit(
      made,
      async (page) => {
        await page.waitForSelector('.message');
        await until(page, () => document.querySelector('.play').disabled);
        const name = made.data.Media[7].Sources[0].Derivatives[0].Filename;
        assert.ok((await page.textContent('.stage')).includes(name), name);
        assert.equal(await page.isDisabled('.seek'), true);
        assert.equal(await page.isDisabled('.fullscreen'), false);
        await page.keyboard.press('k');
        assert.equal((await playerState(page)).isPlaying, false);
      },
      options,
    );
  });

  test('a montage whose voice is missing shows its pictures by the clock', () => {
    const [made, options] = without(
      'no-montage-voice',
      3,
      (media) => media.AudioCommentarySource.Derivatives[0].RelativePath,
    );
    return shared.visit(
      made,
      async (page) => {
        await page.waitForSelector('.message');
        await page.click('.message .dismiss');
        await page.click('.big-play');
        await until(page, () => window.Olive.app.stage.player.time > 0.5);
        await page.evaluate(() => window.Olive.app.stage.player.seek(4.3));
        await until(page, () => document.querySelector('.stills img.front').alt === 'The gate');
        assert.equal((await playerState(page)).isPlaying, true);
        assert.equal((await playerState(page)).duration, 20);
      },
      options,
    );
  });

  test('the film’s own sound comes back when a shorter commentary ends', () =>
    shared.visit(fixtures.shortVoice(), async (page) => {
      await start(page);
      await page.click('button[aria-label="Audio commentary"]');
      const muted = () =>
        page.evaluate(() => window.Olive.app.stage.player.streams.map((stream) => stream.element.muted));
      assert.deepEqual(await muted(), [true, false]);
      await page.evaluate(() => window.Olive.app.stage.player.seek(3.4));
      await until(page, () => window.Olive.app.stage.player.time > 4.5);
      assert.deepEqual(await muted(), [false, true], 'the film is heard again');
      await page.evaluate(() => window.Olive.app.stage.player.seek(1));
      await until(page, () => !window.Olive.app.stage.player.streams[1].element.muted);
      assert.deepEqual(await muted(), [true, false], 'and the voice where it speaks');
    }));
});
