// SPDX-License-Identifier: Apache-2.0
// The page: its head, the opening page, the page of an item, and the way between them.
'use strict';

((Olive) => {
  const {make, say} = Olive;
  const kNoteEvery = 1000; // ms

  Olive.start = (data) => {
    const root = document.documentElement,
      app = document.getElementById('app');
    const memory = Olive.openMemory(typeof data.UUID === 'string' ? data.UUID : 'package');
    let pack,
      find,
      printAll,
      stage = null,
      current = null,
      frame = null,
      query = '',
      terms = [],
      lastNote = 0,
      view;

    const screen = Olive.makeFrameControl(() => (stage ? {stage, frame} : {stage: null, frame: null}));
    const isLonely = () => pack.items.length === 1;
    const neighbour = (step) => (current ? pack.items[current.index + step] : null);

    // For what lives beside the page: 'leave' before it shows something else, 'shown' after.
    const tell = (name) => document.dispatchEvent(new CustomEvent('olive:' + name));

    function nameWindow() {
      const name = pack.title || say('untitledPackage');
      document.title = !current ? name : current.title + (pack.title ? ' – ' + pack.title : '');
    }

    // --- the head

    function makeHead() {
      const head = make(
        'header',
        {class: 'head'},
        make(
          'a',
          {
            class: 'brand',
            href: '#',
            onclick: (event) => {
              event.preventDefault();
              goHome();
            },
          },
          Olive.icon('home'),
          make('span', {dir: 'auto', 'data-title-of': pack.id, text: pack.title || say('untitledPackage')}),
        ),
        make(
          'div',
          {class: 'head-tools'},
          make(
            'button',
            {type: 'button', class: 'search-button', onclick: openSearch, 'aria-label': say('search')},
            Olive.icon('search'),
            make('span', {text: say('search')}),
            make('kbd', {text: '/', 'aria-hidden': 'true'}),
          ),
          Olive.iconButton('print', say('print'), () => printAll(), {class: 'icon-button wide-only'}),
          Olive.iconButton('settings', say('settings'), () => Olive.openSettings(memory, apply), {
            class: 'icon-button settings-button',
          }),
          Olive.iconButton('help', say('help'), () => api.openHelp()),
        ),
      );
      return head;
    }

    function build() {
      Olive.speak(memory.choice('language', ''));
      pack = Olive.readPackage(data);
      find = Olive.makeFinder(pack.items);
      printAll = Olive.preparePrinting(pack);
      view = make('main', {id: 'main', tabindex: -1});
      app.replaceChildren(
        make('a', {
          class: 'skip',
          href: '#main',
          text: say('skip'),
          onclick: (event) => {
            event.preventDefault();
            view.focus();
          },
        }),
        makeHead(),
        view,
      );
    }

    // Shows the choices of the reader; anew when words or marks on the page change.
    function apply(isAnew, before) {
      const appearance = memory.choice('appearance', 'system');
      root.dataset.appearance = appearance;
      root.dataset.motion = memory.choice('motion', true) ? 'on' : 'off';
      document.querySelector('meta[name=color-scheme]').content =
        appearance === 'light' ? 'light' : appearance === 'system' ? 'light dark' : 'dark';
      if (!isAnew) return;
      tell('leave');
      note(true);
      close();
      if (before) before();
      build();
      route();
    }

    // --- the opening page

    function showHome() {
      tell('leave');
      close();
      nameWindow();
      view.className = 'home';
      view.replaceChildren(...Olive.makeHome(pack, memory));
      tell('shown');
    }

    // --- the page of an item

    function showItem(item, start) {
      tell('leave');
      close();
      current = item;
      nameWindow();
      const panels = [];
      const lists = {};
      stage = Olive.makeStage(item, {
        memory,
        start,
        frameButtons: screen.buttons,
        note: () => note(true),
        focus: () => frame.focus({preventScroll: true}),
        terms: () => terms,
        again: () => showItem(item, {...Olive.address.read(), play: false}),
        onPage: (index) => lists.pages?.follow(index),
      });
      const chapters = stage.player ? item.chapters : [];
      if (chapters.length > 1) {
        lists.chapters = Olive.makeChapters(chapters, (seconds) => stage.player.seek(seconds));
        panels.push({
          name: 'chapters',
          label: say(item.category === 'Montage' ? 'stills' : 'chapters'),
          content: lists.chapters.element,
        });
      }
      if (stage.pager && item.pages.length > 1) {
        lists.pages = Olive.makePages(item.pages, (index) => stage.pager.go(index));
        panels.push({name: 'pages', label: say('pages'), content: lists.pages.element});
      }
      if (!isLonely())
        panels.push({name: 'contents', label: say('contents'), content: Olive.makeContents(pack.items, item, memory)});

      frame = make(
        'section',
        {class: 'player', tabindex: -1, 'aria-label': say('player')},
        stage.element,
        stage.controls,
      );
      view.className = 'item' + (panels.length ? '' : ' alone');
      view.replaceChildren(
        make('div', {class: 'main-column'}, frame, makeAbout(item)),
        ...(panels.length ? [makePanels(panels)] : []),
      );
      if (stage.player) watch(stage.player, lists.chapters);
      mediaSession(item);
      tell('shown');
      scrollTo({top: 0, behavior: 'instant'});
      frame.focus({preventScroll: true});
      Olive.reveal(view.querySelector('.panel:not([hidden]) .row[aria-current]'));
    }

    function makeAbout(item) {
      const [previous, next] = [neighbour(-1), neighbour(1)];
      const extras = item.extras.filter((extra) => extra.files.some((file) => file.address || file.link));
      const link = (other, label, icon) =>
        other &&
        make(
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
            make(
              'p',
              {class: 'meta'},
              Olive.icon(item.category || 'warning'),
              [
                Olive.kindOf(item),
                item.duration ? Olive.clock(item.duration) : '',
                item.pages.length ? say('pageCount', {n: item.pages.length}) : '',
              ]
                .filter(Boolean)
                .join(' · '),
            ),
          ),
          Olive.iconButton('link', say('copyLink'), copyLink),
        ),
        make('div', {class: 'description'}, Olive.paragraphs(item.description)),
        extras.length > 0 && make('div', null, make('h2', {text: say('extras')}), Olive.makeExtras(extras)),
        (previous || next) &&
          make(
            'nav',
            {class: 'neighbours', 'aria-label': say('neighbours')},
            link(previous, 'previousItem', 'left') || make('span'),
            link(next, 'nextItem', 'right'),
          ),
      );
    }

    // Tabs, when there is more than one list beside the stage.
    function makePanels(panels) {
      const name = memory.choice('panel', '');
      const open = panels.find((panel) => panel.name === name) || panels[0];
      const boxes = panels.map((panel) =>
        make(
          'div',
          {
            class: 'panel',
            id: 'panel-' + panel.name,
            role: panels.length > 1 ? 'tabpanel' : 'region',
            'aria-label': panel.label,
            hidden: panel !== open,
          },
          panel.content,
        ),
      );
      if (panels.length === 1)
        return make(
          'aside',
          {class: 'side', 'aria-label': panels[0].label},
          make('h2', {class: 'side-title', text: panels[0].label}),
          boxes,
        );
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
      const bar = make(
        'div',
        {
          class: 'tabs',
          role: 'tablist',
          'aria-label': say('lists'),
          onkeydown: (event) => {
            const forward = root.dir === 'rtl' ? -1 : 1;
            const step = {ArrowRight: forward, ArrowLeft: -forward}[event.key];
            if (!step) return;
            event.preventDefault();
            event.stopPropagation();
            select((tabs.indexOf(document.activeElement) + step + tabs.length) % tabs.length);
          },
        },
        tabs,
      );
      return make('aside', {class: 'side', 'aria-label': say('lists')}, bar, boxes);
    }

    function watch(player, chapters) {
      player.addEventListener('time', () => {
        if (chapters) chapters.follow(player.time);
        if (player.isPlaying) note(false);
      });
      player.addEventListener('state', () => {
        note(true);
        screen.wake();
        const session = navigator.mediaSession;
        if (session) session.playbackState = player.isPlaying ? 'playing' : 'paused';
      });
      player.addEventListener('ended', () => {
        if (current.category !== 'Image' && current.category !== 'Document')
          memory.keep(current, {done: true, time: 0, share: 1});
        if (memory.choice('advance', false) && neighbour(1)) offerNext();
      });
    }

    // Goes on to the next item after a moment in which that can be stopped.
    function offerNext() {
      const next = neighbour(1);
      const timer = setTimeout(() => open(next, true), 5000);
      const cancel = () => {
        clearTimeout(timer);
        box.remove();
      };
      const box = make(
        'div',
        {class: 'cover up-next', role: 'status'},
        make(
          'div',
          {class: 'cover-actions'},
          make('p', {text: say('upNext', {title: next.title})}),
          make('button', {
            type: 'button',
            class: 'primary',
            text: say('playNow'),
            onclick: () => {
              cancel();
              open(next, true);
            },
          }),
          make('button', {type: 'button', class: 'quiet', text: say('cancel'), onclick: cancel}),
        ),
      );
      stage.element.append(box);
      stage.cancelNext = cancel;
      stage.player.addEventListener('state', () => {
        if (stage?.player?.isPlaying) cancel();
      });
    }

    function mediaSession(item) {
      const session = navigator.mediaSession;
      if (!session || !window.MediaMetadata) return;
      session.metadata = stage.player
        ? new MediaMetadata({title: item.title, artist: pack.author, album: pack.title})
        : null;
      const act = stage.transport?.actions,
        player = stage.player;
      const handlers = {
        play: () => player.play(),
        pause: () => player.pause(),
        seekbackward: () => act.skip(-10),
        seekforward: () => act.skip(10),
        seekto: (detail) => player.seek(detail.seekTime),
        previoustrack: neighbour(-1) && (() => step(-1)),
        nexttrack: neighbour(1) && (() => step(1)),
      };
      for (const [name, handler] of Object.entries(handlers)) {
        try {
          session.setActionHandler(name, player && handler ? handler : null);
        } catch {
          // an action that this browser does not know
        }
      }
    }

    function close() {
      if (!stage) return;
      keepPlace();
      const left = stage;
      stage = null; // what it still says is no news
      if (left.cancelNext) left.cancelNext();
      left.close();
      current = null;
      screen.wake();
    }

    // --- places

    // Remembers where the reader is, in the address and in the store.
    function note(isAtOnce) {
      const now = Date.now();
      if (!stage || !stage.element.isConnected || (!isAtOnce && now - lastNote < kNoteEvery)) return;
      lastNote = now;
      const seconds = stage.player ? Math.round(stage.player.time * 10) / 10 : 0;
      Olive.address.note({
        item: isLonely() && !seconds && !stage.pager ? '' : current.id,
        t: seconds || undefined,
        page: stage.pager && stage.pager.index >= 0 ? stage.pager.index + 1 : undefined,
        view: stage.view ? stage.view.value : undefined,
      });
      keepPlace();
    }

    function keepPlace() {
      const player = stage.player;
      if (player && player.time > 0 && !stage.pager && !player.hasEnded) {
        const share = player.duration ? player.time / player.duration : 0;
        memory.keep(current, {
          time: player.time,
          share,
          ...(share > 0.97 ? {done: true} : player.isPlaying ? {done: false} : {}),
        });
      }
    }

    function route() {
      const place = Olive.address.read();
      const item = pack.items.find((each) => each.id === place.item) || (isLonely() ? pack.items[0] : null);
      if (!item) {
        showHome();
        return;
      }
      if (stage && item === current) {
        if (place.t !== null && stage.player) stage.player.seek(place.t);
        if (place.page !== null && stage.pager) stage.pager.go(place.page - 1);
        if (place.view && stage.view) stage.view.set(place.view);
        return;
      }
      showItem(item, {...place, play: wantsPlay});
      wantsPlay = false;
    }

    let wantsPlay = false;
    function open(item, play) {
      wantsPlay = !!play;
      location.hash = Olive.address.to({item: item.id});
    }

    function step(by) {
      const other = neighbour(by);
      if (other) open(other, stage?.player?.isPlaying);
    }

    function goHome() {
      if (isLonely()) return;
      if (location.hash === '' || location.hash === '#') showHome();
      else location.hash = '#';
    }

    async function copyLink() {
      if (!current) return;
      note(true);
      try {
        await navigator.clipboard.writeText(location.href);
        Olive.announce(say('linkCopied'));
        toast(say('linkCopied'));
      } catch {
        Olive.openLink(location.href);
      }
    }

    function toast(text) {
      const box = make('div', {class: 'toast', text, 'aria-hidden': 'true'});
      document.body.append(box);
      setTimeout(() => box.remove(), 2500);
    }

    function openSearch() {
      leave();
      Olive.openSearch(find, query, (hit, found, asked) => {
        query = asked;
        terms = found;
        // The same place again is no change of the address.
        if (Olive.address.to({item: hit.item.id, t: hit.t, page: hit.page}) === location.hash) route();
      });
    }

    function leave() {
      if (!screen.leave() && stage && stage.cancelNext) stage.cancelNext();
    }

    const api = {
      ...screen,
      stage: () => stage,
      frame: () => frame,
      isOn: () => memory.choice('keys', true),
      step,
      copyLink,
      openSearch,
      goHome,
      leave,
      nextView() {
        if (!stage || !stage.view) return;
        const names = ['side', 'corner', 'first', 'second'];
        const [name, swapped] = stage.view.value.split('.');
        stage.view.set(names[(names.indexOf(name) + 1) % names.length] + (swapped ? '.swapped' : ''));
      },
      openHelp: () => Olive.openHelp(Olive.keyHelp),
    };

    addEventListener('hashchange', route);
    addEventListener('pagehide', () => note(true));
    Olive.listenToKeys(api);
    build();
    apply(false);
    app.hidden = false;
    // For the console, and for what lives beside the page.
    Olive.app = {
      memory,
      get pack() {
        return pack;
      },
      get item() {
        return current;
      },
      get stage() {
        return stage;
      },
      wordsChanged() {
        find = Olive.makeFinder(pack.items);
        nameWindow();
        if (current) mediaSession(current);
      },
    };
    route();
    if (Olive.goLive) Olive.goLive(Olive.app);
  };
})(window.Olive);
