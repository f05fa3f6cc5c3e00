// SPDX-License-Identifier: Apache-2.0
// A package opens from disk, from a server and in a frame, and shows items of every category.
import assert from 'node:assert/strict';
import {dirname} from 'node:path';
import {describe, test} from 'node:test';
import {serve} from './browser.mjs';
import {fixtures, playing, playerState, start, until, useBrowser} from './support.mjs';

const shared = useBrowser();
const course = fixtures.course();

/// Visits all items in the window (a page or a frame) and has each play or show.
async function showEverything(page, frame = page) {
  const expected = {
    Movie: '.stage video',
    DualSource: '.dual video',
    Audio: '.record img',
    Montage: '.stills img.front',
    Document: '.sheet img',
    Image: '.sheet img',
    Web: '.web-card a',
  };
  for (const item of course.data.Media) {
    await frame.evaluate((id) => {
      location.hash = '#item=' + id;
    }, item.UUID);
    await until(
      frame,
      (title) => {
        const heading = document.querySelector('#item-title');
        return heading && heading.textContent === title;
      },
      item.Title,
    );
    const shown = await frame.waitForSelector(expected[item.ContentCategory]);
    if (item.ContentCategory !== 'Web')
      await until(frame, (node) => (node.localName === 'img' ? node.naturalWidth > 0 : node.videoWidth > 0), shown);
    if (['Movie', 'DualSource', 'Audio', 'Montage'].includes(item.ContentCategory)) {
      await frame.click('.big-play');
      await until(frame, () => window.Olive.app.stage.player.time > 0.3);
      const streams = await frame.evaluate(() =>
        window.Olive.app.stage.player.live.map((stream) => ({
          paused: stream.element.paused,
          muted: stream.element.muted,
        })),
      );
      assert.ok(
        streams.every((stream) => !stream.paused),
        item.Title,
      );
      assert.equal(streams.filter((stream) => !stream.muted).length, 1, 'one stream gives sound');
    }
    assert.equal(await frame.locator('.message').count(), 0, item.Title);
  }
}

