// SPDX-License-Identifier: Apache-2.0
// The same package in Firefox.
import assert from 'node:assert/strict';
import {existsSync, mkdirSync} from 'node:fs';
import {join} from 'node:path';
import {after, before, describe, test} from 'node:test';
import {fileUrl} from './browser.mjs';
import {launchFirefox} from './firefox.mjs';
import {fixtures, kShots} from './support.mjs';

const kProgram = process.env.FIREFOX || '/usr/bin/firefox-esr';

describe('in Firefox', {skip: existsSync(kProgram) ? false : `${kProgram} is not installed`}, () => {
  let firefox;
  const course = fixtures.course();
  mkdirSync(kShots, {recursive: true});
  before(async () => { firefox = await launchFirefox(kProgram); });
  after(() => firefox.close());

  test('a package from disk shows and plays every category without complaint or network', async () => {
    await firefox.goto(fileUrl(course.folder));
    await firefox.until(() => document.querySelector('h1').textContent === 'From Tree to Table');
    await firefox.until(() => document.querySelector('.hero-picture').naturalWidth > 0);
    await firefox.screenshot(join(kShots, 'home-firefox.png'));
    for (const item of course.data.Media) {
      await firefox.evaluate((id) => { location.hash = '#item=' + id; }, item.UUID);
      await firefox.until((title) => (document.querySelector('#item-title') || {}).textContent === title, item.Title);
      if (['Movie', 'DualSource', 'Audio', 'Montage'].includes(item.ContentCategory)) {
        if (item === course.data.Media[0]) await firefox.press('m');  // without a sound device Firefox plays silence only
        await firefox.click('.big-play');
        await firefox.until(() => window.Olive.app.stage.player.time > 0.4);
      } else if (item.ContentCategory !== 'Web') {
        await firefox.until(() => document.querySelector('.sheet img').naturalWidth > 0);
      }
      assert.equal(await firefox.evaluate(() => document.querySelectorAll('.message').length), 0, item.Title);
      if (item.ContentCategory === 'DualSource') await firefox.screenshot(join(kShots, 'lecture-firefox.png'));
    }
    assert.deepEqual(firefox.complaints, []);
    assert.deepEqual(firefox.requests, []);
  });

  test('two streams stay together', async () => {
    await firefox.goto(fileUrl(course.folder, '#item=' + course.items[1]));
    await firefox.until(() => document.querySelector('.big-play'));
    await firefox.click('.big-play');
    await firefox.until(() => window.Olive.app.stage.player.time > 2);
    await firefox.evaluate(() => { document.querySelectorAll('video')[1].currentTime -= 0.3; });
    await new Promise((resolve) => setTimeout(resolve, 3500));
    const apart = await firefox.evaluate(() => { const [first, second] = document.querySelectorAll('video'); return Math.abs(first.currentTime - second.currentTime); });
    assert.ok(apart <= 0.08, `${apart} s`);
  });

  test('keys and a reload work as elsewhere', async () => {
    await firefox.goto(fileUrl(course.folder, '#item=' + course.items[4]));
    await firefox.until(() => (document.querySelector('.page-number') || {}).value === '1');
    await firefox.press(']');
    await firefox.until(() => document.querySelector('.page-number').value === '2');
    await firefox.evaluate(() => { location.reload(); });
    await firefox.until(() => (document.querySelector('.page-number') || {}).value === '2');
  });
});
