// SPDX-License-Identifier: Apache-2.0
// Tells the system what plays, and takes its keys: on headphones, keyboards and lock screens.
'use strict';

((Olive) => {
  // app: see app.js
  Olive.tellSystem = (app) => {
    const session = navigator.mediaSession;
    if (!session || !window.MediaMetadata) return;
    const {stage, item, pack} = app,
      player = stage.player,
      act = stage.transport?.actions;
    session.metadata = player ? new MediaMetadata({title: item.title, artist: pack.author, album: pack.title}) : null;
    const handlers = {
      play: () => player.play(),
      pause: () => player.pause(),
      seekbackward: () => act.skip(-10),
      seekforward: () => act.skip(10),
      seekto: (detail) => player.seek(detail.seekTime),
      previoustrack: app.neighbour(-1) && (() => app.step(-1)),
      nexttrack: app.neighbour(1) && (() => app.step(1)),
    };
    for (const [name, handler] of Object.entries(handlers)) {
      try {
        session.setActionHandler(/** @type {MediaSessionAction} */ (name), player && handler ? handler : null);
      } catch {
        // an action that this browser does not know
      }
    }
  };

  Olive.tellSystemState = (isPlaying) => {
    if (navigator.mediaSession) navigator.mediaSession.playbackState = isPlaying ? 'playing' : 'paused';
  };
})(window.Olive);
