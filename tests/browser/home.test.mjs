// SPDX-License-Identifier: Apache-2.0
// The opening page: order, progress, and the place that is kept.
import assert from 'node:assert/strict';
import {describe, test} from 'node:test';
import {fixtures, until, useBrowser} from './support.mjs';

const shared = useBrowser();
const course = fixtures.course();
const many = fixtures.many();
const titles = (page) =>
  page.evaluate(() =>
    [...document.querySelectorAll('.card:not([hidden]) .card-title')].map((node) => node.textContent),
  );
const show = (page, hash) =>
  page.evaluate((value) => {
    location.hash = value;
  }, hash);
const sort = async (page, words) => {
  await page.click('button[aria-label="Order and view"]');
  await page.click(`.menu-choice:has(span:text-is("${words}"))`);
  await page.keyboard.press('Escape');
};

describe('back to the contents', () => {
  test('restores scroll and focus among five hundred items', () =>
    shared.visit(many, async (page) => {
      await page.waitForSelector('.card');
      await page.evaluate(() =>
        document.querySelectorAll('.card a')[317].scrollIntoView({block: 'center', behavior: 'instant'}),
      );
      await page.waitForTimeout(200);
      const place = () =>
        page.evaluate(() => Math.round(document.querySelectorAll('.card a')[317].getBoundingClientRect().top));
      const before = await place();
      assert.ok(before > 100 && before < 700, `${before}`);
      for (const back of [() => page.goBack(), () => page.keyboard.press('h')]) {
        await page.evaluate(() => document.querySelectorAll('.card a')[317].click());
        await until(page, () => document.querySelector('#item-title')?.textContent === 'Lesson 318: watering');
        assert.equal(await page.evaluate(() => scrollY), 0);
        await back();
        await page.waitForSelector('.card');
        await page.waitForTimeout(200);
        assert.ok(Math.abs((await place()) - before) <= 2, `${before} → ${await place()}`);
        assert.equal(await page.evaluate(() => document.activeElement.textContent.includes('Lesson 318')), true);
      }
    }));

  test('restores what was filtered', () =>
    shared.visit(course, async (page) => {
      await page.click('.chip >> text=Image');
      const shown = await titles(page);
      assert.equal(shown.length, 2);
      await page.click('.card:visible >> nth=1');
      await page.waitForSelector('#item-title');
      await page.goBack();
      await page.waitForSelector('.chip');
      assert.deepEqual(await titles(page), shown);
      assert.equal(await page.getAttribute('.chip >> text=Image', 'aria-pressed'), 'true');
    }));
});

describe('the opening page', () => {
  test('goes on with what was seen last, and tells how many were seen', () =>
    shared.visit(course, async (page) => {
      const reach = async (index, seconds) => {
        await show(page, `#item=${course.items[index]}`);
        await until(page, (id) => window.Olive.app.item?.id === id, course.items[index]);
        await page.evaluate((time) => window.Olive.app.stage.player.seek(time), seconds);
        await until(page, () => window.Olive.app.stage.player.time > 5);
        await show(page, '#');
        await page.waitForSelector('.hero');
      };
      await reach(2, 9);
      assert.match(await page.textContent('.hero .primary'), /A song from the harvest/);
      await reach(0, 7);
      assert.match(await page.textContent('.hero .primary'), /The grove in four seasons” at 0:07/);
      await show(page, `#item=${course.items[5]}`);
      await page.waitForSelector('.stage.image');
      await until(page, () => document.querySelector('.sheet img')?.naturalWidth > 0);
      await show(page, `#item=${course.items[4]}&page=3`);
      await until(page, () => document.querySelector('.page-number')?.value === '3');
      await show(page, '#');
      await page.waitForSelector('.hero');
      assert.match(await page.textContent('.facts'), /1 of 9 seen/);
      assert.match(await page.textContent('.hero .primary'), /handbook” at Page 3/);
    }));

  test('sorts and lists as the reader likes, and remembers it', () =>
    shared.visit(course, async (page) => {
      const arranged = await titles(page);
      await sort(page, 'Title');
      const byTitle = await titles(page);
      assert.deepEqual(
        byTitle,
        [...arranged].sort((a, b) => a.localeCompare(b, 'en')),
      );
      await sort(page, 'Longest first');
      assert.equal((await titles(page))[0], 'A song from the harvest');
      const width = async () => (await page.locator('.card').first().boundingBox()).width;
      assert.ok((await width()) < 500);
      await sort(page, 'List');
      assert.ok((await width()) > 900);
      await page.reload();
      assert.equal((await titles(page))[0], 'A song from the harvest');
      assert.ok((await width()) > 900);
      await sort(page, 'As arranged');
      assert.deepEqual(await titles(page), arranged);
    }));
});

describe('search', () => {
  test('reaches every hit, by item', () =>
    shared.visit(many, async (page) => {
      await page.keyboard.press('/');
      await page.fill('.search-field', 'lesson');
      const total = Number(/\d+/.exec(await page.textContent('.result-count'))[0]);
      assert.equal(total, 999); // one description is another
      while (await page.locator('.results > .quiet').count()) await page.click('.results > .quiet');
      assert.equal(await page.locator('.hit').count(), total);
      assert.equal(await page.locator('.hit-group').count(), 500);
      assert.equal(
        await page.locator('.hit-group >> nth=0').locator('.hit-title').count(),
        1,
        'each item is named once',
      );
    }));
});
