// SPDX-License-Identifier: Apache-2.0
// Search in titles, descriptions, chapters and page texts; blind to case and accents.
'use strict';

((Olive) => {
  const kSnippet = 90;
  const fold = (text) => text.normalize('NFD').replace(/\p{M}/gu, '').toLowerCase();

  // The folded text, with the place in the text that each of its units came from.
  function foldWithPlaces(text) {
    let folded = '';
    const places = [];
    let at = 0;
    for (const character of text) {
      const plain = fold(character);
      for (let i = 0; i < plain.length; ++i) places.push(at);
      folded += plain;
      at += character.length;
    }
    places.push(at);
    return {folded, places};
  }

  // [{from, to}] of the terms in the text, in order and apart from each other.
  function ranges(text, terms) {
    const {folded, places} = foldWithPlaces(text);
    const found = [];
    for (const term of terms) {
      for (let at = folded.indexOf(term); at >= 0; at = folded.indexOf(term, at + term.length)) {
        let end = at + term.length;
        while (end < places.length - 1 && places[end] === places[end - 1]) ++end;
        found.push({from: places[at], to: places[end]});
      }
    }
    found.sort((a, b) => a.from - b.from || b.to - a.to);
    return found.filter(
      (range, i) => i === 0 || range.from >= Math.max(...found.slice(0, i).map((before) => before.to)),
    );
  }

  // The text as nodes, its terms marked; a long text is cut around the first of them.
  Olive.highlighted = (text, terms, whole) => {
    let marks = ranges(text, terms);
    let start = 0,
      end = text.length;
    if (!whole && text.length > 2 * kSnippet) {
      const first = marks.length ? marks[0].from : 0;
      start = Math.max(0, first - kSnippet / 2);
      end = Math.min(text.length, start + 2 * kSnippet);
      marks = marks.filter((mark) => mark.from >= start && mark.to <= end);
    }
    const nodes = [start > 0 ? '…' : ''];
    let at = start;
    for (const mark of marks) {
      nodes.push(text.slice(at, mark.from), Olive.make('mark', {text: text.slice(mark.from, mark.to)}));
      at = mark.to;
    }
    nodes.push(text.slice(at, end), end < text.length ? '…' : '');
    return nodes.filter((node) => node !== '');
  };

  Olive.termsOf = (query) => fold(query).split(/\s+/).filter(Boolean);

  // Returns find(query): hits {item, kind, text, t, page} in the order of the package, those in titles first.
  Olive.makeFinder = (items) => {
    let entries = null;

    function index() {
      const made = [];
      const add = (item, kind, text, place, weight) => {
        if (text) made.push({item, kind, text, folded: fold(text), weight, ...place});
      };
      for (const item of items) {
        add(item, 'title', item.title, {}, 0);
        for (const chapter of item.chapters)
          add(item, 'chapter', chapter.title, chapter.start === null ? {} : {t: chapter.start}, 1);
        item.pages.forEach((page, i) => add(item, 'page', page.text || page.title, {page: i + 1}, 2));
        for (const extra of item.extras) add(item, 'extra', extra.title, {}, 2);
        add(item, 'description', item.description, {}, 2);
      }
      return made.sort((a, b) => a.weight - b.weight);
    }

    return function find(query) {
      const terms = Olive.termsOf(query);
      if (!terms.length) return {hits: [], terms, total: 0};
      entries = entries || index();
      const found = entries.filter((entry) => terms.every((term) => entry.folded.includes(term)));
      return {hits: found, terms, total: found.length};
    };
  };
})(window.Olive);
