// SPDX-License-Identifier: Apache-2.0
// What the tests of pages have in common.
import assert from 'node:assert/strict';
import {after, before} from 'node:test';
import {fileUrl, launch, openPage} from './browser.mjs';
import {Fixtures} from './fixtures.mjs';

const kFolder = process.env.QUILT_BROWSER_BUILD;
if (!kFolder) throw new Error('QUILT_BROWSER_BUILD names no folder; start the tests by tests/browser/run');
export const fixtures = new Fixtures(kFolder);
export const kShots = kFolder + '/screenshots';

/// One browser for a test file.
export function useBrowser() {
  const shared = {};
  before(async () => {
    shared.browser = await launch();
  });
  after(() => shared.browser.close());

  /// Opens a package from disk, runs the body, and asks that nothing was complained about and no network was used.
  /// options: those of a browser context, and hash, url, quiet (false: complaints are expected)
  shared.visit = async (made, body, {hash = '', url, quiet = true, ...options} = {}) => {
    const opened = await openPage(shared.browser, options);
    try {
      await opened.page.goto(url || fileUrl(made.folder, hash));
      await body(opened.page, opened);
      if (quiet) assert.deepEqual(opened.complaints, [], 'console');
      if (!url) assert.deepEqual(opened.requests, [], 'network');
    } finally {
      await opened.context.close();
    }
  };
  return shared;
}

/// Runs what a machine has to keep up with. Others may hold it up in the middle, so a failure is tried again, twice.
export async function inRealTime(context, body) {
  for (let attempt = 1; ; ++attempt) {
    try {
      return await body();
    } catch (error) {
      if (attempt === 3) throw error;
      context.diagnostic(`tried again: ${error.message}`);
    }
  }
}

/// What the player says.
export const playerState = (page) =>
  page.evaluate(() => {
    const player = window.Olive.app.stage.player;
    return {
      time: player.time,
      isPlaying: player.isPlaying,
      duration: player.duration,
      speed: player.speed,
      loudness: player.loudness,
      isMuted: player.isMuted,
    };
  });

/// Waits in the page; asks again and again because the page's policy forbids what Playwright's own waiting does.
export async function until(page, condition, argument, limit = 20000) {
  const end = Date.now() + limit;
  while (!(await page.evaluate(condition, argument))) {
    if (Date.now() > end) throw new Error('never came true: ' + condition);
    await new Promise((resolve) => setTimeout(resolve, 50));
  }
}
export const playing = (page) =>
  until(page, () => window.Olive.app.stage.player.isPlaying && window.Olive.app.stage.player.time > 0.1);
export const start = async (page) => {
  await page.click('.big-play');
  await playing(page);
};

/// Chooses in the menu of the controls: a speed or quality by its words.
export async function choose(page, words) {
  await page.click('.transport .menu-place > button');
  await page.click(`.menu-choice:has(span:text-is("${words}"))`);
  await page.keyboard.press('Escape');
}
