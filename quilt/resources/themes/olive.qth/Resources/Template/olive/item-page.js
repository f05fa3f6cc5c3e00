// SPDX-License-Identifier: Apache-2.0
// The page of an item: its stage and controls, what is said about it, the lists beside it.
'use strict';

((Olive) => {
  const {make, say} = Olive;

  function neighbourLink(other, label, icon) {
    if (!other) return make('span');
    return make(
      'a',
      {
        class: 'neighbour ' + label,
        href: Olive.address.to({item: other.id}),
        rel: label === 'nextItem' ? 'next' : 'prev',
      },
      Olive.icon(icon),
      make(
        'span',
        null,
        make('span', {class: 'meta', text: say(label)}),
        make('span', {class: 'row-title', dir: 'auto', 'data-title-of': other.id, text: other.title}),
      ),
    );
  }

  function factsOf(item) {
    const pages = item.pages.length ? say('pageCount', {n: item.pages.length}) : '';
    const facts = [Olive.kindOf(item), item.duration ? Olive.clock(item.duration) : '', pages];
    return make('p', {class: 'meta'}, Olive.icon(item.category || 'warning'), facts.filter(Boolean).join(' · '));
  }

  function makeAbout(app, item, hasSide) {
    const [previous, next] = [app.neighbour(-1), app.neighbour(1)];
    const extras = item.extras.filter((extra) => extra.files.some((file) => file.address || file.link));
    return make(
      'section',
      {class: 'about', 'aria-labelledby': 'item-title'},
      make(
        'div',
        {class: 'about-head'},
        make(
          'div',
          null,
          make('h1', {id: 'item-title', dir: 'auto', 'data-title-of': item.id, text: item.title}),
          factsOf(item),
        ),
        make(
          'div',
          {class: 'about-tools'},
          Olive.iconButton('link', say('copyLink'), () => app.copyLink()),
          hasSide &&
            Olive.iconButton('lists', say('lists'), () => app.screen.toggleSide(), {
              class: 'icon-button side-toggle',
              'aria-expanded': 'true',
            }),
        ),
      ),
      make('div', {class: 'description'}, Olive.paragraphs(item.description)),
      extras.length > 0 && make('div', null, make('h2', {text: say('extras')}), Olive.makeExtras(extras)),
      (previous || next) &&
        make(
          'nav',
          {class: 'neighbours', 'aria-label': say('neighbours')},
          neighbourLink(previous, 'previousItem', 'left'),
          neighbourLink(next, 'nextItem', 'right'),
        ),
    );
  }

  // Returns {stage, frame, lists, content: the nodes of the page}.
  Olive.makeItemPage = (app, item, start) => {
    const page = {stage: null, frame: null, lists: null, content: []};
    page.stage = Olive.makeStage(item, {
      memory: app.memory,
      start,
      frameButtons: () => app.screen.buttons(),
      frameActions: (elements) => app.screen.actions(elements),
      frameMenu: (actions) => app.screen.menu(actions),
      listenToGestures: (element, {player, transport, pager}) => {
        const turn = (step) => {
          if (pager) pager.go(pager.index + step);
          else if (item.category === 'Montage') transport.actions.chapter(step);
          else if (item.category === 'Image') app.step(step);
        };
        Olive.listenToGestures(element, {
          toggle: player ? () => player.toggle() : null,
          skip: transport ? (seconds) => transport.actions.skip(seconds) : null,
          turn,
          toggleFullscreen: () => app.screen.toggleFullscreen(),
          isAsleep: () => app.screen.isAsleep,
        });
      },
      note: () => app.places.note(true),
      focus: () => page.frame.focus({preventScroll: true}),
      terms: () => app.terms,
      again: () => app.showItem(item, {...Olive.address.read(), play: false}),
      onPage: (index) => page.lists?.pages?.follow(index),
    });
    page.lists = Olive.listsOf(app, item, page.stage);
    page.frame = make(
      'section',
      {class: 'player', tabindex: -1, 'aria-label': say('player')},
      page.stage.element,
      page.stage.controls,
    );
    const {panels} = page.lists;
    page.content = [
      page.frame,
      makeAbout(app, item, panels.length > 0),
      ...(panels.length ? [Olive.makeSide(panels, app)] : []),
    ];
    return page;
  };
})(window.Olive);
