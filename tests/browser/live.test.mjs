// SPDX-License-Identifier: Apache-2.0
// Editing a served document in its page, with the real program behind it: what is typed is in the record, what is edited
// elsewhere shows, and nothing typed is lost.
import assert from 'node:assert/strict';
import {existsSync, mkdirSync, readFileSync, rmSync, statSync, writeFileSync} from 'node:fs';
import {createRequire} from 'node:module';
import {join} from 'node:path';
import {after, before, describe, test} from 'node:test';
import {openPage} from './browser.mjs';
import {Served, whyNoProgram} from './served.mjs';
import {fixtures, kShots, until, useBrowser} from './support.mjs';

const kFolder = join(process.env.QUILT_BROWSER_BUILD, 'served');
const kAxe = readFileSync(createRequire(import.meta.url).resolve('axe-core/axe.min.js'), 'utf8');
mkdirSync(kShots, {recursive: true});

const media = (name) => join(process.env.QUILT_BROWSER_BUILD, 'media', name);
const course = (files, paper, notes) => ({
  title: 'From Tree to Table',
  author: 'Mara Lindqvist',
  description: 'Six short lessons about olives.\n\nMore at https://example.org/olives.',
  poster: files('valley.png'),
  formats: ['Desktop'],
  collection: {title: 'Slow food'},
  media: [
    {
      source: files('grove-480p.mp4'),
      title: 'The grove in four seasons',
      description: 'A walk through the rows.',
      extras: [paper, notes, files('page-0.jpg')],
    },
    {
      category: 'DualSource',
      title: 'Lecture: what pressing does',
      sources: [files('speaker.mp4'), files('slides.mp4')],
    },
    {
      category: 'Montage',
      title: 'Walk to the mill',
      commentary: files('voice.m4a'),
      sources: [
        {file: files('still-0.jpg'), timecode: 0},
        {file: files('still-1.jpg'), timecode: 4.5, title: 'The gate'},
      ],
    },
  ],
});
const kTitle = '.hero .of-title',
  kAuthor = '.hero .of-author',
  kLead = '.hero .of-description',
  kItemTitle = '.about-head .of-title',
  kItemText = '.about > .of-description';

const isLive = () => document.documentElement.classList.contains('editing') && !!document.querySelector('.editable');
const shows = (page, selector, text) =>
  until(
    page,
    ([where, what]) => {
      const node = document.querySelector(where);
      return !!node && node.textContent === what;
    },
    [selector, text],
  );
const said = (page, text) =>
  until(
    page,
    (words) => {
      const live = document.getElementById('announcements');
      return !!live && live.textContent === words;
    },
    text,
  );

/// Opens the field at a place of the page and puts a text into it.
async function type(page, place, text) {
  await page.click(`${place} > .pencil`);
  await page.fill(`${place} textarea`, text);
}
async function edit(page, place, text, keys = 'Enter') {
  await type(page, place, text);
  await page.keyboard.press(keys);
  await page.waitForSelector(`${place} textarea`, {state: 'detached'});
}

async function scan(page, place) {
  await page.evaluate(kAxe);
  const {violations} = await page.evaluate(() =>
    window.axe.run(document, {
      preload: false,
      runOnly: ['wcag2a', 'wcag2aa', 'wcag21a', 'wcag21aa', 'wcag22aa', 'best-practice'],
    }),
  );
  assert.deepEqual(
    violations.map(
      ({id, nodes}) =>
        `${place}: ${id}: ${nodes.map((node) => node.target.join(' ') + ' ' + (node.any[0] ? node.any[0].message : '')).join('; ')}`,
    ),
    [],
  );
}