describe('a package', () => {
  test('opens from disk without complaint and without network, and shows every category', () =>
    shared.visit(course, async (page) => {
      assert.equal(await page.textContent('h1'), 'From Tree to Table');
      assert.equal(await page.locator('.card').count(), course.items.length);
      await until(page, () =>
        [...document.images]
          .filter((image) => image.getBoundingClientRect().top < innerHeight)
          .every((image) => image.naturalWidth > 0),
      );
      await showEverything(page);
    }));

  test('works from a server, in a subfolder', async () => {
    const server = await serve(dirname(course.folder));
    try {
      await shared.visit(
        course,
        async (page, {requests}) => {
          await until(page, () => document.querySelector('.hero-picture').naturalWidth > 0);
          await showEverything(page);
          assert.ok(
            requests.every((url) => url.startsWith(server.origin)),
            requests.join('\n'),
          );
        },
        {url: server.origin + '/course/index.html'},
      );
    } finally {
      server.close();
    }
  });

  test('works in a frame of another page', async () => {
    const server = await serve(dirname(course.folder), {
      '/host.html':
        '<!DOCTYPE html><iframe src="course/index.html" width="900" height="700" allow="autoplay; fullscreen"></iframe>',
    });
    try {
      await shared.visit(
        course,
        async (page) => {
          const frame = await (await page.waitForSelector('iframe')).contentFrame();
          await frame.waitForSelector('.card');
          await showEverything(page, frame);
        },
        {url: server.origin + '/host.html'},
      );
    } finally {
      server.close();
    }
  });

  test('with one item opens at that item', () => {
    const single = fixtures.single();
    return shared.visit(single, async (page) => {
      assert.equal(await page.textContent('#item-title'), 'The only one');
      assert.equal(await page.locator('.side').count(), 0);
      await start(page);
      assert.equal(Math.round((await playerState(page)).duration), 12);
    });
  });

  test('plays nothing by itself, and says so when the browser wants a gesture', () =>
    shared.visit(
      course,
      async (page) => {
        await page.waitForSelector('.big-play');
        assert.equal((await playerState(page)).isPlaying, false);
        // As a browser that refuses does.
        await page.evaluate(() => {
          HTMLMediaElement.prototype.play = () => Promise.reject(new DOMException('no gesture', 'NotAllowedError'));
        });
        await page.click('.big-play');
        await page.waitForSelector('.blocked .big-play');
        assert.equal((await playerState(page)).isPlaying, false);
      },
      {hash: '#item=' + course.items[0]},
    ));

  test('a lecture starts both streams, a commentary replaces the sound of its movie', () =>
    shared.visit(
      course,
      async (page) => {
        await start(page);
        await page.click('button[aria-label="Audio commentary"]');
        await playing(page);
        await until(page, () => {
          const [film, voice] = window.Olive.app.stage.player.streams;
          return film.element.muted && !voice.element.muted && !voice.element.paused && !film.element.paused;
        });
        await page.click('button[aria-label="Audio commentary"]');
        await until(page, () => {
          const [film, voice] = window.Olive.app.stage.player.streams;
          return !film.element.muted && voice.element.muted && voice.element.paused && !film.element.paused;
        });
      },
      {hash: '#item=' + course.items[7]},
    ));

  test('a montage follows its cues', () =>
    shared.visit(
      course,
      async (page) => {
        const front = () => page.getAttribute('.stills img.front', 'alt');
        assert.equal(await front(), 'Picture 1');
        await page.evaluate(() => window.Olive.app.stage.player.seek(9.5));
        await until(page, () => document.querySelector('.stills img.front').alt === 'Down to the water');
        await page.keyboard.press(']');
        await until(page, () => document.querySelector('.stills img.front').alt === 'The mill');
        assert.equal(await page.getAttribute('.side .row[aria-current] .row-title', 'dir'), 'auto');
        assert.match(await page.textContent('.side .row[aria-current]'), /The mill/);
      },
      {hash: '#item=' + course.items[3]},
    ));

  test('a document turns its pages, zooms, and shows and searches their text', () =>
    shared.visit(
      course,
      async (page) => {
        await until(page, () => document.querySelector('.page-number').value === '1');
        await page.keyboard.press('ArrowRight');
        assert.equal(await page.inputValue('.page-number'), '2');
        await page.fill('.page-number', '5');
        await page.keyboard.press('Enter');
        assert.equal(await page.getAttribute('.sheet img', 'alt'), 'Page 5 of 6');
        assert.match(page.url(), /page=5/);
        await page.focus('.player');
        await page.keyboard.press('t');
        assert.match(await page.innerText('.page-text'), /Stone crushes/);
        const before = await page.evaluate(() => document.querySelector('.sheet img').clientWidth);
        await page.click('button[aria-label="Zoom in"]');
        await page.click('button[aria-label="Zoom in"]');
        const after = await page.evaluate(() => document.querySelector('.sheet img').clientWidth);
        assert.ok(Math.abs(after / before - 1.5) < 0.02);
        await page.click('.page >> nth=2');
        assert.equal(await page.inputValue('.page-number'), '3');
      },
      {hash: '#item=' + course.items[4]},
    ));

  test('a web link says that it needs the internet and gives nothing away', () =>
    shared.visit(
      course,
      async (page) => {
        const link = page.locator('.web-card a');
        assert.equal(await link.getAttribute('rel'), 'noopener noreferrer');
        assert.equal(await link.getAttribute('href'), 'https://example.org/olives?from=quilt');
        assert.match(await page.textContent('.web-card'), /Needs internet/);
      },
      {hash: '#item=' + course.items[6]},
    ));

  test('extras are offered with readable names', () =>
    shared.visit(
      course,
      async (page) => {
        assert.equal(await page.getAttribute('.extra >> nth=0', 'download'), 'Worksheet.pdf');
        assert.equal(await page.getAttribute('.extra >> nth=1', 'download'), null);
      },
      {hash: '#item=' + course.items[0]},
    ));
});
