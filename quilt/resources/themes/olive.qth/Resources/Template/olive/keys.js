// SPDX-License-Identifier: Apache-2.0
// The keyboard map. Letters work everywhere but in fields; space and arrows only inside the player, where they would
// otherwise scroll the page.
'use strict';

((Olive) => {
  // For the help; the names are what the keys show.
  Olive.keyHelp = [
    [['Space', 'K'], 'key-play'],
    [['J', 'L'], 'key-skip'],
    [['←', '→'], 'key-step'],
    [['↑', '↓'], 'key-volume'],
    [['M'], 'mute'],
    [['0', '–', '9'], 'key-tenths'],
    [['[', ']'], 'key-chapter'],
    [['<', '>'], 'speed'],
    [['N', 'P'], 'key-item'],
    [['PgUp', 'PgDn'], 'key-page'],
    [['+', '−'], 'zoom'],
    [['S'], 'swap'],
    [['D'], 'views'],
    [['F'], 'fullscreen'],
    [['I'], 'pip'],
    [['W'], 'theatre'],
    [['V'], 'present'],
    [['B', '.'], 'key-blank'],
    [['T'], 'pageText'],
    [['U'], 'copyLink'],
    [['/'], 'search'],
    [['H'], 'home'],
    [['?'], 'help'],
    [['Esc'], 'key-leave'],
  ];

  const kSigns = {BracketLeft: '[', BracketRight: ']', Slash: '/', Equal: '=', Minus: '-', Comma: ',', Period: '.'};

  const isField = (node) =>
    node.closest('input:not([type=range]):not([type=checkbox]):not([type=radio]), select, textarea, [contenteditable]');

  // What a key means: the sign that it types on this keyboard when that is one of ours, else where it lies. So K is K on
  // every Latin keyboard, and lies where K lies on a Cyrillic, Greek or Arabic one.
  function meaningOf(event) {
    const {key, code} = event;
    if (key.length > 1) return key;
    if (/^[\x20-\x7e]$/.test(key) && !(event.shiftKey && /^Digit/.test(code) && !/[<>?+]/.test(key))) {
      return key.toLowerCase();
    }
    const place = /^(?:Key|Digit)(\w)$/.exec(code || '');
    return place ? place[1].toLowerCase() : kSigns[code] || key;
  }

  // Keys inside the player. They answer whether the key was used; what is not used is the browser's.
  function keysOfPlayer(app, {stage, target, event}) {
    const player = stage?.player,
      pager = stage?.pager,
      sheet = stage?.sheet,
      act = stage?.transport?.actions;
    const slider = target.closest('input[type=range]'),
      isChoice = target.matches('input[type=radio]');
    const isZoomed = !!sheet?.isZoomed();
    const used = (action) => {
      action();
      return true;
    };
    const turn = (step) => {
      if (pager) return pager.go(pager.index + step) !== false;
      if (act?.chapter(step)) return true;
      return app.screen.isPresenting && used(() => app.step(step));
    };
    const aside = (step) => {
      if (isChoice || slider?.classList.contains('volume')) return false;
      if (pager && !player) return !isZoomed && pager.go(pager.index + step) !== false;
      return !!act && used(() => act.skip(5 * step));
    };
    const louder = (step) => !isZoomed && !isChoice && !!act && used(() => act.louder(step));
    const edge = (isEnd) => {
      if (slider) return false; // the slider's own ends
      if (pager) return used(() => pager.go(isEnd ? pager.count - 1 : 0));
      return !!player && used(() => player.seek(isEnd ? player.duration : 0));
    };
    return {
      ' ': () => {
        if (isChoice || target.closest('button, a, summary')) return false;
        if (player) player.toggle();
        else pager?.go(pager.index + (event.shiftKey ? -1 : 1));
        return true;
      },
      ArrowLeft: () => aside(-1),
      ArrowRight: () => aside(1),
      ArrowUp: () => louder(0.05),
      ArrowDown: () => louder(-0.05),
      PageDown: () => turn(1),
      PageUp: () => turn(-1),
      Home: () => edge(false),
      End: () => edge(true),
    };
  }

  // Keys that work anywhere on the page.
  function keysOfPage(app, {stage}) {
    const player = stage?.player,
      pager = stage?.pager,
      sheet = stage?.sheet,
      act = stage?.transport?.actions;
    const keys = {
      k: () => player?.toggle(),
      j: () => act?.skip(-10),
      l: () => act?.skip(10),
      m: () => act?.mute(),
      '[': () => (pager ? pager.go(pager.index - 1) : act?.chapter(-1)),
      ']': () => (pager ? pager.go(pager.index + 1) : act?.chapter(1)),
      '<': () => act?.faster(-1),
      '>': () => act?.faster(1),
      n: () => app.step(1),
      p: () => app.step(-1),
      s: () => stage?.view?.swap(),
      d: () => stage?.view?.next(),
      f: () => app.screen.toggleFullscreen(),
      i: () => app.screen.togglePictureInPicture(),
      v: () => app.screen.togglePresenting(),
      w: () => stage && app.screen.toggleTheatre(),
      b: () => app.screen.isPresenting && app.screen.toggleBlank(),
      '.': () => app.screen.isPresenting && app.screen.toggleBlank(),
      '+': () => sheet?.zoomBy(1),
      '=': () => sheet?.zoomBy(1),
      '-': () => sheet?.zoomBy(-1),
      t: () => stage?.toggleText?.(),
      u: () => app.copyLink(),
      '/': () => app.openSearch(),
      h: () => app.goHome(),
      '?': () => app.openHelp(),
      Escape: () => app.leave(),
    };
    for (let digit = 0; digit <= 9; ++digit) keys[digit] = () => player?.seek((player.duration * digit) / 10);
    return keys;
  }

  // app: {screen, stage(), frame(), isOn(), step(n), …}: see keys() in app.js
  Olive.listenToKeys = (app) => {
    document.addEventListener('keydown', (event) => {
      const isTyped = event.getModifierState?.('AltGraph'); // brackets of many keyboards
      if (event.metaKey || ((event.ctrlKey || event.altKey) && !isTyped)) return;
      if (event.defaultPrevented || event.isComposing) return;
      if (document.querySelector('dialog[open]') || !app.isOn()) return;
      const target = event.target instanceof Element ? event.target : document.body;
      if (isField(target)) return;
      const now = {stage: app.stage(), target, event};
      const key = meaningOf(event);
      const inPlayer = app.screen.isPresenting || app.frame()?.contains(target);
      const inside = inPlayer && keysOfPlayer(app, now)[key];
      const anywhere = keysOfPage(app, now)[key];
      if (inside ? inside() : anywhere) event.preventDefault();
      if (!inside && anywhere) anywhere();
    });
  };
})(window.Olive);
