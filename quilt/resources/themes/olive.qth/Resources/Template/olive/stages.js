// SPDX-License-Identifier: Apache-2.0
// What an item looks like on the stage, by its category. A stage is {element, controls, player, transport, pager, sheet, view,
// toggleText, close}:
// player is a Player or null; pager {count, index, go(index)} or null; view {value, set(name), swap()} of two pictures.
'use strict';

((Olive) => {
  const {make, say} = Olive;
  Olive.stages = {};

  // Elements are used again for the next item: a browser that let one play with sound lets it go on.
  const resting = {video: [], audio: []};
  function takeElement(kind) {
    const element = resting[kind].pop() || make(kind, {preload: 'metadata', playsinline: true});
    element.className = '';
    return element;
  }
  const giveBack = (element) => resting[element.localName].push(element);

  Olive.bestFile = (item) => {
    const files = item.sources.flatMap((source) => source.files).filter((file) => file.address);
    return files[0] || null;
  };

  // What went wrong, and what can be done about it.
  Olive.makeMessage = (text, file, retry) =>
    make(
      'div',
      {class: 'message', role: 'alert'},
      Olive.icon('warning'),
      make('p', {text}),
      make(
        'div',
        {class: 'message-actions'},
        retry && make('button', {type: 'button', class: 'quiet', text: say('tryAgain'), onclick: retry}),
        file &&
          make('a', {class: 'quiet', href: file.address, target: '_blank', rel: 'noopener', text: say('openFile')}),
      ),
    );

  const posterOf = (item) => item.poster || (item.sources[0]?.previews[0] ? item.sources[0].previews[0].picture : '');

  // What lies over the stage until the first start; startHere(seconds) begins there, or where the player stands for null.
  function makeCover(poster, resumeAt, startHere) {
    const again = resumeAt ? say('continueAt', {time: Olive.clock(resumeAt)}) : '';
    const begin = () => startHere(resumeAt || null);
    const cover = make(
      'div',
      {class: 'cover'},
      poster && Olive.picture(poster, {class: 'cover-picture', loading: 'eager'}),
      make(
        'div',
        {class: 'cover-actions'},
        make(
          'button',
          {type: 'button', class: 'big-play', onclick: begin, 'aria-label': again || say('play')},
          Olive.icon('play'),
          again && make('span', {text: again}),
        ),
        again && make('button', {type: 'button', class: 'quiet', text: say('startOver'), onclick: () => startHere(0)}),
      ),
    );
    cover.addEventListener('click', (event) => {
      if (event.target === cover || event.target.localName === 'img') begin();
    });
    return cover;
  }

  // Player, transport, cover and messages, alike for everything that runs in time.
  // parts: [{source, kind, offset, leads}]; options: {content(elements, player), extras(player, elements), chapters,
  // cover (false: what lies under it is worth seeing), host (a stage that has its own content and no cover)}
  Olive.timedStage = (item, context, parts, options) => {
    const elements = parts.map((part) => takeElement(part.kind));
    const wanted = context.memory.choice('grade', '');
    const grades = parts.map((part) => new Olive.Grades(part.source, wanted));
    const player = new Olive.Player(
      parts.map((part, i) => ({element: elements[i], grades: grades[i], offset: part.offset || 0, leads: part.leads})),
      item.duration,
    );
    const content = options.content(elements, player);
    const under = [content].flat(2);
    const element = options.host || make('div', {class: 'stage ' + item.category.toLowerCase()});
    element.append(...under);
    const spinner = make('div', {class: 'spinner', 'aria-hidden': 'true', hidden: true});
    element.append(spinner);

    const choices = parts.reduce(
      (best, part, i) =>
        part.kind === 'video' && grades[i].choices().length > best.length ? grades[i].choices() : best,
      [],
    );
    const transport = Olive.makeTransport(player, {
      chapters: options.chapters || [],
      choices,
      grade: choices.some((choice) => choice.grade === wanted) ? wanted : '',
      onGrade(grade) {
        context.memory.choose('grade', grade);
        player.choose(grade, Olive.pixelsAcross(element));
      },
      extras: [options.extras ? options.extras(player, elements) : [], context.frameButtons(elements)].flat(),
      memory: context.memory,
    });

    const saved = context.memory.place(item);
    const resumeAt = context.start.t === null && !saved.done && saved.time > 5 ? saved.time : 0;
    const startHere = (seconds) => {
      if (seconds !== null) player.seek(seconds);
      player.play();
      context.focus();
    };
    const cover = makeCover(options.cover === false || context.start.t ? '' : posterOf(item), resumeAt, startHere);
    if (!options.host) {
      element.append(cover);
      under.forEach((node) => {
        node.inert = true;
      });
    }

    player.addEventListener('state', () => {
      if (player.isPlaying) {
        cover.remove();
        under.forEach((node) => {
          node.inert = false;
        });
        element.querySelectorAll('.blocked').forEach((node) => node.remove());
      }
      spinner.hidden = !player.isWaiting;
    });
    player.addEventListener('time', () => {
      // who looks for a place before the start wants to see it
      if (player.time > 0 && cover.querySelector('.cover-picture')) cover.querySelector('.cover-picture').remove();
    });
    player.addEventListener('blocked', () => {
      element.append(
        make(
          'div',
          {class: 'cover blocked'},
          make(
            'div',
            {class: 'cover-actions'},
            make(
              'button',
              {type: 'button', class: 'big-play', 'aria-label': say('play'), onclick: () => startHere(null)},
              Olive.icon('play'),
            ),
          ),
        ),
      );
    });

    function complain(stream) {
      const isAll = player.streams.every((each) => each.hasFailed);
      const message = Olive.makeMessage(
        say(isAll ? 'cannotPlay' : 'partMissing'),
        stream.grades.files[0],
        isAll ? context.again : null,
      );
      if (isAll) {
        cover.querySelector('.cover-actions').replaceChildren();
        if (!cover.isConnected && !options.host) element.append(cover);
        element.classList.toggle('failed', !options.host);
        element.append(message);
      } else {
        (stream.element.closest('.pane') || element).append(message);
      }
    }
    player.addEventListener('failed', (event) => complain(event.detail));
    player.addEventListener('duration', () => {
      const {videoWidth, videoHeight} = elements[0] || {};
      element.classList.toggle('upright', videoHeight > videoWidth);
    });

    queueMicrotask(() => {
      player.open(Olive.pixelsAcross(element));
      if (context.start.t !== null) player.seek(context.start.t);
      if (context.start.play) startHere(context.start.t === null ? resumeAt || null : null);
    });

    element.addEventListener('click', (event) => {
      if (options.host || event.target.closest('button, a, .cover, .message, .small, .divider')) return;
      player.toggle();
    });

    return {
      element,
      controls: transport.element,
      transport,
      player,
      elements,
      close() {
        player.close();
        for (const each of elements) {
          each.remove();
          giveBack(each);
        }
      },
    };
  };

  // The voice that an author added to a movie: heard instead of the movie's own sound.
  function commentarySwitch(player) {
    const voice = player.streams[player.streams.length - 1],
      own = player.leader;
    player.enable(voice, false);
    const button = Olive.iconButton(
      'voice',
      say('commentary'),
      () => {
        const isOn = player.leader !== voice;
        player.lead(isOn ? voice : own);
        if (!isOn) player.enable(voice, false);
        button.setAttribute('aria-pressed', isOn);
        Olive.announce(say(isOn ? 'commentaryOn' : 'commentaryOff'));
      },
      {'aria-pressed': 'false'},
    );
    return button;
  }

  Olive.stages.Movie = (item, context) => {
    const parts = [{source: item.sources[0], kind: 'video', leads: true}];
    if (item.commentary) parts.push({source: item.commentary, kind: 'audio'});
    return Olive.timedStage(item, context, parts, {
      content: ([video]) => video,
      chapters: item.chapters,
      extras: (player) => (item.commentary ? [commentarySwitch(player)] : []),
    });
  };

  Olive.stages.Audio = (item, context) => {
    const poster = posterOf(item);
    return Olive.timedStage(item, context, [{source: item.sources[0], kind: 'audio', leads: true}], {
      content: ([audio]) => [
        make(
          'div',
          {class: 'record'},
          poster ? Olive.picture(poster, {loading: 'eager'}, () => Olive.icon('Audio')) : Olive.icon('Audio'),
        ),
        audio,
      ],
      cover: false,
    });
  };

  Olive.stages.Web = (item, context) => {
    const address = item.link;
    const element = make(
      'div',
      {class: 'stage web'},
      make(
        'div',
        {class: 'web-card'},
        Olive.icon('Web'),
        make('p', {class: 'web-title', dir: 'auto', 'data-title-of': item.id, text: item.title}),
        address &&
          make('p', {class: 'web-address', dir: 'ltr', text: address.replace(/^https?:\/\//, '').replace(/\/$/, '')}),
        address
          ? make(
              'a',
              {
                class: 'primary',
                href: address,
                target: '_blank',
                rel: 'noopener noreferrer',
                onclick: () => context.memory.keep(item, {done: true}),
              },
              say('openLink'),
              Olive.icon('open'),
            )
          : make('p', {text: say('badLink')}),
        address && make('p', {class: 'badge', text: say('needsInternet')}),
      ),
    );
    return {element, controls: null, player: null, close() {}};
  };

  function emptyStage(item, _context) {
    return {
      element: make('div', {class: 'stage'}, Olive.makeMessage(say('nothingToShow'), Olive.bestFile(item), null)),
      controls: null,
      player: null,
      close() {},
    };
  }

  // context: {memory, start: {t, page, view, play}, frameButtons(elements), note(), focus(), again(), terms(), onPage(index)}
  Olive.makeStage = (item, context) => {
    const kind =
      item.sources.length && Object.hasOwn(Olive.stages, item.category) ? Olive.stages[item.category] : emptyStage;
    return kind(item, context);
  };
})(window.Olive);
