// SPDX-License-Identifier: Apache-2.0
// Keys, links, memory, grades, speed, presentation, search.
import assert from 'node:assert/strict';
import {describe, test} from 'node:test';
import {fileUrl} from './browser.mjs';
import {choose, fixtures, playerState, playing, start, until, useBrowser} from './support.mjs';

const shared = useBrowser();
const course = fixtures.course();
const item = (index, more = '') => ({hash: `#item=${course.items[index]}${more}`});
const near = (value, expected, within = 0.35) =>
  assert.ok(Math.abs(value - expected) <= within, `${value} is not ${expected}`);
const time = async (page) => (await playerState(page)).time;

describe('the keyboard', () => {
  test('plays, seeks, changes sound and speed', () =>
    shared.visit(
      course,
      async (page) => {
        await page.keyboard.press('Space'); // the player has the focus
        await playing(page);
        await page.keyboard.press('k');
        await until(page, () => !window.Olive.app.stage.player.isPlaying);
        const at = async (key, expected) => {
          await page.keyboard.press(key);
          near(await time(page), expected);
        };
        await at('5', 10);
        await at('l', 20);
        await at('j', 10);
        await at('ArrowRight', 15);
        await at('ArrowLeft', 10);
        await at('End', 20);
        await at('Home', 0);
        await at(']', 7);
        await at(']', 13);
        await at('[', 7);
        await page.keyboard.press('ArrowDown');
        near((await playerState(page)).loudness, 0.95, 0.001);
        await page.keyboard.press('ArrowUp');
        near((await playerState(page)).loudness, 1, 0.001);
        await page.keyboard.press('m');
        assert.equal((await playerState(page)).isMuted, true);
        await page.keyboard.press('m');
        await page.keyboard.press('>');
        assert.equal((await playerState(page)).speed, 1.25);
        assert.match(await page.textContent('#announcements'), /Speed 1.25×/);
        await page.keyboard.press('<');
        await page.keyboard.press('n');
        await until(page, () => document.querySelector('#item-title').textContent === 'A song from the harvest');
        await page.keyboard.press('p');
        await until(page, () => document.querySelector('#item-title').textContent === 'Lecture: what pressing does');
      },
      item(1),
    ));

  test('leaves fields, modifiers and the rest of the page alone, and can be off', () =>
    shared.visit(
      course,
      async (page) => {
        await page.keyboard.press('Control+k');
        await page.keyboard.press('Meta+k');
        await page.keyboard.press('/');
        await page.waitForSelector('.search-field');
        await page.keyboard.type('kmn 5');
        assert.equal(await page.inputValue('.search-field'), 'kmn 5');
        await page.keyboard.press('Escape');
        assert.equal((await playerState(page)).isPlaying, false);
        assert.equal((await playerState(page)).isMuted, false);
        await page.evaluate(() => document.activeElement.blur());
        await page.keyboard.press('Space'); // outside the player it scrolls
        await until(page, () => scrollY > 0);
        assert.equal((await playerState(page)).isPlaying, false);
        await page.click('button[aria-label="Settings"]');
        await page.click('text=Single-key shortcuts');
        await page.keyboard.press('Escape');
        await page.focus('.player');
        await page.keyboard.press('k');
        assert.equal((await playerState(page)).isPlaying, false);
      },
      {...item(0), viewport: {width: 1000, height: 500}},
    ));

  test('presents: page keys turn, the screen goes blank, Escape leaves', () =>
    shared.visit(
      course,
      async (page) => {
        await page.keyboard.press('v');
        assert.equal(await page.locator('.head').isVisible(), true); // behind the frame
        const frame = await page.locator('.player').boundingBox();
        assert.deepEqual([frame.x, frame.y, frame.width, frame.height], [0, 0, 1280, 800]);
        await page.keyboard.press('PageDown');
        assert.equal(await page.inputValue('.page-number'), '2');
        await page.keyboard.press('PageUp');
        assert.equal(await page.inputValue('.page-number'), '1');
        assert.equal(await page.locator('.controls').isVisible(), false);
        await page.mouse.move(600, 400);
        assert.equal(await page.locator('.controls').isVisible(), true);
        const blank = () => page.evaluate(() => document.documentElement.classList.contains('blank'));
        await page.keyboard.press('b');
        assert.equal(await blank(), true);
        await page.keyboard.press('Escape');
        assert.equal(await blank(), false);
        await page.keyboard.press('Escape');
        assert.equal(await page.evaluate(() => document.documentElement.classList.contains('presenting')), false);
      },
      item(4),
    ));

  test('fills the screen with the whole stage and its controls', () =>
    shared.visit(
      course,
      async (page) => {
        await page.keyboard.press('f');
        await until(page, () => document.fullscreenElement?.matches('.player'));
        assert.equal(await page.locator('.transport').isVisible(), true);
        assert.equal(await page.getAttribute('.fullscreen', 'aria-label'), 'Leave full screen');
        await page.keyboard.press('f');
        await until(page, () => !document.fullscreenElement);
      },
      item(1),
    ));

  test('shows its map', () =>
    shared.visit(course, async (page) => {
      await page.keyboard.press('?');
      assert.equal((await page.locator('.keys kbd').count()) > 25, true);
      await page.keyboard.press('Escape');
      await until(page, () => !document.querySelector('dialog'));
    }));
});

