// SPDX-License-Identifier: Apache-2.0
// The player's frame on the whole screen: full screen, presentation, blank screen, picture in picture; and controls that
// fade while nobody moves.
'use strict';

((Olive) => {
  const {say} = Olive;
  const kIdleAfter = 2500; // ms
  const root = document.documentElement;
  const has = (name) => root.classList.contains(name);

  // now(): {frame, stage} of the item on the page, or nulls.
  Olive.makeFrameControl = (now) => {
    let idle = 0;

    const control = {
      isPresenting: () => has('presenting'),

      toggleFullscreen() {
        const {frame} = now();
        if (!frame) return;
        if (document.fullscreenElement) document.exitFullscreen();
        else if (document.fullscreenEnabled) frame.requestFullscreen().catch(control.togglePresenting);
        else control.togglePresenting(); // the window is all that this browser gives
      },

      togglePresenting() {
        const {frame} = now();
        if (!frame && !has('presenting')) return;
        root.classList.remove('blank');
        root.classList.toggle('idle', root.classList.toggle('presenting'));
        Olive.announce(say(has('presenting') ? 'presentingOn' : 'presentingOff'));
        if (has('presenting')) frame.focus({preventScroll: true});
      },

      toggleBlank: () => root.classList.toggle('blank'),

      togglePictureInPicture() {
        const {stage} = now();
        const video = stage?.elements?.find((element) => element.localName === 'video');
        if (!video || !document.pictureInPictureEnabled) return;
        if (document.pictureInPictureElement) document.exitPictureInPicture();
        else video.requestPictureInPicture().catch(() => Olive.announce(say('notPossible')));
      },

      // One step out of what covers the page; false when nothing does.
      leave() {
        if (has('blank')) root.classList.remove('blank');
        else if (has('presenting')) control.togglePresenting();
        else return false;
        return true;
      },

      // Somebody moved, or something began to play.
      wake() {
        root.classList.remove('idle');
        clearTimeout(idle);
        const {stage} = now();
        const isFilm = document.fullscreenElement && stage && stage.player && stage.player.isPlaying;
        if (isFilm || has('presenting')) idle = setTimeout(() => root.classList.add('idle'), kIdleAfter);
      },

      // The buttons for an item with these media elements.
      buttons: (elements) => [
        document.pictureInPictureEnabled &&
          elements.some((element) => element.localName === 'video') &&
          Olive.iconButton('pip', say('pip'), control.togglePictureInPicture, {class: 'icon-button pip wide-only'}),
        Olive.iconButton('present', say('present'), control.togglePresenting, {class: 'icon-button wide-only'}),
        Olive.iconButton('full', say('fullscreen'), control.toggleFullscreen, {class: 'icon-button fullscreen'}),
      ],
    };

    for (const name of ['pointermove', 'pointerdown']) document.addEventListener(name, control.wake, {passive: true});
    // A clicker's keys turn pages without bringing the controls back.
    document.addEventListener('keydown', (event) => {
      if (!has('presenting') || event.key === 'Tab') control.wake();
    });
    document.addEventListener('fullscreenchange', () => {
      control.wake();
      const button = document.querySelector('.fullscreen');
      if (!button) return;
      Olive.setIcon(button, document.fullscreenElement ? 'unfull' : 'full');
      Olive.relabel(button, say(document.fullscreenElement ? 'leaveFullscreen' : 'fullscreen'));
    });
    return control;
  };
})(window.Olive);
