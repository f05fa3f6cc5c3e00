// SPDX-License-Identifier: Apache-2.0
// Where the reader is: noted in the address and in the store while something is shown.
'use strict';

((Olive) => {
  const kNoteEvery = 1000; // ms

  // app: see app.js. Returns {note(isAtOnce), keep()}.
  Olive.makePlaces = (app) => {
    let last = 0;

    function keep() {
      const {stage, item, memory} = app;
      const player = stage.player;
      if (!player || player.time <= 0 || stage.pager || player.hasEnded) return;
      const share = player.duration ? player.time / player.duration : 0;
      const done = share > 0.97 ? {done: true} : player.isPlaying ? {done: false} : {};
      memory.keep(item, {time: player.time, share, ...done});
    }

    function note(isAtOnce) {
      const {stage, item} = app;
      const now = Date.now();
      if (!stage?.element.isConnected || (!isAtOnce && now - last < kNoteEvery)) return;
      last = now;
      const seconds = stage.player ? Math.round(stage.player.time * 10) / 10 : 0;
      Olive.address.note({
        item: app.isLonely && !seconds && !stage.pager ? '' : item.id,
        t: seconds || undefined,
        page: stage.pager && stage.pager.index >= 0 ? stage.pager.index + 1 : undefined,
        view: stage.view ? stage.view.value : undefined,
      });
      keep();
    }

    return {note, keep};
  };
})(window.Olive);
