// SPDX-License-Identifier: Apache-2.0
// Goes on to the next item after a moment in which that can be stopped.
'use strict';

((Olive) => {
  const {make, say} = Olive;
  const kAfter = 5000; // ms

  // app: see app.js; next: an item
  Olive.offerNext = (app, next) => {
    const {stage} = app;
    const go = () => {
      cancel();
      app.open(next, true);
    };
    const timer = setTimeout(go, kAfter);
    const box = make(
      'div',
      {class: 'cover up-next', role: 'status'},
      make(
        'div',
        {class: 'cover-actions'},
        make('p', {text: say('upNext', {title: next.title})}),
        make('button', {type: 'button', class: 'primary', text: say('playNow'), onclick: go}),
        make('button', {type: 'button', class: 'quiet', text: say('cancel'), onclick: () => cancel()}),
      ),
    );
    function cancel() {
      clearTimeout(timer);
      box.remove();
    }
    stage.element.append(box);
    stage.cancelNext = cancel;
    stage.player.addEventListener('state', () => {
      if (app.stage === stage && stage.player.isPlaying) cancel();
    });
  };
})(window.Olive);