test('from disk there is nothing to edit and nothing of it runs', async () => {
  const {launch} = await import('./browser.mjs');
  const browser = await launch();
  const opened = await openPage(browser);
  await opened.page.goto('file://' + join(fixtures.course().folder, 'index.html'));
  await opened.page.waitForSelector('.hero h1');
  assert.equal(await opened.page.locator('.pencil, .editable, .live-only, .editing, .live-notice').count(), 0);
  assert.deepEqual(
    await opened.page.evaluate(() =>
      ['goLive', 'makeEditable', 'settleEdits', 'ask'].filter((name) => name in window.Olive),
    ),
    [],
  );
  assert.deepEqual(opened.complaints, []);
  await browser.close();
});

describe('a served document', {skip: whyNoProgram}, () => {
  const shared = useBrowser();
  let served, model, items;
  before(async () => {
    served = new Served(kFolder, media, course);
    await served.start();
    model = await served.client();
    items = served.record.Media.map((item) => item.UUID);
  });
  after(() => served?.stop());

  /// Opens the page, waits until it is live and asks at the end that nothing was complained about.
  const visit = (body, {hash = '', ...options} = {}) =>
    shared.visit(
      null,
      async (page, opened) => {
        await until(page, isLive);
        await body(page, opened);
      },
      {url: served.address + hash, ...options},
    );
  const atItem = (index) => ({hash: '#item=' + items[index]});
  const itemOnDisk = (index) => served.record.Media[index];
  /// Runs the body while the record cannot be written.
  async function withoutRecord(body) {
    const record = join(served.package, 'properties.plist'),
      kept = readFileSync(record);
    rmSync(record);
    mkdirSync(record);
    writeFileSync(join(record, 'x'), '');
    try {
      await body();
    } finally {
      rmSync(record, {recursive: true});
      writeFileSync(record, kept);
    }
  }
  const itemOf = (index) => model.cvMediaAtIndex(index);

  test('is edited in its title, author and description', () =>
    visit(async (page) => {
      await edit(page, kTitle, 'From Tree to Plate');
      await said(page, 'Saved');
      assert.equal(served.record.Title, 'From Tree to Plate');
      assert.equal(await page.textContent('.hero h1'), 'From Tree to Plate');
      assert.equal(await page.textContent('.brand span'), 'From Tree to Plate');
      assert.equal(await page.title(), 'From Tree to Plate');
      await edit(page, kAuthor, 'Mara & “Bo”');
      assert.equal(served.record.Author, 'Mara & “Bo”');
      await edit(page, kLead, 'Two\n\nparagraphs, https://example.org/a', 'Control+Enter');
      assert.equal(served.record.Description, 'Two\n\nparagraphs, https://example.org/a');
      assert.equal(await page.locator('.lead p').count(), 2);
      assert.equal(await page.getAttribute('.lead a', 'href'), 'https://example.org/a');
      await page.reload();
      await shows(page, '.hero h1', 'From Tree to Plate');
      assert.equal(await page.textContent('.author'), 'Mara & “Bo”');
      await until(page, isLive);
      await edit(page, kTitle, 'From Tree to Table');
    }));

  test('is edited in the titles and descriptions of its items, everywhere they show', () =>
    visit(async (page) => {
      await edit(page, kItemTitle, 'The grove');
      assert.equal(itemOnDisk(0).Title, 'The grove');
      await shows(page, `.row-title[data-title-of="${items[0]}"]`, 'The grove');
      assert.equal(await page.title(), 'The grove – From Tree to Table');
      await edit(page, kItemText, 'First\nline\n\nSecond', 'Control+Enter');
      assert.equal(itemOnDisk(0).Description, 'First\nline\n\nSecond');
      await page.keyboard.press('/');
      await page.fill('.search-field', 'the grove');
      await shows(page, '.hit-title', 'The grove');
      await page.keyboard.press('Escape');
      await page.evaluate(() => {
        location.hash = '#';
      });
      await shows(page, `.card-title[data-title-of="${items[0]}"]`, 'The grove');
      await edit(page, kTitle, 'After a walk'); // the opening page is live again
      assert.equal(served.record.Title, 'After a walk');
      await edit(page, kTitle, 'From Tree to Table');
    }, atItem(0)));

  test('is edited in the titles of its sources', () =>
    visit(async (page) => {
      await page.click('.part-box summary');
      await until(page, () => document.querySelectorAll('.part').length === 3); // two pictures and the voice
      await edit(page, '.part:nth-child(2) .of-title', 'The old gate');
      assert.equal(itemOnDisk(2).Sources[1].Title, 'The old gate');
      await until(page, () =>
        [...document.querySelectorAll('#panel-chapters .row-title')].some((row) => row.textContent === 'The old gate'),
      );
      await edit(page, '.part:nth-child(3) .of-title', 'Ann reads');
      assert.equal(itemOnDisk(2).AudioCommentarySource.Title, 'Ann reads');
    }, atItem(2)));

  test('loses a text that is emptied, and takes one again', () =>
    visit(async (page) => {
      await edit(page, kItemText, '', 'Control+Enter');
      assert.equal('Description' in itemOnDisk(0), false);
      assert.equal(await page.textContent(`${kItemText} > .pencil`), 'Add a description');
      await edit(page, kItemText, 'A walk through the rows.', 'Control+Enter');
      assert.equal(itemOnDisk(0).Description, 'A walk through the rows.');
      await edit(page, kItemTitle, '  ');
      assert.equal('Title' in itemOnDisk(0), false);
      assert.equal(await page.textContent('#item-title'), itemOnDisk(0).Sources[0].Title);
      await edit(page, kItemTitle, 'The grove in four seasons');
      await page.evaluate(() => {
        location.hash = '#';
      });
      await edit(page, kLead, '', 'Control+Enter');
      assert.equal('Description' in served.record, false);
      assert.equal(await page.textContent(`${kLead} > .pencil`), 'Add a description');
      await edit(page, kAuthor, '');
      await page.reload();
      await until(page, isLive);
      assert.equal(
        await page.textContent(`${kLead} > .pencil`),
        'Add a description',
        'not what the model answers for none',
      );
      assert.equal(await page.textContent(`${kAuthor} > .pencil`), 'Add the author');
      await edit(page, kAuthor, 'Mara Lindqvist');
      await edit(page, kLead, 'Six short lessons about olives.', 'Control+Enter');
    }, atItem(0)));

  test('keeps what was there after Escape, and saves when the field is left', () =>
    visit(async (page) => {
      const before = statSync(join(served.package, 'properties.plist')).mtimeMs;
      await type(page, kTitle, 'Never');
      await page.keyboard.press('Escape');
      assert.equal(await page.locator('textarea').count(), 0);
      assert.equal(await page.textContent('.hero h1'), 'From Tree to Table');
      await page.click(`${kTitle} > .pencil`);
      await page.keyboard.press('Enter'); // nothing was changed
      assert.equal(statSync(join(served.package, 'properties.plist')).mtimeMs, before);
      await page.click('.hero h1'); // the text itself opens the field as well
      await page.fill(`${kTitle} textarea`, 'Left');
      await page.click('.facts');
      await page.waitForSelector('textarea', {state: 'detached'});
      assert.equal(served.record.Title, 'Left');
      await type(page, kTitle, 'Gone on');
      await page.click('.card a >> nth=1');
      await shows(page, '#item-title', 'Lecture: what pressing does');
      await shows(page, '.brand span', 'Gone on');
      assert.equal(served.record.Title, 'Gone on');
      await page.evaluate(() => {
        location.hash = '#';
      });
      await type(page, kTitle, 'From Tree to Table');
      await page.click(`${kTitle} .primary`);
      await page.waitForSelector('textarea', {state: 'detached'});
      await type(page, kTitle, 'Never');
      await page.click(`${kTitle} .edit-tools .quiet`);
      assert.equal(await page.locator('textarea').count(), 0);
      assert.equal(served.record.Title, 'From Tree to Table');
    }));

  test('shows what is edited elsewhere without a reload', () =>
    visit(async (page) => {
      await model.cvSetTitle('By the host');
      await shows(page, '.hero h1', 'By the host');
      await shows(page, '.brand span', 'By the host');
      await model.cvSetAuthor(null);
      await until(page, () => document.querySelector('p.author').hidden);
      await model.cvSetAuthor('Mara Lindqvist');
      await shows(page, 'p.author', 'Mara Lindqvist');
      await model.cvSetDescription('One.\n\nTwo.');
      await until(page, () => document.querySelectorAll('.lead p').length === 2);
      for (const index of [2, 0]) await (await itemOf(index)).cvSetTitle('Item ' + index);
      for (const index of [2, 0]) await shows(page, `.card-title[data-title-of="${items[index]}"]`, 'Item ' + index);
      await page.evaluate((id) => {
        location.hash = '#item=' + id;
      }, items[2]);
      await shows(page, '#item-title', 'Item 2');
      const item = await itemOf(2);
      await item.cvSetDescription('New words');
      await shows(page, '.about .description', 'New words');
      await (await item.cvSourceAtIndex(0)).cvSetTitle('At the start');
      await shows(page, '.caption', 'At the start');
      await item.cvSetTitle('Walk to the mill');
      await (await itemOf(0)).cvSetTitle('The grove in four seasons');
      await model.cvSetTitle('From Tree to Table');
      await shows(page, '.brand span', 'From Tree to Table');
    }));

  test('does not overwrite what is being typed, and says that it changed meanwhile', () =>
    visit(async (page) => {
      await type(page, kTitle, 'Mine');
      await model.cvSetTitle('Theirs');
      await page.waitForSelector('.edit-news button');
      assert.match(await page.textContent('.edit-news'), /Changed elsewhere meanwhile: “Theirs”/);
      assert.equal(await page.inputValue(`${kTitle} textarea`), 'Mine');
      await page.keyboard.press('Enter');
      await page.waitForSelector('textarea', {state: 'detached'});
      assert.equal(served.record.Title, 'Mine');
      await type(page, kTitle, 'Mine again');
      await model.cvSetTitle('Theirs again');
      await page.click('.edit-news button');
      assert.equal(await page.inputValue(`${kTitle} textarea`), 'Theirs again');
      await page.keyboard.press('Escape');
      assert.equal(await page.textContent('.hero h1'), 'Theirs again', 'Escape goes back to what is there now');
      await model.cvSetTitle('From Tree to Table');
      await shows(page, '.hero h1', 'From Tree to Table');
    }));

  test('ends with one title for everybody when two edit it at once', () =>
    visit(async (page) => {
      const other = await openPage(shared.browser);
      await other.page.goto(served.address);
      await until(other.page, isLive);
      for (let round = 0; round < 8; ++round) {
        await Promise.all([type(page, kTitle, 'One ' + round), type(other.page, kTitle, 'Two ' + round)]);
        await Promise.all([
          page.keyboard.press('Enter'),
          other.page.keyboard.press('Enter'),
          model.cvSetTitle('Three ' + round),
        ]);
        await Promise.all([page, other.page].map((each) => each.waitForSelector('textarea', {state: 'detached'})));
        const title = served.record.Title;
        assert.match(title, new RegExp(`^(One|Two|Three) ${round}$`));
        assert.equal(await model.cvTitle(), title);
        await shows(page, '.hero h1', title);
        await shows(other.page, '.hero h1', title);
      }
      assert.deepEqual(other.complaints, []);
      await other.context.close();
      await model.cvSetTitle('From Tree to Table');
    }));

  test('shows typed markup as text', () =>
    visit(async (page) => {
      const words = '</script><img src=x onerror="window.hacked=1"> \u2028 & “q”';
      await edit(page, kTitle, words);
      assert.equal(await page.textContent('.hero h1'), words);
      assert.equal(served.record.Title, words);
      await page.reload();
      await shows(page, '.hero h1', words);
      assert.equal(await page.evaluate(() => window.hacked), undefined);
      await until(page, isLive);
      await edit(page, kTitle, 'From Tree\u0001\u000b to Table');
      assert.equal(served.record.Title, 'From Tree to Table', 'the record holds no control characters');
    }));

  test('takes no text that is refused, and says why where it was typed', () =>
    visit(async (page) => {
      await page.click(`${kLead} > .pencil`);
      await page.evaluate((place) => {
        document.querySelector(place).value = 'x'.repeat(1200000);
      }, `${kLead} textarea`);
      await page.keyboard.press('Control+Enter');
      await page.waitForSelector('.edit-problem:not(:empty)');
      assert.match(await page.textContent('.edit-problem'), /too long/);
      assert.equal(await page.getAttribute(`${kLead} textarea`, 'aria-invalid'), 'true');
      await page.fill(`${kLead} textarea`, 'Shorter');
      await page.keyboard.press('Control+Enter');
      await page.waitForSelector('textarea', {state: 'detached'});
      assert.equal(served.record.Description, 'Shorter');

      // Half a character finds no way into the browser, and is made there.
      await page.evaluate((id) => {
        location.hash = '#item=' + id;
      }, items[1]);
      await page.waitForSelector('.part-box');
      await page.evaluate(() => document.querySelector('.part-box summary').click());
      await page.click('.part:nth-child(1) .pencil');
      await page.evaluate(() => {
        document.querySelector('.part textarea').value = 'Half a ' + String.fromCharCode(0xd83d) + 'character';
      });
      await page.keyboard.press('Enter');
      await page.waitForSelector('textarea', {state: 'detached'});
      assert.equal(itemOnDisk(1).Sources[0].Title, 'Half a character');
    }));

  test('tells when the record cannot be written, and saves once it can', () =>
    visit(
      async (page) => {
        await withoutRecord(async () => {
          await type(page, kTitle, 'Unwritten');
          await page.keyboard.press('Enter');
          await page.waitForSelector('.edit-problem:not(:empty)');
          assert.match(await page.textContent('.edit-problem'), /cannot be written to disk/);
          assert.equal(await page.inputValue(`${kTitle} textarea`), 'Unwritten');
          await shows(page, '.brand span', 'Unwritten');
          assert.equal(await page.textContent('.edit-news'), '', 'nobody else changed it');
        });
        await page.click(`${kTitle} .primary`);
        await page.waitForSelector('textarea', {state: 'detached'});
        assert.equal(served.record.Title, 'Unwritten');
        await edit(page, kTitle, 'From Tree to Table');
      },
      {quiet: false},
    ));

  test('finds its way back when the program has let go of the page', () =>
    visit(
      async (page) => {
        await page.evaluate(() => window.conveyor.close());
        await edit(page, kTitle, 'After a sleep'); // at once, with objects that are no more
        assert.equal(served.record.Title, 'After a sleep');
        await page.evaluate(() => window.conveyor.close());
        await model.cvSetTitle('Changed meanwhile');
        await shows(page, '.hero h1', 'Changed meanwhile');
        await model.cvSetTitle('From Tree to Table');
        await shows(page, '.hero h1', 'From Tree to Table');
        assert.equal(await page.locator('.live-notice').count(), 0);
      },
      {quiet: false},
    ));

  test('is edited by the keyboard alone', () =>
    visit(async (page) => {
      const name = () =>
        page.evaluate(() => document.activeElement.getAttribute('aria-label') || document.activeElement.textContent);
      const tabTo = async (label, limit = 40) => {
        for (let i = 0; i < limit; ++i) {
          if ((await name()) === label) return;
          await page.keyboard.press('Tab');
        }
        assert.fail(`${label} is not reached`);
      };
      await tabTo('Edit the title');
      await page.keyboard.press('Enter');
      assert.equal(await name(), 'Title');
      await page.keyboard.type('By keys');
      await page.keyboard.press('Enter');
      await page.waitForSelector('textarea', {state: 'detached'});
      assert.equal(await name(), 'Edit the title', 'the focus is back');
      await said(page, 'Saved');
      assert.equal(served.record.Title, 'By keys');
      await tabTo('Edit the author');
      await page.keyboard.press(' ');
      await page.keyboard.type('m/k?'); // no shortcut of the player
      assert.equal(await page.locator('dialog').count(), 0);
      await page.keyboard.press('Tab');
      assert.equal(await name(), 'Revert', 'still in the editor');
      await page.keyboard.press('Enter');
      assert.equal(await name(), 'Edit the author');
      assert.equal(await page.textContent('p.author'), 'Mara Lindqvist');
      await tabTo('Edit the description');
      await page.keyboard.press('Enter');
      await page.keyboard.press('Control+a');
      await page.keyboard.type('One');
      await page.keyboard.press('Enter');
      await page.keyboard.type('Two');
      await page.keyboard.press('Tab');
      await page.keyboard.press('Tab');
      assert.equal(await name(), 'Save');
      await page.keyboard.press('Tab'); // leaves
      await page.waitForSelector('textarea', {state: 'detached'});
      assert.equal(served.record.Description, 'One\nTwo');
      await page.keyboard.press('Shift+Tab');
      await edit(page, kTitle, 'From Tree to Table');
      await page.click('button[aria-label="Edit the texts of this page"]');
      assert.equal(await page.locator('.pencil:visible').count(), 0, 'as readers see it');
      await page.reload();
      await until(
        page,
        () => (document.querySelector('.head-tools [aria-pressed]') || {disabled: true}).disabled === false,
      );
      assert.equal(await page.locator('.pencil:visible').count(), 0, 'remembered');
      await page.click('button[aria-label="Edit the texts of this page"]');
      assert.ok((await page.locator('.pencil:visible').count()) >= 3);
    }));

  for (const [scheme, language] of [
    ['light', ''],
    ['dark', ''],
    ['light', 'ar'],
  ]) {
    test(`passes the accessibility scan while it is edited and loses nothing in narrow windows: ${scheme} ${language}`, () =>
      visit(
        async (page) => {
          if (language) {
            await page.click('.settings-button');
            await page.selectOption('.settings select >> nth=1', language);
            await page.keyboard.press('Escape');
            await until(page, isLive);
          }
          for (const width of [320, 768, 1280]) {
            await page.setViewportSize({width, height: width === 320 ? 640 : 800});
            const shoot = async (name) => {
              await page.screenshot({
                path: join(kShots, `live-${name}-${width}-${scheme}${language && '-' + language}.png`),
              });
              assert.ok(
                await page.evaluate(() => document.documentElement.scrollWidth <= innerWidth),
                `${name} ${width} is too wide`,
              );
              const small = await page.evaluate(() =>
                [...document.querySelectorAll('.editor button, .pencil, .remove')]
                  .filter(
                    (node) =>
                      node.getClientRects().length &&
                      (node.getBoundingClientRect().width < 24 || node.getBoundingClientRect().height < 24),
                  )
                  .map((node) => node.outerHTML.slice(0, 80)),
              );
              assert.deepEqual(small, []);
              await scan(page, `${name} ${width}`);
            };
            await page.evaluate(() => {
              location.hash = '#';
            });
            await page.waitForSelector('.hero .editable');
            await type(page, kTitle, 'From Tree to Table, and what the mill has to do with it');
            await shoot('title');
            await page.keyboard.press('Escape');
            await type(
              page,
              kLead,
              'Six short lessons about olives.\n\nHow the tree grows, how the fruit is picked and pressed, and how to taste what comes out.',
            );
            await shoot('description');
            await page.keyboard.press('Escape');
            await page.evaluate((id) => {
              location.hash = '#item=' + id;
            }, items[0]);
            await page.waitForSelector('.about .editable');
            await page.click('.part-box summary');
            await withoutRecord(async () => {
              await type(page, '.part:nth-child(1) .of-title', 'A name for this file');
              await page.keyboard.press('Enter');
              await page.waitForSelector('.edit-problem:not(:empty)');
            });
            await page.locator('.part-box').scrollIntoViewIfNeeded();
            await shoot('item');
            await page.keyboard.press('Escape');
            await (await (await itemOf(0)).cvSourceAtIndex(0)).cvSetTitle('grove');
            await page.click('.remove >> nth=0');
            await page.waitForSelector('.ask-dialog');
            await shoot('ask');
            await page.keyboard.press('Escape');
          }
        },
        {colorScheme: scheme, quiet: false},
      ));
  }

  test('keeps what was typed for something that goes away meanwhile', () =>
    visit(
      async (page) => {
        await page.click('.part-box summary');
        await type(page, '.part:last-child .of-title', 'Too late');
        await (await itemOf(0)).cvRemoveExtraAtIndex(2);
        await until(page, () => document.querySelectorAll('.extras > li').length === 2);
        await page.keyboard.press('Enter');
        await page.waitForSelector('.edit-problem:not(:empty)');
        assert.match(await page.textContent('.edit-problem'), /no longer part of the document/);
        assert.equal(await page.inputValue('.part textarea'), 'Too late');
        await page.keyboard.press('Escape');
      },
      {...atItem(0), quiet: false},
    ));

  test('loses an extra after a question', () =>
    visit(async (page) => {
      const [first, second] = itemOnDisk(0).Extras;
      const folderOf = (extra) => join(served.package, 'media', items[0], 'extras', extra.UUID);
      assert.ok(existsSync(folderOf(first)) && existsSync(folderOf(second)));
      await page.focus(`.remove[data-remove="${first.UUID}"]`);
      await page.keyboard.press('Enter');
      await page.waitForSelector('.ask-dialog');
      assert.equal(
        await page.evaluate(() => document.activeElement.textContent),
        'Cancel',
        'the harmless answer first',
      );
      await page.keyboard.press('Enter');
      assert.equal(itemOnDisk(0).Extras.length, 2);
      assert.equal(await page.evaluate(() => document.activeElement.dataset.remove), first.UUID, 'the focus is back');
      await page.keyboard.press('Enter');
      await page.click('.ask-dialog .danger');
      await page.waitForSelector('.ask-dialog', {state: 'detached'});
      await said(page, '“worksheet” was removed');
      assert.deepEqual(
        itemOnDisk(0).Extras.map((extra) => extra.UUID),
        [second.UUID],
      );
      assert.equal(existsSync(folderOf(first)), false);
      assert.equal(await page.locator('.extras > li').count(), 1);
      assert.equal(
        await page.evaluate(() => document.activeElement.dataset.remove),
        second.UUID,
        'the next one has the focus',
      );
      await (await itemOf(0)).cvRemoveExtraAtIndex(0);
      await page.waitForSelector('.extras', {state: 'detached'});
      assert.equal('Extras' in itemOnDisk(0), false);
      assert.equal(existsSync(folderOf(second)), false);
      await page.reload();
      await until(page, isLive);
      assert.equal(await page.locator('.extras').count(), 0);
    }, atItem(0)));

  test('gives a page that is loaded anew, and other themes, the edited data', async () => {
    await model.cvSetTitle('At once');
    assert.match(await (await fetch(served.address + 'controllers/data.js')).text(), /"Title":"At once"/);
    await (await itemOf(1)).cvSetTitle('Also at once');
    assert.match(await (await fetch(served.address + 'controllers/data.js')).text(), /"Title":"Also at once"/);
    assert.match(readFileSync(join(served.package, 'controllers/data.js'), 'utf8'), /"Title":"Also at once"/);
    await model.cvSetTitle('From Tree to Table');
  });

  test('keeps what was typed when the program ends meanwhile', () =>
    visit(
      async (page) => {
        await type(page, kTitle, 'Typed and not lost');
        assert.equal(await served.stop(), 130);
        assert.match(served.errors, /Stopped\. Every edit is saved/);
        await page.waitForSelector('.live-notice');
        assert.match(await page.textContent('.live-notice'), /The program that serves this page has stopped/);
        assert.equal(await page.inputValue(`${kTitle} textarea`), 'Typed and not lost');
        await page.focus(`${kTitle} textarea`);
        await page.keyboard.press('Enter');
        await page.waitForSelector('.edit-problem:not(:empty)');
        assert.match(await page.textContent('.edit-problem'), /your text is still here/);
        assert.equal(await page.inputValue(`${kTitle} textarea`), 'Typed and not lost');
        await page.screenshot({path: join(kShots, 'live-stopped-1280-light.png')});
        await scan(page, 'stopped');
        await page.evaluate((id) => {
          location.hash = '#item=' + id;
        }, items[0]);
        await page.waitForSelector('.unsaved');
        assert.equal(await page.inputValue('.unsaved'), 'Typed and not lost', 'also when the page goes on');
        await page.keyboard.press('Escape');
        assert.equal(await page.locator('.pencil:visible').count(), 0);
        await served.start();
        model = await served.client();
        await visit(async (again) => assert.equal(await again.textContent('.hero h1'), 'From Tree to Table'));
      },
      {quiet: false},
    ));

  for (const [signal, code] of [
    ['SIGINT', 130],
    ['SIGTERM', 143],
    ['SIGKILL', null],
  ]) {
    test(`is whole on disk after ${signal} directly after an edit`, async () => {
      const item = await itemOf(1);
      await model.cvSetTitle(`Before ${signal}`);
      await item.cvSetTitle(`Item before ${signal}`);
      served.process.kill(signal);
      assert.equal(await served.ended, code);
      assert.equal(served.record.Title, `Before ${signal}`);
      assert.equal(itemOnDisk(1).Title, `Item before ${signal}`);
      const data = () => readFileSync(join(served.package, 'controllers/data.js'), 'utf8');
      if (signal !== 'SIGKILL')
        assert.match(data(), new RegExp(`"Title":"Item before ${signal}"`), 'the page on disk, too');
      await served.stop();
      await served.start();
      model = await served.client();
      assert.equal(await model.cvTitle(), `Before ${signal}`);
      assert.match(data(), new RegExp(`"Title":"Item before ${signal}"`));
      assert.equal(served.run('check', served.uuid), '');
    });
  }
});