describe('links and memory', () => {
  test('a reload restores item, time and arrangement; back goes back', () =>
    shared.visit(
      course,
      async (page) => {
        near(await time(page), 8.5);
        await page.keyboard.press('d');
        await page.evaluate(() => window.Olive.app.stage.player.seek(11));
        await page.keyboard.press('k');
        await playing(page);
        await page.keyboard.press('k');
        const paused = await time(page);
        await page.reload();
        await until(page, () => window.Olive.app.stage.player.leader.element.readyState > 1);
        near(await time(page), paused, 0.15);
        assert.equal(await page.getAttribute('.dual', 'data-view'), 'corner');
        await page.click('.neighbour.nextItem');
        await until(page, () => document.querySelector('#item-title').textContent === 'A song from the harvest');
        await page.goBack();
        await until(page, () => document.querySelector('#item-title').textContent === 'Lecture: what pressing does');
        near(await time(page), paused, 0.15);
      },
      item(1, '&t=8.5'),
    ));

  test('a page of a document is linked', () =>
    shared.visit(
      course,
      async (page) => {
        await until(page, () => document.querySelector('.page-number').value === '4');
      },
      item(4, '&page=4'),
    ));

  test('the link at this time is copied', () =>
    shared.visit(
      course,
      async (page, {context}) => {
        await page.evaluate(() => {
          navigator.clipboard.writeText = async (text) => {
            window.copied = text;
          };
        });
        await page.evaluate(() => window.Olive.app.stage.player.seek(6.5));
        await page.keyboard.press('u');
        await until(page, () => window.copied);
        assert.equal(
          await page.evaluate(() => window.copied),
          fileUrl(course.folder, `#item=${course.items[0]}&t=6.5`),
        );
        assert.ok(context);
      },
      item(0),
    ));

  test('a second visit continues where the first one ended, or starts over', () =>
    shared.visit(
      course,
      async (page) => {
        await page.evaluate(() => window.Olive.app.stage.player.seek(14));
        await start(page);
        await page.keyboard.press('k');
        await page.goto(fileUrl(course.folder, '#'));
        await page.waitForSelector('.hero');
        assert.match(await page.textContent('.hero .primary'), /Continue “A song from the harvest” at 0:14/);
        assert.equal(await page.locator('.seen-bar').count(), 1);
        await page.click('.hero .primary');
        await page.waitForSelector('text=Start over');
        await page.click('.big-play');
        await playing(page);
        near(await time(page), 14.3, 1);
        await page.evaluate(() => window.Olive.app.stage.player.seek(29.5));
        await until(page, () => window.Olive.app.stage.player.hasEnded);
        await page.goto(fileUrl(course.folder, '#'));
        await page.waitForSelector('.tick');
        await page.click('button[aria-label="Settings"]');
        await page.click('text=Forget where I was');
        await page.keyboard.press('Escape');
        assert.equal(await page.locator('.tick').count(), 0);
        const keys = await page.evaluate(() => Object.keys(localStorage));
        assert.ok(keys.length > 0 && keys.every((key) => key.startsWith('quilt.olive.')), keys.join());
        assert.ok(keys.every((key) => key.includes(course.data.UUID)));
      },
      item(2),
    ));

  test('goes on to the next item only when asked, and that can be cancelled', () =>
    shared.visit(
      course,
      async (page) => {
        const end = async () => {
          await page.evaluate(() => window.Olive.app.stage.player.seek(11.6));
          await page.keyboard.press('k');
          await until(page, () => window.Olive.app.stage.player.hasEnded);
        };
        await end();
        await page.waitForTimeout(300);
        assert.equal(await page.locator('.up-next').count(), 0);
        await page.click('button[aria-label="Settings"]');
        await page.click('text=Go on to the next item by itself');
        await page.keyboard.press('Escape');
        await end();
        await page.click('.up-next >> text=Cancel');
        assert.equal(await page.locator('.up-next').count(), 0);
        await end();
        await page.click('.up-next >> text=Play now');
        await until(page, () => document.querySelector('#item-title').textContent === 'Lecture: what pressing does');
        await playing(page);
      },
      item(0),
    ));
});

