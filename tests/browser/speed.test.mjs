// SPDX-License-Identifier: Apache-2.0
// Large packages stay quick.
import assert from 'node:assert/strict';
import {describe, test} from 'node:test';
import {fixtures, inRealTime, useBrowser} from './support.mjs';

const shared = useBrowser();

describe('five hundred items', () => {
  const many = fixtures.many();

  test('appear within a second, scroll and are searched at once', (context) =>
    inRealTime(context, () =>
      shared.visit(many, async (page) => {
        const paint = await page.evaluate(
          () =>
            new Promise((resolve) =>
              new PerformanceObserver((list) => resolve(list.getEntries()[0].startTime)).observe({
                type: 'paint',
                buffered: true,
              }),
            ),
        );
        assert.equal(await page.locator('.card').count(), 500);
        const timing = await page.evaluate(async () => {
          await window.Olive.load('search');
          const find = window.Olive.makeFinder(window.Olive.app.pack.items);
          const first = performance.now();
          const one = find('pressing');
          const second = performance.now();
          const other = find('uberraschung');
          return {
            first: second - first,
            second: performance.now() - second,
            one: one.total,
            other: other.hits.map((hit) => hit.item.index),
          };
        });
        context.diagnostic(
          `first paint ${paint.toFixed(0)} ms, first search ${timing.first.toFixed(1)} ms, second ${timing.second.toFixed(1)} ms`,
        );
        assert.ok(paint < 1000, `first paint after ${paint} ms`);
        assert.ok(timing.first < 100 && timing.second < 100);
        assert.equal(timing.one, 100);
        assert.deepEqual(timing.other, [321]);
        const loaded = await page.evaluate(
          () => [...document.querySelectorAll('.card img')].filter((image) => image.complete).length,
        );
        assert.ok(loaded < 200, `${loaded} posters loaded at once`);
        const frames = await page.evaluate(async () => {
          const gaps = [];
          let last = performance.now();
          for (let i = 0; i < 40; ++i) {
            scrollBy({top: 400, behavior: 'instant'});
            await new Promise(requestAnimationFrame);
            const now = performance.now();
            gaps.push(now - last);
            last = now;
          }
          return gaps.sort((a, b) => a - b);
        });
        context.diagnostic(`scrolling: middle ${frames[20].toFixed(0)} ms, worst ${frames[39].toFixed(0)} ms a frame`);
        assert.ok(frames[20] < 100, `${frames[20]} ms a frame`);
      }),
    ));

  test('open quickly, with the list at the present one', (context) =>
    inRealTime(context, () =>
      shared.visit(
        many,
        async (page) => {
          await page.waitForSelector('.side .row[aria-current]');
          const row = await page.locator('.side .row[aria-current]').boundingBox();
          assert.ok(row.y > 0 && row.y < 800, `${row.y}`);
          const took = await page.evaluate(async (id) => {
            const began = performance.now();
            location.hash = '#item=' + id;
            while (document.querySelector('#item-title').textContent !== 'Lesson 11: pruning')
              await new Promise((resolve) => setTimeout(resolve, 1));
            return performance.now() - began;
          }, many.items[10]);
          context.diagnostic(`next item after ${took.toFixed(0)} ms`);
          assert.ok(took < 500, `${took} ms`);
        },
        {hash: '#item=' + many.items[400]},
      ),
    ));
});
