// SPDX-License-Identifier: Apache-2.0
// What a pointer does on the stage. A mouse plays and pauses with a click and fills the screen with two; a finger brings
// the controls with a tap, skips with two, and turns pages and pictures with a swipe.
'use strict';

((Olive) => {
  const {make} = Olive;
  const kSecondTap = 280; // ms
  const kSwipe = 48; // pixels
  const kPart = 0.35; // of the width: where two taps skip
  const kForControls = 'button, a, input, label, .cover, .message, .small, .divider, .menu';

  // stage: an element; acts: {toggle, skip(seconds), turn(step), toggleFullscreen, isAsleep()}, each but the last two may be
  // missing.
  Olive.listenToGestures = (stage, acts) => {
    const isControl = (event, more = '') =>
      event.target instanceof Element && !!event.target.closest(kForControls + more);
    let kind = 'mouse',
      lastTap = 0,
      timer = 0,
      from = null,
      wasAsleep = false;

    function showSkip(seconds) {
      const text = (seconds < 0 ? '− ' : '+ ') + Math.abs(seconds) + ' s';
      const sign = make('div', {class: 'skip-sign ' + (seconds < 0 ? 'left' : 'right'), 'aria-hidden': 'true', text});
      stage.append(sign);
      setTimeout(() => sign.remove(), 600);
    }

    function tapTwice(x) {
      const box = stage.getBoundingClientRect(),
        place = (x - box.left) / box.width;
      const seconds = place < kPart ? -10 : place > 1 - kPart ? 10 : 0;
      if (!seconds || !acts.skip) return acts.toggleFullscreen();
      acts.skip(seconds);
      showSkip(seconds);
    }

    function tap(event) {
      const now = performance.now();
      if (now - lastTap < kSecondTap) {
        clearTimeout(timer);
        tapTwice(event.clientX);
        return;
      }
      lastTap = now;
      if (wasAsleep) return; // the first tap brings the controls
      timer = setTimeout(() => acts.toggle?.(), kSecondTap);
    }

    stage.addEventListener(
      'pointerdown',
      (event) => {
        kind = event.pointerType;
        wasAsleep = acts.isAsleep();
        const isWorked = event.target instanceof Element && event.target.closest('.divider, input, .menu');
        from = event.isPrimary && !isWorked ? {x: event.clientX, y: event.clientY} : null;
      },
      true,
    );
    stage.addEventListener('pointerup', (event) => {
      const begin = from;
      from = null;
      if (!begin || kind !== 'touch' || stage.querySelector('.zoomed')) return;
      const x = event.clientX - begin.x,
        y = event.clientY - begin.y;
      if (Math.abs(x) < kSwipe || Math.abs(x) < 2 * Math.abs(y)) return;
      const forward = document.documentElement.dir === 'rtl' ? 1 : -1;
      acts.turn?.(Math.sign(x) * forward);
    });
    stage.addEventListener('click', (event) => {
      if (isControl(event)) return;
      if (kind === 'touch') tap(event);
      else acts.toggle?.();
    });
    stage.addEventListener('dblclick', (event) => {
      if (kind === 'touch' || isControl(event, ', .sheet')) return;
      acts.toggleFullscreen();
    });
  };
})(window.Olive);