describe('the player', () => {
  test('chooses the grade that fits, and switches at the same place', () =>
    shared.visit(
      course,
      async (page) => {
        const shown = () => page.evaluate(() => window.Olive.app.stage.player.leader.element.videoHeight);
        await start(page);
        assert.equal(await shown(), 720);
        await page.evaluate(() => window.Olive.app.stage.transport.actions.setSpeed(1.5));
        const before = await time(page);
        const began = Date.now();
        await choose(page, '480p · 640 × 360');
        await until(
          page,
          () =>
            window.Olive.app.stage.player.leader.element.videoHeight === 360 &&
            !window.Olive.app.stage.player.leader.element.paused &&
            !window.Olive.app.stage.player.leader.element.seeking,
        );
        const state = await playerState(page);
        assert.equal(state.speed, 1.5);
        assert.ok(
          state.time >= before - 0.1 && state.time <= before + ((Date.now() - began) / 1000) * 1.5 + 0.1,
          `${before} → ${state.time}`,
        );
        await page.reload();
        await until(page, () => window.Olive.app.stage.player.leader.element.videoHeight === 360);
      },
      item(0),
    ));

  test('keeps the exact place when the grade changes while it stands', () =>
    shared.visit(
      course,
      async (page) => {
        await page.evaluate(() => window.Olive.app.stage.player.seek(7.3));
        await choose(page, '480p · 640 × 360');
        await until(page, () => window.Olive.app.stage.player.leader.element.videoHeight === 360);
        near(await page.evaluate(() => window.Olive.app.stage.player.leader.element.currentTime), 7.3, 0.1);
        assert.equal((await playerState(page)).isPlaying, false);
      },
      item(0),
    ));

  test('takes the small grade on a small screen', () =>
    shared.visit(
      course,
      async (page) => {
        await until(page, () => window.Olive.app.stage.player.leader.element.videoHeight === 360);
      },
      {...item(0), viewport: {width: 400, height: 700}},
    ));

  test('ends at the end, every time', () =>
    shared.visit(
      course,
      async (page) => {
        for (let i = 0; i < 8; ++i) {
          await page.evaluate(() => window.Olive.app.stage.player.seek(11.8));
          await page.keyboard.press('k');
          await until(page, () => window.Olive.app.stage.player.hasEnded);
          near(await time(page), 12, 0.1);
        }
      },
      item(0),
    ));

  test('keeps pitch and speed from item to item', () =>
    shared.visit(
      course,
      async (page) => {
        await choose(page, '1.5×');
        await page.keyboard.press('n');
        await until(page, () => document.querySelector('#item-title').textContent === 'A song from the harvest');
        await start(page);
        const audio = await page.evaluate(() => {
          const {playbackRate, preservesPitch} = window.Olive.app.stage.player.leader.element;
          return {playbackRate, preservesPitch};
        });
        assert.deepEqual(audio, {playbackRate: 1.5, preservesPitch: true});
      },
      item(1),
    ));

  test('marks chapters on the bar, names them under the pointer and in the list', () =>
    shared.visit(
      course,
      async (page) => {
        assert.equal(await page.locator('.marks i').count(), 3);
        const bar = await page.locator('.seek').boundingBox();
        await page.mouse.move(bar.x + bar.width * 0.6, bar.y + bar.height / 2);
        assert.match(await page.textContent('.bubble'), /Summer0:07/);
        await page.click('.side .row >> nth=1');
        near(await time(page), 3);
        assert.match(await page.textContent('.side .row[aria-current=true]'), /Spring/);
        assert.match(await page.getAttribute('.seek', 'aria-valuetext'), /3 seconds of 12 seconds, Spring/);
      },
      item(0),
    ));

  test('asks for one item’s media only', () =>
    shared.visit(course, async (page) => {
      await page.waitForSelector('.card');
      assert.equal(await page.evaluate(() => document.querySelectorAll('video[src], audio[src]').length), 0);
      assert.ok(
        await page.evaluate(() =>
          [...document.querySelectorAll('.card img')].every((image) => image.loading === 'lazy'),
        ),
      );
    }));

  test('tells the system what plays', () =>
    shared.visit(
      course,
      async (page) => {
        await start(page);
        assert.deepEqual(
          await page.evaluate(() => [
            navigator.mediaSession.metadata.title,
            navigator.mediaSession.metadata.artist,
            navigator.mediaSession.playbackState,
          ]),
          ['The grove in four seasons', 'Mara Lindqvist', 'playing'],
        );
      },
      item(0),
    ));
});

describe('search', () => {
  test('finds titles, chapters and page texts without regard to accents, and goes there', () =>
    shared.visit(course, async (page) => {
      const find = async (words) => {
        await page.keyboard.press('/');
        await page.fill('.search-field', words);
      };
      await find('ECLAIRAGE');
      assert.equal(await page.textContent('.hit mark'), 'Éclairage');
      await page.keyboard.press('Enter');
      await until(
        page,
        () => document.querySelector('.page-number') && document.querySelector('.page-number').value === '3',
      );
      await page.click('button[aria-label="Text of the page"]');
      assert.equal(await page.textContent('.page-text mark'), 'Éclairage');
      await page.focus('.player');
      await find('kneading rest');
      assert.equal(await page.locator('.hit').count(), 1);
      await page.keyboard.press('ArrowDown');
      await page.keyboard.press('Enter');
      await until(page, () => window.Olive.app.stage?.view);
      near(await time(page), 13);
      await find('zebra');
      assert.equal(await page.textContent('.result-count'), 'Nothing found');
    }));
});