describe('a served document of one item', {skip: whyNoProgram}, () => {
  const shared = useBrowser();
  let served;
  before(async () => {
    served = new Served(kFolder + '-single', media, (files) => ({
      title: 'Alone',
      media: [{source: files('sea.png'), title: 'The sea'}],
    }));
    await served.start();
  });
  after(() => served?.stop());

  test('says at the end what could not be saved', async () => {
    const model = await served.client(),
      record = join(served.package, 'properties.plist'),
      kept = readFileSync(record);
    rmSync(record);
    mkdirSync(record);
    await assert.rejects(model.cvSetTitle('Lost'), {code: 'not-saved'});
    assert.notEqual(await served.stop(), 130);
    assert.match(served.errors, /The last edits of the document "Alone" cannot be saved/);
    rmSync(record, {recursive: true, force: true});
    writeFileSync(record, kept);
    await served.start();
  });

  test('is edited beside its item', () =>
    shared.visit(
      null,
      async (page) => {
        await until(page, isLive);
        await edit(page, '.package-texts .of-title', 'By itself');
        await edit(page, '.package-texts .of-author', 'Ann');
        assert.equal(served.record.Title, 'By itself');
        assert.equal(served.record.Author, 'Ann');
        await shows(page, '.brand span', 'By itself');
        await edit(page, kItemTitle, 'The wide sea');
        assert.equal(served.record.Media[0].Title, 'The wide sea');
      },
      {url: served.address},
    ));
});
