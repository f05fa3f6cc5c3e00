// SPDX-License-Identifier: Apache-2.0
// The dialog that searches the package.
'use strict';

((Olive) => {
  const {make, say} = Olive;
  const kGroups = 40; // of hits that are shown at once

  // find: from makeFinder; query: what to begin with; onChoice(hit, terms).
  Olive.openSearch = (find, query, onChoice) => {
    const results = make('div', {class: 'results'});
    const count = make('p', {class: 'result-count', role: 'status'});
    const field = make('input', {
      type: 'search',
      class: 'search-field',
      'aria-label': say('search'),
      placeholder: say('searchHint'),
      autocomplete: 'off',
      spellcheck: 'false',
    });

    function where(hit) {
      if (hit.page) return say('page', {n: hit.page});
      if (hit.kind === 'chapter') return hit.t === undefined ? '' : Olive.clock(hit.t);
      if (hit.kind === 'extra') return say('extras');
      return hit.item.category ? Olive.kindOf(hit.item) : '';
    }

    // One hit; only the first of an item says whose it is.
    function makeHit(hit, terms, isFirst) {
      const isTitle = hit.kind === 'title';
      const onclick = () => {
        dialog.close();
        onChoice(hit, terms, field.value);
      };
      return make(
        'a',
        {
          class: 'hit',
          href: Olive.address.to({item: hit.item.id, t: hit.t, page: hit.page}),
          onclick,
          'aria-label': isFirst || isTitle ? null : `${hit.item.title}: ${hit.text.slice(0, 90)}`,
        },
        (isFirst || isTitle) &&
          make(
            'span',
            {class: 'hit-title', dir: 'auto'},
            isTitle ? Olive.highlighted(hit.text, terms) : hit.item.title,
          ),
        !isTitle && make('span', {class: 'hit-text', dir: 'auto'}, Olive.highlighted(hit.text, terms)),
        make('span', {class: 'meta', text: where(hit)}),
      );
    }

    // Shows the groups of hits up to a number of them; a button shows more.
    function showGroups(groups, terms, limit) {
      const entries = groups.slice(0, limit).map((hits) =>
        make(
          'li',
          {class: 'hit-group'},
          hits.map((hit, i) => makeHit(hit, terms, i === 0)),
        ),
      );
      const showMore = () => {
        showGroups(groups, terms, limit + kGroups);
        results.querySelectorAll('.hit-group')[limit].querySelector('a').focus();
      };
      results.replaceChildren(
        make('ul', null, entries),
        ...(groups.length > limit
          ? [make('button', {type: 'button', class: 'quiet', text: say('moreResults'), onclick: showMore})]
          : []),
      );
    }

    function update() {
      const {hits, terms, total} = find(field.value);
      count.textContent = terms.length ? (total ? say('resultCount', {n: total}) : say('noResults')) : '';
      const groups = new Map();
      for (const hit of hits) groups.set(hit.item, [...(groups.get(hit.item) || []), hit]);
      showGroups([...groups.values()], terms, kGroups);
    }

    field.value = query;
    field.addEventListener('input', update);
    field.addEventListener('keydown', (event) => {
      const first = results.querySelector('a');
      if (event.key === 'Enter' && first) first.click();
      else if (event.key === 'ArrowDown' && first) first.focus();
      else if (event.key === 'Escape')
        dialog.close(); // at once, not after the field was emptied
      else return;
      event.preventDefault();
    });
    results.addEventListener('keydown', (event) => {
      const step = {ArrowDown: 1, ArrowUp: -1}[event.key];
      if (!step) return;
      const links = [...results.querySelectorAll('a')];
      const target = links.indexOf(document.activeElement) + step;
      (links[target] || field).focus();
      event.preventDefault();
    });
    const dialog = Olive.openDialog('search-dialog', say('search'), [field, count, results]);
    field.focus();
    field.select();
    update();
  };
})(window.Olive);
