// SPDX-License-Identifier: Apache-2.0
// The head of every page: the package's name, which leads to its contents, and the tools of the whole page.
'use strict';

((Olive) => {
  const {make, say} = Olive;

  // app: see app.js
  Olive.makeHead = (app) => {
    const {pack} = app;
    const goHome = (event) => {
      event.preventDefault();
      app.goHome();
    };
    const tool = (icon, label, act, kind) =>
      Olive.iconButton(icon, say(label), act, {class: 'icon-button ' + (kind || '')});
    return make(
      'header',
      {class: 'head'},
      make(
        'a',
        {class: 'brand', href: '#', onclick: goHome},
        Olive.icon('home'),
        make('span', {dir: 'auto', 'data-title-of': pack.id, text: pack.title || say('untitledPackage')}),
      ),
      make(
        'div',
        {class: 'head-tools'},
        make(
          'button',
          {type: 'button', class: 'search-button', 'aria-label': say('search'), onclick: () => app.openSearch()},
          Olive.icon('search'),
          make('span', {text: say('search')}),
          make('kbd', {text: '/', 'aria-hidden': 'true'}),
        ),
        tool('print', 'print', () => app.print(), 'wide-only'),
        tool('settings', 'settings', () => app.openSettings(), 'settings-button'),
        tool('help', 'help', () => app.openHelp()),
      ),
    );
  };
})(window.Olive);
