// SPDX-License-Identifier: Apache-2.0
// The player's frame: wide, on the whole screen, in presentation; and controls that lie over the picture and fade while
// nobody moves.
'use strict';

((Olive) => {
  const {say} = Olive;
  const kIdleAfter = 2500; // ms
  const root = document.documentElement;
  const has = (name) => root.classList.contains(name);
  // Windows as of a phone that lies on its side, or of a page at 200 %: there is no room below the picture.
  const short = matchMedia('(max-height: 30rem) and (min-aspect-ratio: 1/1)');

  class Frame {
    // app: see app.js
    constructor(app) {
      this.app = app;
      this.timer = 0;
      this.wake = this.wake.bind(this);
      this.fit = this.fit.bind(this);
      for (const name of ['pointermove', 'pointerdown']) document.addEventListener(name, this.wake, {passive: true});
      // A clicker's keys turn pages without bringing the controls back.
      document.addEventListener('keydown', (event) => {
        if (!has('presenting') || event.key === 'Tab') this.wake();
      });
      document.addEventListener('fullscreenchange', () => this.showFullscreen());
      short.addEventListener('change', this.fit);
    }

    // The element, while an item is shown.
    get frame() {
      return this.app.stage ? this.app.frame : null;
    }

    get isPresenting() {
      return has('presenting');
    }

    // Whether the controls lie over the picture.
    get isOver() {
      return !!document.fullscreenElement || short.matches;
    }

    get isAsleep() {
      return has('idle');
    }

    fit() {
      root.classList.toggle('over', this.isOver);
      this.wake();
    }

    showFullscreen() {
      this.fit();
      const button = document.querySelector('.fullscreen');
      if (!button) return;
      Olive.setIcon(button, document.fullscreenElement ? 'unfull' : 'full');
      Olive.relabel(button, say(document.fullscreenElement ? 'leaveFullscreen' : 'fullscreen'));
    }

    toggleFullscreen() {
      const {frame} = this;
      if (!frame) return;
      if (document.fullscreenElement) document.exitFullscreen();
      else if (document.fullscreenEnabled) frame.requestFullscreen().catch(() => this.togglePresenting());
      else this.togglePresenting(); // the window is all that this browser gives
    }

    togglePresenting() {
      const {frame} = this;
      if (!frame && !has('presenting')) return;
      root.classList.remove('blank');
      root.classList.toggle('idle', root.classList.toggle('presenting'));
      this.setOthersInert(has('presenting'));
      Olive.announce(say(has('presenting') ? 'presentingOn' : 'presentingOff'));
      if (has('presenting')) frame.focus({preventScroll: true});
    }

    // What lies behind a presentation cannot be reached.
    setOthersInert(isInert) {
      for (const node of document.querySelectorAll('.skip, .head, .live-notice, .about, .side')) {
        if (node instanceof HTMLElement) node.inert = isInert;
      }
    }

    toggleBlank() {
      root.classList.toggle('blank');
    }

    get video() {
      const found = this.app.stage?.elements?.find((element) => element.localName === 'video');
      return found instanceof HTMLVideoElement ? found : null;
    }

    togglePictureInPicture() {
      const {video} = this;
      if (!video || !document.pictureInPictureEnabled) return;
      if (document.pictureInPictureElement) document.exitPictureInPicture();
      else video.requestPictureInPicture().catch(() => Olive.announce(say('notPossible')));
    }

    // The stage as wide as the window, with the lists below; or beside them again.
    toggleTheatre() {
      this.setTheatre(!has('theatre'));
      Olive.announce(say(has('theatre') ? 'theatreOn' : 'theatreOff'));
    }

    setTheatre(isOn) {
      this.app.memory.choose('theatre', isOn);
      this.showChoices();
    }

    // The lists beside the stage, there or closed.
    toggleSide() {
      this.app.memory.choose('side', has('sideless'));
      this.showChoices();
      Olive.announce(say(has('sideless') ? 'listsClosed' : 'listsOpen'));
    }

    showChoices() {
      const {memory} = this.app;
      root.classList.toggle('theatre', memory.choice('theatre', false));
      root.classList.toggle('sideless', !memory.choice('side', true));
      for (const button of document.querySelectorAll('.theatre-button')) {
        button.setAttribute('aria-pressed', String(has('theatre')));
      }
      for (const button of document.querySelectorAll('.side-toggle')) {
        button.setAttribute('aria-expanded', String(!has('sideless')));
      }
    }

    // One step out of what covers the page; false when nothing does.
    leave() {
      if (has('blank')) root.classList.remove('blank');
      else if (has('presenting')) this.togglePresenting();
      else return false;
      return true;
    }

    // Somebody moved, or something began to play.
    wake() {
      root.classList.remove('idle');
      clearTimeout(this.timer);
      const isFilm = this.isOver && this.app.stage?.player?.isPlaying;
      if (isFilm || has('presenting')) this.timer = setTimeout(() => this.sleep(), kIdleAfter);
    }

    sleep() {
      if (document.querySelector('.player .menu:not([hidden])')) return;
      root.classList.add('idle');
    }

    // The buttons at the end of the controls of every item.
    buttons() {
      const theatre = Olive.iconButton('theatre', say('theatre'), () => this.toggleTheatre(), {
        class: 'icon-button theatre-button',
        'aria-pressed': String(has('theatre')),
      });
      const full = Olive.iconButton('full', say('fullscreen'), () => this.toggleFullscreen(), {
        class: 'icon-button fullscreen',
      });
      return [theatre, full];
    }

    // What the menu offers for an item with these media elements.
    actions(elements) {
      const hasFilm = document.pictureInPictureEnabled && elements.some((element) => element.localName === 'video');
      const pip = {icon: 'pip', label: say('pip'), act: () => this.togglePictureInPicture()};
      return [
        ...(hasFilm ? [pip] : []),
        {icon: 'present', label: say('present'), act: () => this.togglePresenting()},
        {icon: 'print', label: say('print'), act: () => this.app.print()},
      ];
    }

    // The end of the controls of an item without a transport; more: actions of its own.
    menu(more = []) {
      const menu = Olive.makeMenu('more', say('more'), [
        Olive.make('div', {class: 'menu-actions'}, [...more, ...this.actions([])].map(Olive.menuAction)),
      ]);
      return [menu.element, Olive.make('div', {class: 'last'}, this.buttons())];
    }
  }

  Olive.Frame = Frame;
})(window.Olive);
