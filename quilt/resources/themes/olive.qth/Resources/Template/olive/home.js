// SPDX-License-Identifier: Apache-2.0
// The opening page: what the package is, where to begin or go on, all its items.
'use strict';

((Olive) => {
  const {make, say} = Olive;
  const kFilterFrom = 6; // items

  // Buttons that show one category only.
  function makeFilter(items, cards) {
    const kinds = [...new Set(items.map((item) => item.category).filter(Boolean))];
    if (kinds.length < 2 || items.length < kFilterFrom) return null;
    const buttons = ['', ...kinds].map((kind) =>
      make('button', {
        type: 'button',
        class: 'chip',
        'aria-pressed': kind === '',
        text: kind ? Olive.kindOf({category: kind}) : say('all'),
        onclick(event) {
          for (const button of buttons) button.setAttribute('aria-pressed', button === event.currentTarget);
          for (const card of cards.children) card.hidden = kind !== '' && card.dataset.category !== kind;
        },
      }),
    );
    return make('div', {class: 'chips', role: 'group', 'aria-label': say('filter')}, buttons);
  }

  function makeHero(pack, memory) {
    const total = pack.items.reduce((sum, item) => sum + item.duration, 0);
    const unfinished = pack.items.find((item) => memory.place(item).time > 5 && !memory.place(item).done);
    const start = unfinished || pack.items[0];
    const facts = [
      say('itemCount', {n: pack.items.length}),
      total ? Olive.clock(total) : '',
      pack.modified ? Olive.day(pack.modified) : '',
      pack.category,
      pack.advisory,
    ];
    return make(
      'section',
      {class: 'hero'},
      pack.poster && Olive.picture(pack.poster, {class: 'hero-picture', loading: 'eager'}),
      make(
        'div',
        {class: 'hero-text'},
        pack.collection && make('p', {class: 'eyebrow', dir: 'auto', text: pack.collection}),
        make('h1', {dir: 'auto', 'data-title-of': pack.id, text: pack.title || say('untitledPackage')}),
        pack.author && make('p', {class: 'author', dir: 'auto', text: pack.author}),
        make('div', {class: 'lead'}, Olive.paragraphs(pack.description)),
        make(
          'p',
          {class: 'facts'},
          facts.filter(Boolean).map((fact) => make('span', null, make('bdi', {text: fact}))),
        ),
        start &&
          make(
            'a',
            {class: 'primary', href: Olive.address.to({item: start.id})},
            Olive.icon('play'),
            unfinished
              ? say('continueWith', {title: unfinished.title, time: Olive.clock(memory.place(unfinished).time)})
              : say('start'),
          ),
      ),
    );
  }

  Olive.makeHome = (pack, memory) => {
    const hero = makeHero(pack, memory);
    if (!pack.items.length) return [hero, make('p', {class: 'empty', text: say('emptyPackage')})];
    const cards = Olive.makeCards(pack.items, memory);
    return [
      hero,
      make(
        'section',
        {class: 'contents', 'aria-labelledby': 'contents-title'},
        make(
          'div',
          {class: 'contents-head'},
          make('h2', {id: 'contents-title', text: say('contents')}),
          makeFilter(pack.items, cards),
        ),
        cards,
      ),
    ];
  };
})(window.Olive);
