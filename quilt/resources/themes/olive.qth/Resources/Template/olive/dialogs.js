// SPDX-License-Identifier: Apache-2.0
// Search, settings, keyboard help. The browser's own dialogs keep the focus inside and give it back.
'use strict';

((Olive) => {
  const {make, say} = Olive;

  Olive.openDialog = openDialog;
  function openDialog(name, title, content) {
    const heading = 'dialog-title';
    const dialog = make(
      'dialog',
      {class: 'dialog ' + name, 'aria-labelledby': heading},
      make(
        'div',
        {class: 'dialog-head'},
        make('h2', {id: heading, text: title}),
        Olive.iconButton('close', say('close'), () => dialog.close()),
      ),
      content,
    );
    dialog.addEventListener('click', (event) => {
      if (event.target === dialog) dialog.close();
    });
    dialog.addEventListener('close', () => {
      dialog.remove();
      if (document.activeElement === document.body) document.getElementById('main').focus(); // the page was built anew
    });
    document.body.append(dialog);
    dialog.showModal();
    return dialog;
  }

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

    function update() {
      const {hits, terms, total} = find(field.value);
      count.textContent = terms.length ? (total ? say('resultCount', {n: total}) : say('noResults')) : '';
      results.replaceChildren(
        make(
          'ul',
          null,
          hits.map((hit) => {
            const isTitle = hit.kind === 'title';
            return make(
              'li',
              null,
              make(
                'a',
                {
                  class: 'hit',
                  href: Olive.address.to({item: hit.item.id, t: hit.t, page: hit.page}),
                  onclick: () => {
                    dialog.close();
                    onChoice(hit, terms, field.value);
                  },
                },
                make(
                  'span',
                  {class: 'hit-title', dir: 'auto'},
                  isTitle ? Olive.highlighted(hit.text, terms) : hit.item.title,
                ),
                !isTitle && make('span', {class: 'hit-text', dir: 'auto'}, Olive.highlighted(hit.text, terms)),
                make('span', {class: 'meta', text: where(hit)}),
              ),
            );
          }),
        ),
      );
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
    const dialog = openDialog('search-dialog', say('search'), [field, count, results]);
    field.focus();
    field.select();
    update();
  };

  function choice(label, value, options, onchange) {
    const select = make(
      'select',
      {class: 'choice', onchange: () => onchange(select.value)},
      options.map(([key, text]) => make('option', {value: key, text})),
    );
    select.value = value;
    return make('label', {class: 'setting'}, make('span', {text: label}), select);
  }

  function toggle(label, value, onchange) {
    const box = make('input', {type: 'checkbox', class: 'switch', onchange: () => onchange(box.checked)});
    box.checked = value;
    return make('label', {class: 'setting'}, make('span', {text: label}), box);
  }

  // apply(isAnew, before): shows the choices; anew when words or marks change, after before() was done.
  Olive.openSettings = (memory, apply) => {
    const set = (name, isAtOnce) => (value) => {
      memory.choose(name, value);
      apply(isAtOnce);
    };
    const forget = make('button', {
      type: 'button',
      class: 'quiet',
      text: say('forget'),
      onclick: () => {
        apply(true, memory.forget);
        Olive.announce(say('forgotten'));
        forget.disabled = true;
      },
    });
    forget.disabled = !memory.hasPlaces();
    openDialog(
      'settings-dialog',
      say('settings'),
      make(
        'div',
        {class: 'settings'},
        choice(
          say('appearance'),
          memory.choice('appearance', 'system'),
          ['system', 'light', 'dark', 'contrast'].map((key) => [key, say('appearance-' + key)]),
          set('appearance'),
        ),
        choice(
          say('language'),
          memory.choice('language', ''),
          [['', say('automatic')], ...Object.entries(Olive.languages).map(([key, language]) => [key, language.name])],
          set('language', true),
        ),
        toggle(say('motion'), memory.choice('motion', true), set('motion')),
        toggle(say('autoAdvance'), memory.choice('advance', false), set('advance')),
        toggle(say('useKeys'), memory.choice('keys', true), set('keys')),
        forget,
      ),
    );
  };

  Olive.openHelp = (keys) => {
    openDialog(
      'help-dialog',
      say('help'),
      make(
        'dl',
        {class: 'keys', tabindex: 0, 'aria-label': say('help')},
        keys.map(([names, label]) =>
          make(
            'div',
            null,
            make(
              'dt',
              null,
              names.map((name) => make('kbd', {text: name})),
            ),
            make('dd', {text: say(label)}),
          ),
        ),
      ),
    );
  };

  // For browsers that let no page write to the clipboard.
  Olive.openLink = (link) => {
    const field = make('input', {type: 'text', readonly: true, class: 'search-field', 'aria-label': say('copyLink')});
    field.value = link;
    openDialog('link-dialog', say('copyLink'), field);
    field.select();
  };
})(window.Olive);
