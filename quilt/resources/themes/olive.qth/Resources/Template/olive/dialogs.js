// SPDX-License-Identifier: Apache-2.0
// Settings, keyboard help, and the frame of every dialog. The browser's own dialogs keep the focus inside and give it back.
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

  // app: see app.js
  Olive.openSettings = (app) => {
    const {memory} = app;
    const set = (name) => (value) => {
      memory.choose(name, value);
      app.apply();
    };
    const setLanguage = (value) => {
      memory.choose('language', value);
      app.rebuild();
    };
    const forget = make('button', {
      type: 'button',
      class: 'quiet',
      text: say('forget'),
      onclick: () => {
        app.rebuild(memory.forget);
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
          [['', say('automatic')], ...Object.entries(Olive.languageNames)],
          setLanguage,
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
