// SPDX-License-Identifier: Apache-2.0
// What can be said of the theme without a browser: its size, what its files may not use, its words.
import assert from 'node:assert/strict';
import {readdirSync, readFileSync, statSync} from 'node:fs';
import {dirname, join, relative} from 'node:path';
import {test} from 'node:test';
import vm from 'node:vm';
import {kTemplate} from './packages.mjs';

const kBundle = dirname(dirname(kTemplate));
const filesIn = (folder) =>
  readdirSync(folder, {recursive: true, withFileTypes: true})
    .filter((entry) => entry.isFile())
    .map((entry) => join(entry.parentPath || entry.path, entry.name));
const scripts = filesIn(kTemplate).filter((file) => file.endsWith('.js'));
const page = readFileSync(join(kTemplate, 'index.html'), 'utf8');

const sizeOf = (files) => files.reduce((sum, file) => sum + statSync(file).size, 0);

test('the whole bundle stays within 500 kB', () => {
  const size = sizeOf(filesIn(kBundle));
  assert.ok(size <= 500000, `${size} bytes`);
});

test('what is loaded before the first picture stays within 200 kB, in every language', () => {
  const files = [...page.matchAll(/ (?:src|href)="(olive\/[^"]+)"/g)].map((match) => join(kTemplate, match[1]));
  const words = scripts.filter((file) => file.includes('/languages/') && !file.endsWith('/en.js'));
  const size =
    sizeOf([join(kTemplate, 'index.html'), ...files]) + Math.max(...words.map((file) => statSync(file).size));
  assert.ok(size <= 200000, `${size} bytes`);
});

test('the bundle has its metadata and its preview', () => {
  const info = readFileSync(join(kBundle, 'Info.plist'), 'utf8');
  for (const [key, value] of [
    ['CFBundleIdentifier', 'org.quilt.theme.olive'],
    ['CFBundleDisplayName', 'Olive'],
    ['CFBundleShortVersionString', '1.0'],
  ]) {
    assert.match(info, new RegExp(`<key>${key}</key>\\s*<string>${value.replace(/\./g, '\\.')}</string>`));
  }
  assert.equal(readFileSync(join(kBundle, 'Resources/Preview.png')).subarray(1, 4).toString(), 'PNG');
});

test('no file uses what local pages may not, nor sets text as markup', () => {
  const forbidden = [
    /type=["']?module/,
    /\bimport\s*\(/,
    /^\s*import\s/m,
    /\bfetch\s*\(/,
    /XMLHttpRequest/,
    /\bWorker\s*\(/,
    /serviceWorker/,
    /<track\b|'track'/,
    /<use\b|'use'/,
    /AudioContext/,
    /toDataURL|getImageData/,
    /\beval\s*\(/,
    /new Function/,
    /innerHTML|outerHTML|insertAdjacentHTML|document\.write/,
    /pushState/,
    /sendBeacon|EventSource|WebSocket/,
    /<iframe|'iframe'/,
    /\son\w+=["']/,
    /style=["']/,
  ];
  for (const file of [...scripts, join(kTemplate, 'index.html'), join(kTemplate, 'olive/olive.css')]) {
    const text = readFileSync(file, 'utf8').replace(/'use strict';/g, '');
    for (const pattern of forbidden) assert.doesNotMatch(text, pattern, relative(kTemplate, file));
  }
  assert.doesNotMatch(readFileSync(join(kTemplate, 'olive/olive.css'), 'utf8'), /url\(|@import/);
});

/// What load.js says that it fetches.
function fetched() {
  const window = {Olive: {}, conveyor: undefined};
  vm.runInNewContext(readFileSync(join(kTemplate, 'olive/load.js'), 'utf8'), {window});
  return [...new Set(Object.values(window.Olive.groups).flatMap((names) => names.map((name) => `olive/${name}.js`)))];
}

/// The languages that can be chosen.
function tagsOfLanguages() {
  const window = {Olive: {}};
  vm.runInNewContext(readFileSync(join(kTemplate, 'olive/words.js'), 'utf8'), {window});
  return Object.keys(window.Olive.languageNames);
}

test('every script of the theme is loaded once, by the page or when it is needed, under a policy', () => {
  const loaded = [...page.matchAll(/<script[^>]* src="([^"]+)"/g)].map((match) => match[1]);
  const later = tagsOfLanguages()
    .filter((tag) => tag !== 'en')
    .map((tag) => `olive/languages/${tag}.js`);
  assert.deepEqual(
    [...loaded, ...fetched(), ...later].sort(),
    ['controllers/data.js', ...scripts.map((file) => relative(kTemplate, file))].sort(),
  );
  assert.match(
    page,
    /Content-Security-Policy" content="default-src 'none'; script-src 'self'; style-src 'self'; img-src 'self'; media-src 'self';[^"]*connect-src 'none'/,
  );
  assert.doesNotMatch(page, /unsafe-|https?:/);
});

test('no name of the template collides with the package’s own entries', () => {
  const own = [
    'properties.plist',
    'media',
    'poster.png',
    'JukeboxMetadata.plist',
    'JukeboxArtwork',
    'data.js',
    'Glance',
    'controllers',
  ];
  for (const name of readdirSync(kTemplate)) assert.ok(!own.includes(name), name);
});

function languages() {
  const window = {Olive: {languages: {}}};
  for (const file of scripts.filter((each) => each.includes('/languages/')))
    vm.runInNewContext(readFileSync(file, 'utf8'), {window});
  return window.Olive.languages;
}

test('every language says everything, with the same values and all its plural forms', () => {
  const all = languages();
  assert.ok(Object.keys(all).length >= 6);
  assert.ok(Object.values(all).some((language) => language.direction === 'rtl'));
  const names = (word) => new Set([...JSON.stringify(word).matchAll(/\{(\w+)\}/g)].map((match) => match[1]));
  for (const [tag, language] of Object.entries(all)) {
    assert.deepEqual(Object.keys(language.words).sort(), Object.keys(all.en.words).sort(), tag);
    for (const [key, word] of Object.entries(language.words)) {
      assert.deepEqual(names(word), names(all.en.words[key]), `${tag} ${key}`);
      if (typeof all.en.words[key] === 'string') continue;
      for (const form of new Intl.PluralRules(tag).resolvedOptions().pluralCategories)
        assert.ok(word[form] || word.other, `${tag} ${key} ${form}`);
    }
  }
});

test('every word is used and every used word is there', () => {
  const {en} = languages();
  const code = scripts
    .filter((file) => !file.includes('/languages/'))
    .map((file) => readFileSync(file, 'utf8'))
    .join('\n');
  for (const key of Object.keys(en.words)) {
    const isComposed = ['appearance-', 'category-', 'view-', 'sort-', 'layout-'].some(
      (prefix) => key.startsWith(prefix) && code.includes(`say('${prefix}' +`),
    );
    assert.ok(isComposed || code.includes(`'${key}'`), `${key} is used nowhere`);
  }
  for (const [, key] of code.matchAll(/\bsay\('([\w-]+)'(?! \+)/g)) assert.ok(key in en.words, `${key} has no words`);
});
