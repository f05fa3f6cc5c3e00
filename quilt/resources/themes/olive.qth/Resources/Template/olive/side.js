// SPDX-License-Identifier: Apache-2.0
// The lists beside the stage: chapters or pages of the item, and the contents of the package. More than one are tabs.
'use strict';

((Olive) => {
  const {make, say} = Olive;

  // The lists of an item: {panels: [{name, label, content}], chapters, pages}.
  Olive.listsOf = (app, item, stage) => {
    const lists = {panels: [], chapters: null, pages: null};
    const add = (name, label, content) => lists.panels.push({name, label: say(label), content});
    const chapters = stage.player ? item.chapters : [];
    if (chapters.length > 1) {
      lists.chapters = Olive.makeChapters(chapters, (seconds) => stage.player.seek(seconds));
      add('chapters', item.category === 'Montage' ? 'stills' : 'chapters', lists.chapters.element);
    }
    if (stage.pager && item.pages.length > 1) {
      lists.pages = Olive.makePages(item.pages, (index) => stage.pager.go(index));
      add('pages', 'pages', lists.pages.element);
    }
    if (!app.isLonely) add('contents', 'contents', Olive.makeContents(app.pack.items, item, app.memory));
    return lists;
  };

  function makeTabs(panels, boxes, open, memory) {
    const tabs = panels.map((panel, i) =>
      make('button', {
        type: 'button',
        role: 'tab',
        class: 'tab',
        'aria-controls': 'panel-' + panel.name,
        'aria-selected': panel === open,
        tabindex: panel === open ? 0 : -1,
        text: panel.label,
        onclick: () => select(i),
      }),
    );
    function select(index) {
      memory.choose('panel', panels[index].name);
      tabs.forEach((tab, i) => {
        tab.setAttribute('aria-selected', i === index);
        tab.tabIndex = i === index ? 0 : -1;
        boxes[i].hidden = i !== index;
      });
      Olive.reveal(boxes[index].querySelector('[aria-current]'));
      tabs[index].focus();
    }
    const onkeydown = (event) => {
      const forward = document.documentElement.dir === 'rtl' ? -1 : 1;
      const step = {ArrowRight: forward, ArrowLeft: -forward}[event.key];
      if (!step) return;
      event.preventDefault();
      event.stopPropagation();
      select((tabs.indexOf(document.activeElement) + step + tabs.length) % tabs.length);
    };
    return make('div', {class: 'tabs', role: 'tablist', 'aria-label': say('lists'), onkeydown}, tabs);
  }

  // panels: at least one
  Olive.makeSide = (panels, app) => {
    const {memory} = app;
    const isTabbed = panels.length > 1;
    const open = panels.find((panel) => panel.name === memory.choice('panel', '')) || panels[0];
    const boxes = panels.map((panel) =>
      make(
        'div',
        {
          class: 'panel',
          id: 'panel-' + panel.name,
          role: isTabbed ? 'tabpanel' : 'region',
          'aria-label': panel.label,
          hidden: panel !== open,
        },
        panel.content,
      ),
    );
    const head = isTabbed
      ? makeTabs(panels, boxes, open, memory)
      : make('h2', {class: 'side-title', text: panels[0].label});
    const close = () => {
      app.screen.toggleSide();
      document.querySelector('.side-toggle').focus();
    };
    return make(
      'aside',
      {class: 'side', 'aria-label': isTabbed ? say('lists') : panels[0].label},
      make('div', {class: 'side-head'}, head, Olive.iconButton('close', say('closeLists'), close)),
      boxes,
    );
  };
})(window.Olive);
