// SPDX-License-Identifier: Apache-2.0
// The whole: which page is shown, and the way from one to the other.
'use strict';

((Olive) => {
  const {make, say} = Olive;
  const root = document.documentElement;

  // For what lives beside the page: 'leave' before it shows something else, 'shown' after.
  const tell = (name) => document.dispatchEvent(new CustomEvent('olive:' + name));

  function toast(text) {
    const box = make('div', {class: 'toast', text, 'aria-hidden': 'true'});
    document.body.append(box);
    setTimeout(() => box.remove(), 2500);
  }

  class App {
    constructor(data) {
      this.data = data;
      this.memory = Olive.openMemory(typeof data.UUID === 'string' ? data.UUID : 'package');
      this.screen = new Olive.Frame(this);
      this.places = Olive.makePlaces(this);
      this.pack = null;
      this.find = null; // searches the package; made when it is needed
      this.view = null; // the main element
      this.item = null; // that is shown
      this.stage = null;
      this.frame = null;
      this.query = ''; // what was searched for last
      this.terms = [];
      this.home = Olive.makeHome(this);
      this.wantsPlay = false; // of the item that comes next
    }

    get isLonely() {
      return this.pack.items.length === 1;
    }

    neighbour(step) {
      return this.item ? this.pack.items[this.item.index + step] || null : null;
    }

    async begin() {
      await Olive.loadWords(Olive.languageFor(this.memory.choice('language', '')));
      addEventListener('hashchange', () => this.route());
      addEventListener('pagehide', () => this.places.note(true));
      Olive.listenToKeys(this.keys());
      this.build();
      this.apply();
      document.getElementById('app').hidden = false;
      this.route();
      if (!window.conveyor) return;
      await Olive.load('editing');
      Olive.goLive(this);
    }

    // What keys and the head reach.
    keys() {
      return {
        screen: this.screen,
        stage: () => this.stage,
        frame: () => (this.stage ? this.frame : null),
        isOn: () => this.memory.choice('keys', true),
        step: (by) => this.step(by),
        copyLink: () => this.copyLink(),
        openSearch: () => this.openSearch(),
        goHome: () => this.goHome(),
        leave: () => this.leave(),
        openHelp: () => this.openHelp(),
      };
    }

    build() {
      Olive.speak(this.memory.choice('language', ''));
      this.pack = Olive.readPackage(this.data);
      this.find = null;
      this.view = make('main', {id: 'main', tabindex: -1});
      const skip = (event) => {
        event.preventDefault();
        this.view.focus();
      };
      document
        .getElementById('app')
        .replaceChildren(
          make('a', {class: 'skip', href: '#main', text: say('skip'), onclick: skip}),
          Olive.makeHead(this),
          this.view,
        );
    }

    // Shows the choices of the reader.
    apply() {
      const appearance = this.memory.choice('appearance', 'system');
      root.dataset.appearance = appearance;
      root.dataset.motion = this.memory.choice('motion', true) ? 'on' : 'off';
      const scheme = {light: 'light', system: 'light dark'}[appearance] || 'dark';
      document.querySelector('meta[name=color-scheme]').setAttribute('content', scheme);
    }

    // Builds the page anew, after before() was done: words or marks on it have changed.
    async rebuild(before) {
      await Olive.loadWords(Olive.languageFor(this.memory.choice('language', '')));
      tell('leave');
      this.places.note(true);
      this.close();
      before?.();
      this.build();
      this.route();
    }

    nameWindow() {
      const name = this.pack.title || say('untitledPackage');
      document.title = !this.item ? name : this.item.title + (this.pack.title ? ' – ' + this.pack.title : '');
    }

    wordsChanged() {
      this.find = null;
      this.nameWindow();
      if (this.item) Olive.tellSystem(this);
    }

    // --- what is shown

    route() {
      const place = Olive.address.read();
      const item =
        this.pack.items.find((each) => each.id === place.item) || (this.isLonely ? this.pack.items[0] : null);
      if (!item) return this.showHome();
      const groups = Olive.groupsOf(item);
      if (!Olive.isLoaded(...groups)) {
        Olive.load(...groups).then(
          () => this.route(),
          (error) => this.showProblem(error.message),
        );
        return;
      }
      if (this.stage && item === this.item) return this.go(place);
      this.showItem(item, {...place, play: this.wantsPlay});
      this.wantsPlay = false;
    }

    // To another place of the item that is shown.
    go({t, page, view}) {
      const {player, pager, view: arrangement} = this.stage;
      if (t !== null) player?.seek(t);
      if (page !== null) pager?.go(page - 1);
      if (view) arrangement?.set(view);
    }

    showProblem(text) {
      this.close();
      this.view.className = 'home';
      this.view.replaceChildren(make('p', {class: 'empty', role: 'alert', text}));
    }

    showHome() {
      tell('leave');
      this.close();
      this.nameWindow();
      this.view.className = 'home';
      this.view.replaceChildren(...this.home.show());
      tell('shown');
      this.home.restore();
    }

    showItem(item, start) {
      tell('leave');
      if (!this.stage) this.home.leave(item);
      this.close();
      this.item = item;
      this.nameWindow();
      const {stage, frame, lists, content} = Olive.makeItemPage(this, item, start);
      this.stage = stage;
      this.frame = frame;
      this.view.className = 'item' + (lists.panels.length ? '' : ' alone');
      this.view.replaceChildren(...content);
      this.screen.showChoices();
      this.screen.fit();
      if (stage.player) this.watch(stage.player, lists.chapters);
      Olive.tellSystem(this);
      tell('shown');
      scrollTo({top: 0, behavior: 'instant'});
      frame.focus({preventScroll: true});
      Olive.reveal(this.view.querySelector('.panel:not([hidden]) .row[aria-current]'));
    }

    watch(player, chapters) {
      const {item, memory} = this;
      player.addEventListener('time', () => {
        chapters?.follow(player.time);
        if (player.isPlaying) this.places.note(false);
      });
      player.addEventListener('state', () => {
        this.places.note(true);
        this.screen.wake();
        Olive.tellSystemState(player.isPlaying);
      });
      player.addEventListener('ended', () => {
        if (!['Image', 'Document'].includes(item.category)) memory.keep(item, {done: true, time: 0, share: 1});
        const next = this.neighbour(1);
        if (next && memory.choice('advance', false)) Olive.offerNext(this, next);
      });
    }

    close() {
      if (!this.stage) return;
      this.places.keep();
      const left = this.stage;
      this.stage = null; // what it still says is no news
      left.cancelNext?.();
      left.close();
      this.item = null;
      this.screen.wake();
    }

    // --- ways

    open(item, play) {
      this.wantsPlay = !!play;
      location.hash = Olive.address.to({item: item.id});
    }

    step(by) {
      const other = this.neighbour(by);
      if (other) this.open(other, this.stage?.player?.isPlaying);
    }

    goHome() {
      if (this.isLonely) return;
      if (location.hash === '' || location.hash === '#') this.showHome();
      else location.hash = '#';
    }

    leave() {
      if (!this.screen.leave()) this.stage?.cancelNext?.();
    }

    async copyLink() {
      if (!this.item) return;
      this.places.note(true);
      try {
        await navigator.clipboard.writeText(location.href);
        Olive.announce(say('linkCopied'));
        toast(say('linkCopied'));
      } catch {
        Olive.openLink(location.href);
      }
    }

    async openSearch() {
      this.leave();
      await Olive.load('search');
      if (document.querySelector('dialog[open]')) return;
      this.find = this.find || Olive.makeFinder(this.pack.items);
      Olive.openSearch(this.find, this.query, (hit, found, asked) => {
        this.query = asked;
        this.terms = found;
        // The same place again is no change of the address.
        if (Olive.address.to({item: hit.item.id, t: hit.t, page: hit.page}) === location.hash) this.route();
      });
    }

    openSettings() {
      Olive.openSettings(this);
    }

    openHelp() {
      Olive.openHelp(Olive.keyHelp);
    }

    print() {
      Olive.print();
    }
  }

  // Begins with the package's data. Fails with a sentence for people.
  Olive.start = (data) => {
    const app = new App(data);
    Olive.app = app; // for the console, and for what lives beside the page
    return app.begin();
  };
})(window.Olive);
