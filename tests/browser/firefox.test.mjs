// SPDX-License-Identifier: Apache-2.0
// The same package in Firefox.
import assert from 'node:assert/strict';
import {existsSync, mkdirSync, rmSync} from 'node:fs';
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

  const show = async (made, index) => {
    const {UUID, Title} = made.data.Media[index];
    await firefox.goto('about:blank');
    await firefox.goto(fileUrl(made.folder, '#item=' + UUID));
    await firefox.until((title) => document.querySelector('#item-title')?.textContent === title, Title);
  };
  const measure = () =>
    firefox.evaluate(() => {
      const box = (node) => {
        const {x, y, width, height} = node.getBoundingClientRect();
        return {x, y, width, height};
      };
      const rows = [...document.querySelectorAll('.player .buttons')].map((row) => {
        const middles = [...row.children]
          .map(box)
          .filter((each) => each.width)
          .map((each) => each.y + each.height / 2);
        return Math.max(...middles) - Math.min(...middles);
      });
      return {
        stage: box(document.querySelector('.stage')),
        bar: box(document.querySelector('.transport, .controls')),
        videos: [...document.querySelectorAll('.stage video')].map(box),
        rows,
      };
    });
  const known = () =>
    firefox.until(() => [...document.querySelectorAll('.stage video')].every((video) => video.videoWidth));

  test('slides are as large as elsewhere, beside the lists and in one press', async () => {
    await firefox.resize(1280, 800);
    await show(course, 1);
    await known();
    const {
      videos: [speaker, slides],
    } = await measure();
    assert.ok(slides.width >= 600 && (slides.width / 16) * 9 >= 337.5, `${slides.width}`);
    assert.ok(Math.abs(slides.width / (speaker.width + slides.width) - 0.67) < 0.01);
    await firefox.click('.theatre-button');
    const wide = await measure();
    assert.ok(wide.videos[1].width >= 820 && wide.videos[1].height >= 461, `${wide.videos[1].width}`);
    assert.ok(wide.bar.y + wide.bar.height <= 800);
    await firefox.screenshot(join(kShots, 'lecture-wide-firefox.png'));
    await firefox.click('.theatre-button');
  });

  test('controls lie in one row at every width, over the picture where the window is low', async () => {
    for (const [width, height] of [
      [390, 780],
      [640, 360],
      [768, 1024],
      [1000, 800],
      [1600, 900],
    ]) {
      await firefox.resize(width, height);
      for (const index of [0, 1, 3, 4, 8]) {
        await show(course, index);
        const {rows, stage, bar} = await measure();
        for (const spread of rows) assert.ok(spread < 3, `${index} at ${width}: ${spread}`);
        if (height !== 360 || index > 3) continue;
        assert.ok(bar.y < stage.y + stage.height && bar.y + bar.height <= 361, `${index}: ${bar.y} + ${bar.height}`);
      }
    }
    await firefox.resize(1280, 800);
  });

  test('a lecture of a voice and slides, a film with a short commentary', async () => {
    await show(fixtures.voiceAndSlides(), 0);
    await known();
    const {stage, videos} = await measure();
    assert.ok(Math.abs(stage.width - videos[0].width) < 1);
    assert.equal(await firefox.evaluate(() => document.querySelectorAll('.views, .divider').length), 0);
    await show(fixtures.shortVoice(), 0);
    await known();
    await firefox.press('m'); // without a sound device Firefox plays silence only
    await firefox.click('.big-play');
    await firefox.until(() => window.Olive.app.stage.player.time > 0.2);
    await firefox.click('button[aria-label="Audio commentary"]');
    const heard = (index) =>
      firefox.until((i) => {
        const {streams, speaker} = window.Olive.app.stage.player;
        return streams.indexOf(speaker) === i;
      }, index);
    await heard(1);
    await firefox.evaluate(() => {
      window.Olive.app.stage.player.seek(3.4);
    });
    await heard(0);
  });

  test('a montage without its voice runs by the clock, a film without its file says so', async () => {
    const made = fixtures.incomplete('firefox-incomplete');
    for (const path of [made.data.Media[3].AudioCommentarySource, made.data.Media[2].Sources[0]]) {
      rmSync(join(made.folder, path.Derivatives[0].RelativePath));
    }
    await show(made, 3);
    await firefox.until(() => document.querySelector('.message'));
    await firefox.evaluate(() => {
      document.querySelector('.message').remove();
    });
    await firefox.click('.big-play');
    await firefox.until(() => window.Olive.app.stage.player.time > 0.5);
    await show(made, 2);
    await firefox.until(() => document.querySelector('.play').disabled);
    const name = made.data.Media[2].Sources[0].Derivatives[0].Filename;
    await firefox.until((text) => document.querySelector('.stage').textContent.includes(text), name);
  });

  test('back to the contents finds them as they were left', async () => {
    const many = fixtures.many();
    await firefox.goto(fileUrl(many.folder, '#'));
    await firefox.until(() => document.querySelectorAll('.card').length === 500);
    await firefox.evaluate(() => {
      document.querySelectorAll('.card a')[317].scrollIntoView({block: 'center', behavior: 'instant'});
    });
    await new Promise((resolve) => setTimeout(resolve, 300));
    const place = () =>
      firefox.evaluate(() => Math.round(document.querySelectorAll('.card a')[317].getBoundingClientRect().top));
    const before = await place();
    await firefox.evaluate(() => {
      document.querySelectorAll('.card a')[317].click();
    });
    await firefox.until(() => document.querySelector('#item-title')?.textContent === 'Lesson 318: watering');
    await firefox.evaluate(() => {
      history.back();
    });
    await firefox.until(() => document.querySelectorAll('.card').length === 500);
    await new Promise((resolve) => setTimeout(resolve, 300));
    assert.ok(Math.abs((await place()) - before) <= 2, `${before} → ${await place()}`);
    assert.equal(await firefox.evaluate(() => document.activeElement.textContent.includes('Lesson 318')), true);
  });

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
