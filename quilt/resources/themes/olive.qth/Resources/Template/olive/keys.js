// SPDX-License-Identifier: Apache-2.0
// The keyboard map. Letters work everywhere but in fields; space and arrows only inside the player, where they would
// otherwise scroll the page.
'use strict';

(function (Olive) {
  // For the help; the names are what the keys show.
  Olive.keyHelp = [
    [['Space', 'K'], 'key-play'], [['J', 'L'], 'key-skip'], [['←', '→'], 'key-step'], [['↑', '↓'], 'key-volume'], [['M'], 'mute'],
    [['0', '–', '9'], 'key-tenths'], [['[', ']'], 'key-chapter'], [['<', '>'], 'speed'], [['N', 'P'], 'key-item'], [['PgUp', 'PgDn'], 'key-page'],
    [['+', '−'], 'zoom'], [['S'], 'swap'], [['D'], 'views'], [['F'], 'fullscreen'], [['I'], 'pip'], [['V'], 'present'], [['B', '.'], 'key-blank'],
    [['T'], 'pageText'], [['U'], 'copyLink'], [['/'], 'search'], [['H'], 'home'], [['?'], 'help'], [['Esc'], 'key-leave'],
  ];

  const isField = (node) => node.closest('input:not([type=range]):not([type=checkbox]), select, textarea, [contenteditable]');

  // app: {stage(), frame(), isOn(), isPresenting(), step(n), …}: see app.js
  Olive.listenToKeys = function (app) {
    document.addEventListener('keydown', (event) => {
      if (event.ctrlKey || event.metaKey || event.altKey || event.defaultPrevented || event.isComposing) return;
      if (document.querySelector('dialog[open]') || !app.isOn()) return;
      const target = event.target instanceof Element ? event.target : document.body;
      if (isField(target)) return;
      const stage = app.stage(), player = stage && stage.player, pager = stage && stage.pager, sheet = stage && stage.sheet;
      const act = stage && stage.transport && stage.transport.actions;
      const inPlayer = app.isPresenting() || (app.frame() && app.frame().contains(target));
      const isRange = target.matches('input[type=range]');
      const key = event.key.length === 1 ? event.key.toLowerCase() : event.key;

      const turn = (step) => (pager ? pager.go(pager.index + step) : act && act.chapter(step) ? true : app.isPresenting() && app.step(step));
      const inside = {
        ' ': () => !target.closest('button, a') && (player ? player.toggle() : pager && pager.go(pager.index + (event.shiftKey ? -1 : 1)), true),
        ArrowLeft: () => (isRange && target.classList.contains('volume') ? false : pager && !player ? !sheet.isZoomed() && pager.go(pager.index - 1) !== false : act ? (act.skip(-5), true) : false),
        ArrowRight: () => (isRange && target.classList.contains('volume') ? false : pager && !player ? !sheet.isZoomed() && pager.go(pager.index + 1) !== false : act ? (act.skip(5), true) : false),
        ArrowUp: () => !(sheet && sheet.isZoomed()) && act && (act.louder(0.05), true),
        ArrowDown: () => !(sheet && sheet.isZoomed()) && act && (act.louder(-0.05), true),
        PageDown: () => turn(1) !== false,
        PageUp: () => turn(-1) !== false,
        Home: () => (pager ? (pager.go(0), true) : player && (player.seek(0), true)),
        End: () => (pager ? (pager.go(pager.count - 1), true) : player && (player.seek(player.duration), true)),
      };
      const anywhere = {
        k: () => player && player.toggle(),
        j: () => act && act.skip(-10),
        l: () => act && act.skip(10),
        m: () => act && act.mute(),
        '[': () => (pager ? pager.go(pager.index - 1) : act && act.chapter(-1)),
        ']': () => (pager ? pager.go(pager.index + 1) : act && act.chapter(1)),
        '<': () => act && act.faster(-1),
        '>': () => act && act.faster(1),
        n: () => app.step(1),
        p: () => app.step(-1),
        s: () => stage && stage.view && stage.view.swap(),
        d: () => app.nextView(),
        f: () => app.toggleFullscreen(),
        i: () => app.togglePictureInPicture(),
        v: () => app.togglePresenting(),
        b: () => app.isPresenting() && app.toggleBlank(),
        '.': () => app.isPresenting() && app.toggleBlank(),
        '+': () => sheet && sheet.zoomBy(1),
        '=': () => sheet && sheet.zoomBy(1),
        '-': () => sheet && sheet.zoomBy(-1),
        t: () => stage && stage.toggleText && stage.toggleText(),
        u: () => app.copyLink(),
        '/': () => app.openSearch(),
        h: () => app.goHome(),
        '?': () => app.openHelp(),
        Escape: () => app.leave(),
      };
      for (let digit = 0; digit <= 9; ++digit) anywhere[digit] = () => player && player.seek(player.duration * digit / 10);

      if (inPlayer && inside[key]) {
        if (inside[key]()) event.preventDefault();
      } else if (anywhere[key]) {
        event.preventDefault();
        anywhere[key]();
      }
    });
  };
})(window.Olive);
