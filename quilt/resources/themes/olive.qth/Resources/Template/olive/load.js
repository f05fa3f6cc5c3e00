// SPDX-License-Identifier: Apache-2.0
// Scripts that are fetched when something needs them. They are classic scripts, as everything is that opens from disk.
'use strict';

((Olive) => {
  // What each kind of need takes, in order.
  Olive.groups = {
    lecture: ['divider', 'arrangement', 'lecture'],
    search: ['finder', 'search'],
    pictures: ['finder', 'sheet', 'voice-over', 'image', 'document'],
    montage: ['montage'],
    editing: ['edit-field', 'edit', 'ask', 'live-text', 'live-model', 'live-extras', 'live-page', 'live'],
  };
  const kOfCategory = {
    DualSource: ['lecture', 'pictures'],
    Image: ['pictures'],
    Document: ['pictures'],
    Montage: ['montage'],
  };

  const asked = new Map();
  const there = new Set();

  function fetchScript(path) {
    if (!asked.has(path)) {
      asked.set(
        path,
        new Promise((resolve, reject) => {
          const script = Olive.make('script', {src: path});
          script.async = false;
          script.addEventListener('load', () => {
            there.add(path);
            resolve();
          });
          script.addEventListener('error', () => {
            asked.delete(path);
            script.remove();
            reject(new Error('Missing in this package: ' + path));
          });
          document.head.append(script);
        }),
      );
    }
    return asked.get(path);
  }

  const pathsOf = (groups) => groups.flatMap((group) => Olive.groups[group].map((name) => `olive/${name}.js`));

  // Fetches groups, once; fails with a sentence that names the file.
  Olive.load = (...groups) => Promise.all(pathsOf(groups).map(fetchScript));
  Olive.isLoaded = (...groups) => pathsOf(groups).every((path) => there.has(path));

  // The groups that an item needs before it can be shown.
  Olive.groupsOf = (item) => (Object.hasOwn(kOfCategory, item.category) ? kOfCategory[item.category] : []);

  // The words of a language; those of English are always there.
  Olive.loadWords = (tag) => (Olive.languages[tag] ? Promise.resolve() : fetchScript(`olive/languages/${tag}.js`));
})(window.Olive);
