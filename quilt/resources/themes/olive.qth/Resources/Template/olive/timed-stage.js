// SPDX-License-Identifier: Apache-2.0
// Player, transport, cover and messages, alike for everything that runs in time.
'use strict';

((Olive) => {
  const {make, say} = Olive;

  // Elements are used again for the next item: a browser that let one play with sound lets it go on.
  const resting = {video: [], audio: []};
  function takeElement(part) {
    const element = resting[part.kind].pop() || make(part.kind, {preload: 'metadata', playsinline: true});
    element.className = '';
    if (part.poster) element.setAttribute('poster', part.poster);
    else element.removeAttribute('poster');
    return element;
  }
  const giveBack = (element) => resting[element.localName].push(element);

  // The choices of quality: those of the picture that has most of them.
  function gradesToChoose(parts, grades) {
    const lists = grades.filter((_, i) => parts[i].kind === 'video').map((each) => each.choices());
    return lists.reduce((best, list) => (list.length > best.length ? list : best), []);
  }

  // Says what failed: in the pane of a stream, or over everything when nothing is left.
  function makeComplaint({player, transport, element, cover, context, isHosted}) {
    return (stream) => {
      const isAll = player.streams.every((each) => each.hasFailed);
      const isOver = isAll && !player.isFree;
      const words = say(isOver ? 'cannotPlay' : 'partMissing');
      const message = Olive.makeMessage(words, stream.grades.files[0], isOver ? context.again : null);
      if (!isOver) {
        const pane = stream.element.closest('.pane') || element;
        const close = Olive.iconButton('close', say('close'), () => message.remove(), {class: 'icon-button dismiss'});
        message.append(close);
        pane.append(message);
        return;
      }
      transport.disable();
      cover.querySelector('.cover-actions').replaceChildren();
      if (!cover.isConnected && !isHosted) element.append(cover);
      element.classList.toggle('failed', !isHosted);
      element.append(message);
    };
  }

  // parts: [{source, kind, offset, leads, speaksAgain, poster}]; options: {content(elements, player), extras(player,
  // elements), choosers (nodes for the menu), chapters, cover (false: what lies under it is worth seeing), host (a stage
  // that has its own content and no cover), ratio (of the picture), keepsShape
  // (others set it), runsAlone (a clock goes on when every stream failed)}
  Olive.timedStage = (item, context, parts, options) => {
    const {memory} = context,
      isHosted = !!options.host;
    const elements = parts.map(takeElement);
    const wanted = memory.choice('grade', '');
    const grades = parts.map((part) => new Olive.Grades(part.source, wanted));
    const streams = parts.map((part, i) => ({...part, element: elements[i], grades: grades[i]}));
    const player = new Olive.Player(streams, item.duration, options.runsAlone);
    const under = [options.content(elements, player)].flat(2);
    const element = options.host || make('div', {class: 'stage ' + item.category.toLowerCase()});
    const spinner = make('div', {class: 'spinner', 'aria-hidden': 'true', hidden: true});
    element.append(...under, spinner);
    if (options.ratio) Olive.setShape(element, options.ratio);

    const choices = gradesToChoose(parts, grades);
    const transport = Olive.makeTransport(player, {
      chapters: options.chapters || [],
      choices,
      grade: choices.some((choice) => choice.grade === wanted) ? wanted : '',
      onGrade(grade) {
        memory.choose('grade', grade);
        player.choose(grade, Olive.pixelsAcross(element));
      },
      extras: options.extras ? options.extras(player, elements) : [],
      choosers: options.choosers ? options.choosers() : [],
      more: context.frameActions(elements),
      last: make('div', {class: 'last'}, context.frameButtons()),
      memory,
    });

    const saved = memory.place(item);
    const resumeAt = context.start.t === null && !saved.done && saved.time > 5 ? saved.time : 0;
    const startHere = (seconds) => {
      if (seconds !== null) player.seek(seconds);
      player.play();
      context.focus();
    };
    const poster = options.cover === false || context.start.t ? '' : Olive.posterOf(item);
    const cover = Olive.makeCover(poster, resumeAt, startHere);
    const setInert = (isInert) => {
      for (const node of under) node.inert = isInert;
    };
    if (!isHosted) {
      element.append(cover);
      setInert(true);
    }

    player.addEventListener('state', () => {
      spinner.hidden = !player.isWaiting;
      if (!player.isPlaying) return;
      cover.remove();
      setInert(false);
      for (const node of element.querySelectorAll('.blocked')) node.remove();
    });
    player.addEventListener('time', () => {
      // who looks for a place before the start wants to see it
      if (player.time > 0) cover.querySelector('.cover-picture')?.remove();
    });
    player.addEventListener('blocked', () => element.append(Olive.makeBlockedCover(() => startHere(null))));
    const complain = makeComplaint({player, transport, element, cover, context, isHosted});
    player.addEventListener('failed', (event) => complain(/** @type {CustomEvent} */ (event).detail));
    if (options.ratio && elements[0]?.localName === 'video' && !options.keepsShape) {
      player.addEventListener('duration', () => {
        Olive.setShape(element, Olive.shownRatio(elements[0], options.ratio));
      });
    }

    queueMicrotask(() => {
      player.open(Olive.pixelsAcross(element));
      if (context.start.t !== null) player.seek(context.start.t);
      if (context.start.play) startHere(context.start.t === null ? resumeAt || null : null);
    });
    if (!isHosted) context.listenToGestures(element, {player, transport});

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
})(window.Olive);
