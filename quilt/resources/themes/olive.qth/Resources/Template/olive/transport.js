// SPDX-License-Identifier: Apache-2.0
// The controls of a player: seek bar, then one row of play, skip, sound and what belongs to the item, and a menu of what
// is needed more seldom. Runs from left to right in every language, as the time line does.
'use strict';

((Olive) => {
  const {make, say, clock, clamp} = Olive;
  const kSpeeds = [0.5, 0.75, 1, 1.25, 1.5, 1.75, 2];
  const kSkip = 10;

  const speedLabel = (speed) => Olive.number(speed, 2) + '×';

  // What the controls, the keys and the gestures do with a player.
  function makeActions(player, memory, chapters) {
    const starts = chapters.map((chapter) => chapter.start).filter((start) => start !== null);
    const actions = {
      setVolume(value) {
        const loudness = clamp(value, 0, 1);
        memory.choose('volume', loudness);
        memory.choose('muted', false);
        player.setSound(loudness, false);
        Olive.announce(say('volumeNow', {percent: Olive.number(loudness * 100)}));
      },
      louder: (step) => actions.setVolume(player.loudness + step),
      mute() {
        memory.choose('muted', !player.isMuted);
        player.setSound(player.loudness || 0.5, !player.isMuted);
        Olive.announce(say(player.isMuted ? 'muted' : 'unmuted'));
      },
      setSpeed(value) {
        memory.choose('speed', value);
        player.setSpeed(value);
        Olive.announce(say('speedNow', {speed: speedLabel(value)}));
      },
      faster(step) {
        const at = kSpeeds.findIndex((value) => value >= player.speed - 0.01);
        actions.setSpeed(kSpeeds[clamp(at + step, 0, kSpeeds.length - 1)]);
      },
      skip: (seconds) => player.seek(player.time + seconds),
      // To the next chapter or the one before; false when there is none.
      chapter(step) {
        if (!starts.length) return false;
        const now = player.time;
        const later = starts.find((start) => start > now + 0.1),
          earlier = starts.filter((start) => start < now - 2).pop();
        if (step > 0 && later === undefined) return false;
        player.seek(step > 0 ? later : (earlier ?? starts[0]));
        return true;
      },
    };
    return actions;
  }

  function makeSound(player, actions) {
    const mute = Olive.iconButton('loud', say('mute'), () => actions.mute());
    const volume = make('input', {
      type: 'range',
      class: 'volume',
      min: 0,
      max: 1,
      step: 0.05,
      'aria-label': say('volume'),
      oninput: () => actions.setVolume(Number(volume.value)),
    });
    const update = () => {
      const isSilent = player.isMuted || player.loudness === 0;
      Olive.setIcon(mute, isSilent ? 'mute' : 'loud');
      Olive.relabel(mute, say(isSilent ? 'unmute' : 'mute'));
      volume.value = isSilent ? 0 : player.loudness;
      volume.style.setProperty('--done', Number(volume.value) * 100 + '%');
      volume.setAttribute('aria-valuetext', Olive.number(Number(volume.value) * 100) + ' %');
    };
    return {element: make('div', {class: 'sound'}, mute, volume), update};
  }

  // Speed, quality and what else the item offers; options as for makeTransport.
  function makePlaybackMenu(player, actions, options) {
    const speeds = kSpeeds.map((value) => [value, speedLabel(value)]);
    const speed = Olive.menuChoice(say('speed'), speeds, player.speed, actions.setSpeed);
    const grades = options.choices.map((choice) => [choice.grade, Olive.gradeLabel(choice)]);
    const grade =
      grades.length > 1 &&
      Olive.menuChoice(say('grade'), [['', say('automatic')], ...grades], options.grade, options.onGrade).element;
    const menu = Olive.makeMenu('gear', say('playback'), [
      speed.element,
      grade,
      ...options.choosers,
      make('div', {class: 'menu-actions'}, options.more.map(Olive.menuAction)),
    ]);
    const badge = make('span', {class: 'menu-badge', 'aria-hidden': 'true'});
    menu.button.append(badge);
    const update = () => {
      speed.set(player.speed);
      badge.textContent = player.speed === 1 ? '' : speedLabel(player.speed);
    };
    return {element: menu.element, update};
  }

  // options: {chapters, choices (of grades), grade, onGrade, extras (more controls), choosers (more choices of the menu),
  // more (actions of the menu), last (controls at the end of the row), memory}. Returns {element, actions, playButton,
  // disable()}.
  Olive.makeTransport = (player, options) => {
    const actions = makeActions(player, options.memory, options.chapters);
    player.setSpeed(options.memory.choice('speed', 1));
    player.setSound(options.memory.choice('volume', 1), options.memory.choice('muted', false));
    const seek = new Olive.SeekBar(player, options.chapters);
    const sound = makeSound(player, actions);
    const menu = makePlaybackMenu(player, actions, options);
    const now = make('span', {class: 'now'}),
      whole = make('span', {class: 'whole'});
    const playButton = Olive.iconButton('play', say('play'), () => player.toggle(), {class: 'icon-button play'});
    const skip = (icon, step) =>
      Olive.iconButton(icon, say(icon, {n: kSkip}), () => actions.skip(step), {class: 'icon-button skips'});
    const element = make(
      'div',
      {class: 'transport', dir: 'ltr', role: 'group', 'aria-label': say('controls')},
      seek.bar,
      make(
        'div',
        {class: 'buttons'},
        playButton,
        skip('back', -kSkip),
        skip('forward', kSkip),
        player.streams.length > 0 && sound.element,
        make('span', {class: 'time', 'aria-hidden': 'true'}, now, whole),
        make('span', {class: 'gap'}),
        options.extras,
        menu.element,
        options.last,
      ),
    );

    function update() {
      seek.update();
      now.textContent = clock(player.time);
      whole.textContent = ' / ' + clock(player.duration);
    }

    function updateState() {
      const next = player.isPlaying ? 'pause' : player.hasEnded ? 'playAgain' : 'play';
      Olive.setIcon(playButton, next === 'playAgain' ? 'replay' : next);
      Olive.relabel(playButton, say(next));
      sound.update();
      menu.update();
      update();
    }

    player.addEventListener('time', update);
    player.addEventListener('duration', update);
    player.addEventListener('state', updateState);
    player.addEventListener('ended', updateState);
    updateState();
    return {
      element,
      actions,
      playButton,
      // Nothing can be played: only what is not about playing stays.
      disable() {
        element.classList.add('off');
        for (const control of element.querySelectorAll('button, input')) {
          if (!control.closest('.last')) control.disabled = true;
        }
      },
    };
  };
})(window.Olive);
