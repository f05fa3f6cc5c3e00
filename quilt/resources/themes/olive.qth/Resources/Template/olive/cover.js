// SPDX-License-Identifier: Apache-2.0
// What lies over the stage: the big button before the start, and messages about what went wrong.
'use strict';

((Olive) => {
  const {make, say} = Olive;

  // What went wrong, with which file, and what can be done about it.
  Olive.makeMessage = (text, file, retry) => {
    const name = file && (file.name || decodeURIComponent(file.address.split('/').pop()));
    return make(
      'div',
      {class: 'message', role: 'alert'},
      Olive.icon('warning'),
      make('p', {text}),
      name && make('p', {class: 'message-file', dir: 'ltr', text: name}),
      make(
        'div',
        {class: 'message-actions'},
        retry && make('button', {type: 'button', class: 'quiet', text: say('tryAgain'), onclick: retry}),
        file &&
          make('a', {class: 'quiet', href: file.address, target: '_blank', rel: 'noopener', text: say('openFile')}),
      ),
    );
  };

  const bigPlay = (label, words, onclick) =>
    make(
      'button',
      {type: 'button', class: 'big-play', onclick, 'aria-label': label},
      Olive.icon('play'),
      words && make('span', {text: words}),
    );

  // What lies over the stage until the first start; startHere(seconds) begins there, or where the player stands for null.
  Olive.makeCover = (poster, resumeAt, startHere) => {
    const again = resumeAt ? say('continueAt', {time: Olive.clock(resumeAt)}) : '';
    const begin = () => startHere(resumeAt || null);
    const startOver =
      again && make('button', {type: 'button', class: 'quiet', text: say('startOver'), onclick: () => startHere(0)});
    const cover = make(
      'div',
      {class: 'cover'},
      poster && Olive.picture(poster, {class: 'cover-picture', loading: 'eager'}),
      make('div', {class: 'cover-actions'}, bigPlay(again || say('play'), again, begin), startOver),
    );
    cover.addEventListener('click', (event) => {
      if (event.target === cover || event.target instanceof HTMLImageElement) begin();
    });
    return cover;
  };

  // The browser wants a gesture before it plays with sound.
  Olive.makeBlockedCover = (start) =>
    make('div', {class: 'cover blocked'}, make('div', {class: 'cover-actions'}, bigPlay(say('play'), '', start)));
})(window.Olive);
