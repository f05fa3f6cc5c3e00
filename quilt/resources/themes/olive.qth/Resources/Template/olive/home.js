// SPDX-License-Identifier: Apache-2.0
// The opening page: what the package is, where to begin or go on, all its items in the order and form that the reader
// chose. Who comes back to it finds it as it was left.
'use strict';

((Olive) => {
  const {make, say} = Olive;
  const kToolsFrom = 6; // items
  const kBegun = 5; // seconds
  const kSorts = ['order', 'title', 'length', 'unseen'];
  const kLayouts = ['grid', 'list'];

  // The item that was seen last and not to its end.
  function lastSeen(items, memory) {
    const begun = items.filter((item) => {
      const {time = 0, page = 0, done} = memory.place(item);
      return !done && (time > kBegun || page > 0);
    });
    return begun.sort((a, b) => (memory.place(b).at || 0) - (memory.place(a).at || 0))[0] || null;
  }

  function wordsToContinue(item, memory) {
    const {time = 0, page = 0} = memory.place(item);
    return say('continueWith', {
      title: item.title,
      time: item.pages.length ? say('page', {n: page + 1}) : Olive.clock(time),
    });
  }

  function makeHero(pack, memory) {
    const {items} = pack;
    const total = items.reduce((sum, item) => sum + item.duration, 0);
    const seen = items.filter((item) => memory.place(item).done).length;
    const unfinished = lastSeen(items, memory);
    const start = unfinished || items[0];
    const facts = [
      say('itemCount', {n: items.length}),
      total ? Olive.clock(total) : '',
      seen ? say('seenOf', {n: seen, total: items.length}) : '',
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
            unfinished ? wordsToContinue(unfinished, memory) : say('start'),
          ),
      ),
    );
  }

  function sorted(items, sort, memory) {
    const compare = {
      title: (a, b) => a.title.localeCompare(b.title, Olive.language(), {numeric: true}),
      length: (a, b) => b.duration - a.duration,
      unseen: (a, b) => Number(!!memory.place(a).done) - Number(!!memory.place(b).done),
    }[sort];
    return compare ? [...items].sort(compare) : items;
  }

  class Home {
    // app: see app.js
    constructor(app) {
      this.app = app;
      this.filter = '';
      this.left = null; // {id, top, hasFocus}: the card from which the page was left, and where it stood
    }

    // The nodes of the page.
    show() {
      const {pack, memory} = this.app;
      const hero = makeHero(pack, memory);
      if (!pack.items.length) return [hero, make('p', {class: 'empty', text: say('emptyPackage')})];
      this.place = make('div');
      this.fill();
      return [
        hero,
        make(
          'section',
          {class: 'contents', 'aria-labelledby': 'contents-title'},
          make(
            'div',
            {class: 'contents-head'},
            make('h2', {id: 'contents-title', text: say('contents')}),
            this.makeTools(),
          ),
          this.place,
        ),
      ];
    }

    // Draws the items anew.
    fill() {
      const {pack, memory} = this.app;
      const items = sorted(pack.items, memory.choice('sort', 'order'), memory);
      this.cards = Olive.makeCards(items, memory);
      this.cards.classList.toggle('as-list', memory.choice('layout', 'grid') === 'list');
      this.place.replaceChildren(this.cards);
      this.applyFilter();
    }

    get all() {
      return /** @type {HTMLElement[]} */ ([...this.cards.children]);
    }

    applyFilter() {
      for (const card of this.all) {
        card.hidden = this.filter !== '' && card.dataset.category !== this.filter;
      }
    }

    makeTools() {
      const {pack} = this.app;
      if (pack.items.length < kToolsFrom) return null;
      return make('div', {class: 'contents-tools'}, this.makeFilter(), this.makeMenu());
    }

    // Buttons that show one category only.
    makeFilter() {
      const kinds = [...new Set(this.app.pack.items.map((item) => item.category).filter(Boolean))];
      if (kinds.length < 2) return null;
      if (!kinds.includes(this.filter)) this.filter = '';
      const chip = (kind) =>
        make('button', {
          type: 'button',
          class: 'chip',
          'aria-pressed': kind === this.filter,
          text: kind ? Olive.kindOf({category: kind}) : say('all'),
          onclick: () => choose(kind),
        });
      const all = ['', ...kinds],
        buttons = all.map(chip);
      const choose = (kind) => {
        this.filter = kind;
        buttons.forEach((button, i) => button.setAttribute('aria-pressed', String(all[i] === kind)));
        this.applyFilter();
      };
      return make('div', {class: 'chips', role: 'group', 'aria-label': say('filter')}, buttons);
    }

    makeMenu() {
      const {memory} = this.app;
      const choice = (name, label, values, usual) =>
        Olive.menuChoice(
          say(label),
          values.map((value) => [value, name === 'sort' ? say('sort-' + value) : say('layout-' + value)]),
          memory.choice(name, usual),
          (value) => {
            memory.choose(name, value);
            this.fill();
          },
        ).element;
      return Olive.makeMenu('sort', say('sortAndLayout'), [
        choice('sort', 'sort', kSorts, 'order'),
        choice('layout', 'layout', kLayouts, 'grid'),
      ]).element;
    }

    // Notes where the page stands, before the item is shown.
    leave(item) {
      if (!this.cards?.isConnected) return;
      const cards = this.all.filter((card) => !card.hidden);
      const opened = cards.find((card) => card.dataset.id === item.id);
      const isSeen = (card) =>
        card.getBoundingClientRect().bottom > 0 && card.getBoundingClientRect().top < innerHeight;
      const anchor = opened && isSeen(opened) ? opened : cards.find(isSeen);
      this.left = {
        id: anchor?.dataset.id,
        top: anchor ? anchor.getBoundingClientRect().top : 0,
        scroll: scrollY,
        focus: opened ? item.id : '',
      };
    }

    // Takes the page back to where it was left. Cards that were never drawn have estimated heights, so it looks again once
    // they are.
    restore() {
      const {left} = this;
      if (!left || !this.cards) {
        scrollTo({top: 0, behavior: 'instant'});
        return;
      }
      const find = (id) => this.all.find((card) => card.dataset.id === id && !card.hidden);
      const anchor = find(left.id);
      find(left.focus)?.querySelector('a').focus({preventScroll: true});
      const scroll = () => {
        const by = anchor ? anchor.getBoundingClientRect().top - left.top : left.scroll - scrollY;
        if (Math.abs(by) > 0.5 && this.cards.isConnected) scrollBy({top: by, behavior: 'instant'});
      };
      scroll();
      requestAnimationFrame(() => {
        scroll();
        requestAnimationFrame(scroll);
      });
    }
  }

  Olive.makeHome = (app) => new Home(app);
})(window.Olive);
