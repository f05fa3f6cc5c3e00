// SPDX-License-Identifier: Apache-2.0
// Two streams stay together: measured from the frames on the screen, not by the player's own clock.
import assert from 'node:assert/strict';
import {dirname} from 'node:path';
import {describe, test} from 'node:test';
import {serve} from './browser.mjs';
import {fixtures, inRealTime, start, until, useBrowser} from './support.mjs';

const kOffset = 2; // seconds at which the second stream begins
const kBound = 0.08; // seconds
const shared = useBrowser();
const lecture = fixtures.lecture();
const wait = (page, ms) => page.waitForTimeout(ms);

/// Collects, in the page, how far the second picture is ahead of the first.
const observe = (page) =>
  page.evaluate(() => {
    window.seen = [null, null];
    document.querySelectorAll('video').forEach((video, i) => {
      const look = (_now, data) => {
        window.seen[i] = {media: data.mediaTime, at: data.expectedDisplayTime, rate: video.playbackRate};
        video.requestVideoFrameCallback(look);
      };
      video.requestVideoFrameCallback(look);
    });
  });

/// The distances in a second, in seconds of the media.
async function distances(page, during = 800) {
  return page.evaluate(
    async ([offset, ms]) => {
      const found = [],
        end = performance.now() + ms;
      while (performance.now() < end) {
        await new Promise((resolve) => setTimeout(resolve, 40));
        const now = performance.now();
        const [first, second] = window.seen.map((frame) => frame.media + ((now - frame.at) / 1000) * frame.rate);
        found.push(second + offset - first);
      }
      return found;
    },
    [kOffset, during],
  );
}

const middle = (values) => values.slice().sort((a, b) => a - b)[Math.floor(values.length / 2)];
const worst = (values) => Math.max(...values.map(Math.abs));

async function playAt(page, speed) {
  await page.evaluate((value) => {
    window.Olive.app.stage.transport.actions.setSpeed(value);
    window.Olive.app.stage.player.seek(10);
  }, speed);
  await start(page);
  await until(page, () => window.Olive.app.stage.player.time > 10.5);
  await observe(page);
  await wait(page, 1500);
}

/// Throws one stream back by as much as it would lose in 300 ms.
const stall = (page, index) =>
  page.evaluate((i) => {
    const video = document.querySelectorAll('video')[i];
    video.currentTime -= 0.3 * window.Olive.app.stage.player.speed;
  }, index);

const testInRealTime = (name, body) => test(name, (context) => inRealTime(context, () => body(context)));

