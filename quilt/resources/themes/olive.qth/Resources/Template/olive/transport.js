// SPDX-License-Identifier: Apache-2.0
// The controls of a player: seek bar with chapter marks, play, skip, sound, speed, grade. Runs from left to right in
// every language, as the time line does.
'use strict';

((Olive) => {
  const {make, say, clock, clamp} = Olive;
  const kSpeeds = [0.5, 0.75, 1, 1.25, 1.5, 1.75, 2];
  const kSkip = 10;

  const speedLabel = (speed) => Olive.number(speed, 2) + '×';

  function seekBar(player, chapters) {
    const range = make('input', {
      type: 'range',
      class: 'seek',
      min: 0,
      max: 1,
      step: 'any',
      value: 0,
      'aria-label': say('seek'),
    });
    const marks = make('div', {class: 'marks', 'aria-hidden': 'true'});
    const bubble = make('div', {class: 'bubble', hidden: true, 'aria-hidden': 'true'});
    const bar = make('div', {class: 'seek-bar'}, range, marks, bubble);
    let isDragged = false;

    const chapterAt = (seconds) =>
      chapters.filter((chapter) => chapter.start !== null && chapter.start <= seconds + 0.05).pop();
    const share = (seconds) => (player.duration ? clamp(seconds / player.duration, 0, 1) : 0);

    function drawMarks() {
      marks.replaceChildren(
        ...chapters
          .filter((chapter) => chapter.start > 0 && chapter.start < player.duration)
          .map((chapter) => {
            const mark = make('i');
            mark.style.insetInlineStart = share(chapter.start) * 100 + '%';
            return mark;
          }),
      );
    }

    function update() {
      const duration = player.duration;
      if (Number(range.max) !== duration) {
        range.max = duration || 1;
        drawMarks();
      }
      if (!isDragged) range.value = player.time;
      const shown = Number(range.value);
      bar.style.setProperty('--done', share(shown) * 100 + '%');
      const chapter = chapterAt(shown);
      range.setAttribute(
        'aria-valuetext',
        say('timeOf', {time: Olive.spokenTime(shown), total: Olive.spokenTime(duration)}) +
          (chapter ? ', ' + chapter.title : ''),
      );
    }

    function point(event) {
      const box = range.getBoundingClientRect();
      const part = clamp((event.clientX - box.left) / box.width, 0, 1);
      const seconds = part * player.duration;
      const chapter = chapterAt(seconds);
      bubble.replaceChildren(
        ...(chapter?.picture ? [Olive.picture(chapter.picture, {loading: 'eager'})] : []),
        ...(chapter ? [make('span', {class: 'bubble-title', dir: 'auto', text: chapter.title})] : []),
        make('span', {text: clock(seconds)}),
      );
      bubble.hidden = !player.duration;
      const half = bubble.offsetWidth / 2;
      bubble.style.left = clamp(part * box.width, half, box.width - half) + 'px';
    }

    range.addEventListener('input', () => {
      isDragged = true;
      player.seek(Number(range.value));
      update();
    });
    range.addEventListener('change', () => {
      isDragged = false;
    });
    bar.addEventListener('pointermove', point);
    bar.addEventListener('pointerleave', () => {
      bubble.hidden = true;
    });
    return {bar, range, update};
  }

  // options: {chapters, choices (of grades), grade, onGrade, extras (more controls), memory}
  Olive.makeTransport = (player, options) => {
    const {memory, chapters} = options;
    const seek = seekBar(player, chapters);
    const shown = make('span', {class: 'time', 'aria-hidden': 'true'});
    const playButton = Olive.iconButton('play', say('play'), () => player.toggle(), {class: 'icon-button play'});
    const muteButton = Olive.iconButton('loud', say('mute'), () => actions.mute());
    const volume = make('input', {
      type: 'range',
      class: 'volume',
      min: 0,
      max: 1,
      step: 0.05,
      'aria-label': say('volume'),
      oninput: () => actions.setVolume(Number(volume.value)),
    });
    const speed = make(
      'select',
      {
        class: 'choice',
        'aria-label': say('speed'),
        title: say('speed'),
        onchange: () => actions.setSpeed(Number(speed.value)),
      },
      kSpeeds.map((value) => make('option', {value, text: speedLabel(value)})),
    );
    const grade =
      options.choices.length > 1 &&
      make(
        'select',
        {
          class: 'choice',
          'aria-label': say('grade'),
          title: say('grade'),
          onchange: () => options.onGrade(grade.value),
        },
        make('option', {value: '', text: say('automatic')}),
        options.choices.map((choice) => make('option', {value: choice.grade, text: Olive.gradeLabel(choice)})),
      );
    const hasSound = player.streams.length > 0;

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
      chapter(step) {
        const starts = chapters.map((chapter) => chapter.start).filter((start) => start !== null);
        if (!starts.length) return false;
        const now = player.time;
        const target =
          step > 0 ? starts.find((start) => start > now + 0.1) : starts.filter((start) => start < now - 2).pop();
        if (target === undefined && step > 0) return false;
        player.seek(target === undefined ? starts[0] : target);
        return true;
      },
    };

    const element = make(
      'div',
      {class: 'transport', dir: 'ltr', role: 'group', 'aria-label': say('controls')},
      seek.bar,
      make(
        'div',
        {class: 'buttons'},
        playButton,
        Olive.iconButton('back', say('back', {n: kSkip}), () => actions.skip(-kSkip)),
        Olive.iconButton('forward', say('forward', {n: kSkip}), () => actions.skip(kSkip)),
        hasSound && make('div', {class: 'sound'}, muteButton, volume),
        shown,
        make('span', {class: 'gap'}),
        options.extras,
        speed,
        grade,
      ),
    );

    function update() {
      seek.update();
      shown.textContent = `${clock(player.time)} / ${clock(player.duration)}`;
    }

    function updateState() {
      const [icon, label] = player.isPlaying
        ? ['pause', 'pause']
        : player.hasEnded
          ? ['replay', 'playAgain']
          : ['play', 'play'];
      Olive.setIcon(playButton, icon);
      Olive.relabel(playButton, say(label));
      const isSilent = player.isMuted || player.loudness === 0;
      Olive.setIcon(muteButton, isSilent ? 'mute' : 'loud');
      Olive.relabel(muteButton, say(isSilent ? 'unmute' : 'mute'));
      volume.value = isSilent ? 0 : player.loudness;
      volume.style.setProperty('--done', volume.value * 100 + '%');
      volume.setAttribute('aria-valuetext', Olive.number(volume.value * 100) + ' %');
      speed.value = player.speed;
      update();
    }

    player.addEventListener('time', update);
    player.addEventListener('duration', update);
    player.addEventListener('state', updateState);
    player.addEventListener('ended', updateState);
    player.setSpeed(memory.choice('speed', 1));
    player.setSound(memory.choice('volume', 1), memory.choice('muted', false));
    if (grade) grade.value = options.grade;
    updateState();
    return {element, actions, playButton};
  };
})(window.Olive);
