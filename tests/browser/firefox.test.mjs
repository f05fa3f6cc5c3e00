// SPDX-License-Identifier: Apache-2.0
// The same package in Firefox.
import assert from 'node:assert/strict';
import {existsSync, mkdirSync} from 'node:fs';
import {join} from 'node:path';
import {after, before, describe, test} from 'node:test';
import {fileUrl} from './browser.mjs';
import {launchFirefox} from './firefox.mjs';
import {Served, whyNoProgram} from './served.mjs';
import {fixtures, inRealTime, kShots} from './support.mjs';

const kProgram = process.env.FIREFOX || '/usr/bin/firefox-esr';

describe('in Firefox', {skip: existsSync(kProgram) ? false : `${kProgram} is not installed`}, () => {
  let firefox;
  const course = fixtures.course();
  mkdirSync(kShots, {recursive: true});
  before(async () => {
    firefox = await launchFirefox(kProgram);
  });
  after(() => firefox.close());

  test('a package from disk shows and plays every category without complaint or network', async () => {
    await firefox.goto(fileUrl(course.folder));
    await firefox.until(() => document.querySelector('h1').textContent === 'From Tree to Table');
    await firefox.until(() => document.querySelector('.hero-picture').naturalWidth > 0);
    await firefox.screenshot(join(kShots, 'home-firefox.png'));
    for (const item of course.data.Media) {
      await firefox.evaluate((id) => {
        location.hash = '#item=' + id;
      }, item.UUID);
      await firefox.until((title) => document.querySelector('#item-title')?.textContent === title, item.Title);
      if (['Movie', 'DualSource', 'Audio', 'Montage'].includes(item.ContentCategory)) {
        if (item === course.data.Media[0]) await firefox.press('m'); // without a sound device Firefox plays silence only
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

  test('two streams stay together', (context) =>
    inRealTime(context, async () => {
      await firefox.goto(fileUrl(course.folder, '#item=' + course.items[1]));
      await firefox.until(() => document.querySelector('.big-play'));
      await firefox.click('.big-play');
      await firefox.until(() => window.Olive.app.stage.player.time > 2);
      await firefox.evaluate(() => {
        document.querySelectorAll('video')[1].currentTime -= 0.3;
      });
      await new Promise((resolve) => setTimeout(resolve, 3500));
      const apart = await firefox.evaluate(() => {
        const [first, second] = document.querySelectorAll('video');
        return Math.abs(first.currentTime - second.currentTime);
      });
      assert.ok(apart <= 0.08, `${apart} s`);
    }));

  test(
    'a served document is edited in its page, and shows what is edited elsewhere',
    {skip: whyNoProgram},
    async () => {
      const media = (name) => join(process.env.QUILT_BROWSER_BUILD, 'media', name);
      const served = new Served(join(process.env.QUILT_BROWSER_BUILD, 'served-firefox'), media, (files) => ({
        title: 'In Firefox',
        media: [
          {source: files('sea.png'), title: 'The sea'},
          {source: files('still-1.jpg'), title: 'Dusk'},
        ],
      }));
      const before = firefox.complaints.length;
      try {
        await firefox.goto(await served.start());
        await firefox.until(
          () =>
            document.documentElement.classList.contains('editing') &&
            !!document.querySelector('.hero .of-title .pencil'),
        );
        await firefox.click('.hero .of-title .pencil');
        await firefox.until(
          () => document.activeElement.localName === 'textarea' && document.activeElement.value === 'In Firefox',
        );
        for (const key of 'Typed') await firefox.press(key);
        await firefox.screenshot(join(kShots, 'live-firefox.png'));
        await firefox.press('\uE007');
        await firefox.until(
          () => !document.querySelector('textarea') && document.querySelector('.hero h1').textContent === 'Typed',
        );
        assert.equal(served.record.Title, 'Typed');
        assert.equal(await firefox.evaluate(() => document.activeElement.className), 'pencil', 'the focus is back');
        await (await served.client()).cvSetTitle('By the host');
        await firefox.until(() => document.querySelector('.hero h1').textContent === 'By the host');
        assert.deepEqual(firefox.complaints.slice(before), []);
      } finally {
        await firefox.goto('about:blank');
        await served.stop();
      }
    },
  );

  test('keys and a reload work as elsewhere', async () => {
    await firefox.goto(fileUrl(course.folder, '#item=' + course.items[4]));
    await firefox.until(() => document.querySelector('.page-number')?.value === '1');
    await firefox.press(']');
    await firefox.until(() => document.querySelector('.page-number').value === '2');
    await firefox.evaluate(() => {
      location.reload();
    });
    await firefox.until(() => document.querySelector('.page-number')?.value === '2');
  });
});