describe('a lecture', () => {
  for (const speed of [0.5, 1, 2]) {
    testInRealTime(`is together again 3 s after either stream stalled for 300 ms at ${speed}x`, (context) =>
      shared.visit(lecture, async (page) => {
        await playAt(page, speed);
        const before = await distances(page);
        assert.ok(Math.abs(middle(before)) <= kBound, 'together before');
        for (const [index, name] of [
          [1, 'slides'],
          [0, 'speaker'],
        ]) {
          await stall(page, index);
          await wait(page, 250);
          const after = await distances(page, 300);
          await wait(page, 2450);
          const settled = await distances(page);
          context.diagnostic(
            `${name}: before ${(middle(before) * 1000).toFixed(0)} ms, stalled ${(middle(after) * 1000).toFixed(0)} ms, settled ${(middle(settled) * 1000).toFixed(0)} ms, worst ${(worst(settled) * 1000).toFixed(0)} ms`,
          );
          assert.ok(Math.abs(middle(settled)) <= kBound, `together again after the ${name}`);
          await until(
            page,
            (rate) =>
              [...document.querySelectorAll('video')].every((video) => Math.abs(video.playbackRate - rate) < 1e-9),
            speed,
          );
        }
      }),
    );
  }

  testInRealTime('is brought back by one seek when it is far off', () =>
    shared.visit(lecture, async (page) => {
      await playAt(page, 1);
      await page.evaluate(() => {
        const video = document.querySelectorAll('video')[1];
        video.currentTime += 5;
        window.seeks = -1; // that one is ours
        video.addEventListener('seeking', () => {
          ++window.seeks;
        });
      });
      await wait(page, 3500);
      assert.ok(Math.abs(middle(await distances(page))) <= kBound);
      assert.equal(await page.evaluate(() => window.seeks), 1);
    }),
  );

  testInRealTime('waits as a whole while one stream has no data', async () => {
    let goOn;
    const gate = new Promise((resolve) => {
      goOn = resolve;
    });
    const server = await serve(
      dirname(lecture.folder),
      {},
      {file: lecture.data.Media[0].Sources[1].Derivatives[0].Filename, share: 0.2, gate},
    );
    try {
      await shared.visit(
        lecture,
        async (page) => {
          await start(page);
          await until(page, () => window.Olive.app.stage.player.isWaiting, null, 40000);
          const times = () =>
            page.evaluate(() => [...document.querySelectorAll('video')].map((video) => video.currentTime));
          await wait(page, 300);
          const held = await times();
          await wait(page, 1000);
          assert.deepEqual(await times(), held, 'both stand');
          assert.equal(await page.locator('.spinner').isVisible(), true);
          goOn();
          await until(page, () => !window.Olive.app.stage.player.isWaiting);
          await wait(page, 2000);
          const now = await times();
          assert.ok(now[0] > held[0] + 1 && now[1] > held[1] + 1, 'both go on');
          assert.ok(Math.abs(now[1] + kOffset - now[0]) <= kBound, `${now}`);
        },
        {url: server.origin + '/lecture/index.html'},
      );
    } finally {
      goOn();
      server.close();
    }
  });

  testInRealTime('keeps the last picture of the shorter stream while the longer one ends', () =>
    shared.visit(lecture, async (page) => {
      await page.evaluate(() => window.Olive.app.stage.player.seek(81));
      await start(page);
      await until(page, () => window.Olive.app.stage.player.time > 83.5);
      const [first, second] = await page.evaluate(() =>
        [...document.querySelectorAll('video')].map((video) => ({paused: video.paused, time: video.currentTime})),
      );
      assert.equal(first.paused, false);
      assert.equal(second.paused, true);
      assert.ok(second.time > 79.5);
    }),
  );

  testInRealTime('rests the stream that is not shown and takes it to the present time', () =>
    shared.visit(lecture, async (page) => {
      await playAt(page, 1);
      await page.click('button[data-view="first"]');
      assert.deepEqual(
        await page.evaluate(() => [...document.querySelectorAll('video')].map((video) => video.paused)),
        [false, true],
      );
      await page.evaluate(() => window.Olive.app.stage.player.seek(40));
      await page.click('button[data-view="side"]');
      await wait(page, 2500);
      assert.ok(Math.abs(middle(await distances(page))) <= kBound);
      await page.click('button[data-view="second"]');
      assert.equal(await page.evaluate(() => document.querySelectorAll('video')[0].paused), false, 'its sound goes on');
    }),
  );

  test('has its pictures arranged by buttons, keys and the divider', () =>
    shared.visit(lecture, async (page) => {
      const box = (index) =>
        page.evaluate((i) => {
          const {left, width} = document.querySelectorAll('.pane')[i].getBoundingClientRect();
          return {left, width};
        }, index);
      const [first, second] = [await box(0), await box(1)];
      assert.ok(Math.abs(second.width / first.width - 2) < 0.1 && first.left < second.left);
      await start(page);
      await page.keyboard.press('k');
      await page.focus('.divider');
      await page.keyboard.press('ArrowRight');
      await page.keyboard.press('ArrowRight');
      assert.equal(await page.getAttribute('.divider', 'aria-valuenow'), '43');
      assert.ok((await box(0)).width > first.width * 1.15);
      await page.focus('.player');
      await page.keyboard.press('s');
      assert.ok((await box(1)).left < (await box(0)).left, 'swapped');
      await page.keyboard.press('d');
      assert.equal(await page.getAttribute('.dual', 'data-view'), 'corner');
      assert.match(page.url(), /view=corner\.swapped/);
      await page.reload();
      assert.equal(await page.getAttribute('.dual', 'data-view'), 'corner');
      const small = await page.locator('.pane.small').boundingBox();
      const divider = await page.evaluate(() => document.querySelector('.divider').hidden);
      assert.ok(small.width < 400 && divider);
    }));
});
