// SPDX-License-Identifier: Apache-2.0
// What an item looks like on the stage, by its category. A stage is {element, controls, player, pager, view, close}:
// player is a Player or null; pager {count, index, go(index)} or null; view {value, set(name), swap()} of two pictures.
'use strict';

(function (Olive) {
  const {make, say, clamp} = Olive;

  // Elements are used again for the next item: a browser that let one play with sound lets it go on.
  const resting = {video: [], audio: []};
  function takeElement(kind) {
    const element = resting[kind].pop() || make(kind, {preload: 'metadata', playsinline: true});
    element.className = '';
    return element;
  }
  const giveBack = (element) => resting[element.localName].push(element);

  const bestFile = (item) => {
    const files = item.sources.flatMap((source) => source.files).filter((file) => file.address);
    return files[0] || null;
  };

  // What went wrong, and what can be done about it.
  function makeMessage(text, file, retry) {
    return make('div', {class: 'message', role: 'alert'},
      Olive.icon('warning'),
      make('p', {text}),
      make('div', {class: 'message-actions'},
        retry && make('button', {type: 'button', class: 'quiet', text: say('tryAgain'), onclick: retry}),
        file && make('a', {class: 'quiet', href: file.address, target: '_blank', rel: 'noopener', text: say('openFile')})));
  }

  const posterOf = (item) => item.poster || (item.sources[0] && item.sources[0].previews[0] ? item.sources[0].previews[0].picture : '');

  // Player, transport, cover and messages, alike for everything that runs in time.
  // parts: [{source, kind, offset, leads}]; options: {content, extras(player, elements), chapters, cover}
  function timedStage(item, context, parts, options) {
    const elements = parts.map((part) => takeElement(part.kind));
    const wanted = context.memory.choice('grade', '');
    const grades = parts.map((part) => new Olive.Grades(part.source, wanted));
    const player = new Olive.Player(parts.map((part, i) => ({element: elements[i], grades: grades[i], offset: part.offset || 0, leads: part.leads})), item.duration);
    const content = options.content(elements, player);
    const under = [content].flat(2);
    const element = make('div', {class: 'stage ' + item.category.toLowerCase()}, under);
    const spinner = make('div', {class: 'spinner', 'aria-hidden': 'true', hidden: true});
    element.append(spinner);

    const choices = parts.reduce((best, part, i) => (part.kind === 'video' && grades[i].choices().length > best.length ? grades[i].choices() : best), []);
    const transport = Olive.makeTransport(player, {
      chapters: options.chapters || [],
      choices,
      grade: choices.some((choice) => choice.grade === wanted) ? wanted : '',
      onGrade(grade) {
        context.memory.choose('grade', grade);
        player.choose(grade, Olive.pixelsAcross(element));
      },
      extras: [options.extras ? options.extras(player, elements) : [], context.frameButtons(item, elements)].flat(),
      memory: context.memory,
    });

    // The cover lies over the stage until the first start.
    const saved = context.memory.place(item);
    const resumeAt = context.start.t === null && !saved.done && saved.time > 5 ? saved.time : 0;
    const startHere = (seconds) => {
      if (seconds !== null) player.seek(seconds);
      player.play();
      context.focus();
    };
    const poster = options.cover === false || context.start.t ? '' : posterOf(item);
    const bigButton = make('button', {type: 'button', class: 'big-play', onclick: () => startHere(resumeAt || null),
                                      'aria-label': resumeAt ? say('continueAt', {time: Olive.clock(resumeAt)}) : say('play')},
                           Olive.icon('play'), resumeAt ? make('span', {text: say('continueAt', {time: Olive.clock(resumeAt)})}) : null);
    const cover = make('div', {class: 'cover'},
      poster && Olive.picture(poster, {class: 'cover-picture', loading: 'eager'}),
      make('div', {class: 'cover-actions'}, bigButton,
           resumeAt > 0 && make('button', {type: 'button', class: 'quiet', text: say('startOver'), onclick: () => startHere(0)})));
    element.append(cover);
    under.forEach((node) => { node.inert = true; });
    cover.addEventListener('click', (event) => { if (event.target === cover || event.target.localName === 'img') startHere(resumeAt || null); });

    player.addEventListener('state', () => {
      if (player.isPlaying) {
        cover.remove();
        under.forEach((node) => { node.inert = false; });
        element.querySelectorAll('.blocked').forEach((node) => node.remove());
      }
      spinner.hidden = !player.isWaiting;
      element.classList.toggle('is-playing', player.isPlaying);
    });
    player.addEventListener('time', () => {  // who looks for a place before the start wants to see it
      if (player.time > 0 && cover.querySelector('.cover-picture')) cover.querySelector('.cover-picture').remove();
    });
    player.addEventListener('blocked', () => {
      element.append(make('div', {class: 'cover blocked'}, make('div', {class: 'cover-actions'},
        make('button', {type: 'button', class: 'big-play', 'aria-label': say('play'), onclick: () => startHere(null)}, Olive.icon('play')))));
    });

    function complain(stream) {
      const isAll = player.streams.every((each) => each.hasFailed);
      const message = makeMessage(say(isAll ? 'cannotPlay' : 'partMissing'), stream.grades.files[0], isAll ? context.again : null);
      if (isAll) {
        cover.querySelector('.cover-actions').replaceChildren();
        if (!cover.isConnected) element.append(cover);
        element.classList.add('failed');
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
      if (event.target.closest('button, a, .cover, .message, .small, .divider')) return;
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
  }

  // The voice that an author added to a movie: heard instead of the movie's own sound.
  function commentarySwitch(player) {
    const voice = player.streams[player.streams.length - 1], own = player.leader;
    player.enable(voice, false);
    const button = Olive.iconButton('voice', say('commentary'), () => {
      const isOn = player.leader !== voice;
      player.lead(isOn ? voice : own);
      if (!isOn) player.enable(voice, false);
      button.setAttribute('aria-pressed', isOn);
      Olive.announce(say(isOn ? 'commentaryOn' : 'commentaryOff'));
    }, {'aria-pressed': 'false'});
    return button;
  }

  function movieStage(item, context) {
    const parts = [{source: item.sources[0], kind: 'video', leads: true}];
    if (item.commentary) parts.push({source: item.commentary, kind: 'audio'});
    return timedStage(item, context, parts, {
      content: ([video]) => video,
      chapters: item.chapters,
      extras: (player) => (item.commentary ? [commentarySwitch(player)] : []),
    });
  }

  function audioStage(item, context) {
    const poster = posterOf(item);
    return timedStage(item, context, [{source: item.sources[0], kind: 'audio', leads: true}], {
      content: ([audio]) => [
        make('div', {class: 'record'},
          poster ? Olive.picture(poster, {loading: 'eager'}, () => Olive.icon('Audio')) : Olive.icon('Audio')),
        audio],
      cover: false,
    });
  }

  const kViews = ['side', 'corner', 'first', 'second'];

  function dualStage(item, context) {
    const [first, second] = item.sources;
    if (!second) return movieStage(item, context);
    const timed = (source) => source.category === 'Movie' || source.category === 'Audio';
    const kind = (source) => (source.category === 'Audio' ? 'audio' : 'video');
    const sources = [first, second].filter(timed);
    if (!sources.length) return pictureStage({...item, category: 'Image'}, context);
    const leader = sources.find((source) => source.hasSound) || sources[0];
    const parts = sources.map((source) => ({source, kind: kind(source), offset: source.start || 0, leads: source === leader}));
    let panes, player, view;

    function still(source) {
      const pictures = source.previews;
      const image = make('img', {alt: '', draggable: 'false', src: pictures[0] ? pictures[0].picture : undefined});
      return {image, follow(time) {
        const current = pictures.filter((preview) => preview.start !== null && preview.start <= time).pop() || pictures[0];
        if (current && image.getAttribute('src') !== current.picture) image.src = current.picture;
      }};
    }

    function content(elements, made) {
      player = made;
      const stills = [];
      panes = [first, second].map((source, i) => {
        const at = sources.indexOf(source);
        if (at < 0) stills.push(still(source));
        return make('div', {class: 'pane', 'data-source': i + 1}, at < 0 ? stills[stills.length - 1].image : elements[at]);
      });
      player.addEventListener('time', () => stills.forEach((each) => each.follow(player.time)));
      const divider = makeDivider();
      const box = make('div', {class: 'dual'}, panes[0], divider, panes[1]);
      view = makeView(box);
      for (const pane of panes) {
        pane.addEventListener('click', (event) => {
          if (!pane.classList.contains('small')) return;
          event.stopPropagation();
          view.swap();
        });
      }
      return box;
    }

    function makeDivider() {
      const divider = make('div', {class: 'divider', role: 'separator', tabindex: 0, 'aria-orientation': 'vertical', 'aria-label': say('divider'), 'aria-valuemin': 20, 'aria-valuemax': 80});
      const set = (percent) => {
        const value = Math.round(clamp(percent, 20, 80));
        divider.setAttribute('aria-valuenow', value);
        divider.parentNode && divider.parentNode.style.setProperty('--split', value + '%');
        context.memory.choose('split', value);
        divider.value = value;
      };
      queueMicrotask(() => set(context.memory.choice('split', 50)));
      divider.addEventListener('keydown', (event) => {
        const step = {ArrowLeft: -5, ArrowRight: 5, ArrowUp: -5, ArrowDown: 5}[event.key];
        if (step) set(divider.value + step);
        else if (event.key === 'Home') set(20);
        else if (event.key === 'End') set(80);
        else return;
        event.preventDefault();
        event.stopPropagation();
      });
      divider.addEventListener('pointerdown', (event) => {
        event.preventDefault();
        divider.setPointerCapture(event.pointerId);
        const box = divider.parentNode.getBoundingClientRect();
        const move = (moved) => set((moved.clientX - box.left) / box.width * 100);
        divider.addEventListener('pointermove', move);
        divider.addEventListener('lostpointercapture', () => divider.removeEventListener('pointermove', move), {once: true});
      });
      divider.addEventListener('dblclick', () => set(50));
      return divider;
    }

    function makeView(box) {
      let name = 'side', isSwapped = false;
      const made = {
        get value() { return name + (isSwapped ? '.swapped' : ''); },
        set(value) {
          const [base, swapped] = String(value).split('.');
          name = kViews.includes(base) ? base : 'side';
          isSwapped = swapped === 'swapped';
          box.dataset.view = name;
          box.dataset.swapped = isSwapped;
          const small = name === 'corner' ? panes[isSwapped ? 0 : 1] : null;
          for (const pane of panes) pane.classList.toggle('small', pane === small);
          const hidden = {first: panes[isSwapped ? 0 : 1], second: panes[isSwapped ? 1 : 0]}[name];
          for (const pane of panes) {
            pane.hidden = pane === hidden;
            const stream = player.streams.find((each) => pane.contains(each.element));
            if (stream) player.enable(stream, pane !== hidden);
          }
          box.querySelector('.divider').hidden = name !== 'side';
          made.buttons && made.buttons.forEach((button) => button.setAttribute('aria-pressed', button.dataset.view === name));
          context.memory.choose('view', made.value);
          context.note();
        },
        swap() {
          made.set(name + (isSwapped ? '' : '.swapped'));
          Olive.announce(say('swapped'));
        },
      };
      return made;
    }

    const stage = timedStage(item, context, parts, {
      content,
      chapters: item.chapters,
      extras: () => {
        view.buttons = kViews.map((name) => Olive.iconButton(name, say('view-' + name), () => view.set(name + (view.value.endsWith('.swapped') ? '.swapped' : '')), {'data-view': name, 'aria-pressed': 'false'}));
        return [make('div', {class: 'views', role: 'group', 'aria-label': say('views')}, view.buttons,
                     Olive.iconButton('swap', say('swap'), () => view.swap()))];
      },
    });
    stage.view = view;
    view.set(context.start.view || context.memory.choice('view', 'side'));
    return stage;
  }

  const pictureFile = (source, width) => {
    const grades = new Olive.Grades({files: source.files.filter(Olive.isPicture)}, '');
    return grades.pick(width);
  };
  const largestPicture = (source) => pictureFile(source, Infinity);

  // The address that shows a still at this width: a file that the browser can draw, else the preview.
  function stillAddress(source, width) {
    const file = pictureFile(source, width);
    return file ? file.address : source.previews[0] ? source.previews[0].picture : '';
  }

  function montageStage(item, context) {
    const voice = item.commentary;
    const parts = voice ? [{source: voice, kind: 'audio', leads: true}] : [];
    const stills = item.chapters;
    const images = [make('img', {alt: '', draggable: 'false'}), make('img', {alt: '', draggable: 'false'})];
    const caption = make('p', {class: 'caption', dir: 'auto'});
    const preload = new Image();
    let shown = -1, front = 0, player;

    const indexAt = (time) => Math.max(0, stills.filter((still) => still.start <= time + 0.01).length - 1);
    const address = (index) => stillAddress(stills[index].source, Olive.pixelsAcross(images[0].parentNode || document.body));
    function follow() {
      const index = indexAt(player.time);
      if (index === shown || !stills.length) return;
      shown = index;
      front = 1 - front;
      const image = images[front];
      image.alt = stills[index].title;
      image.src = address(index);
      image.classList.add('front');
      images[1 - front].classList.remove('front');
      images[1 - front].alt = '';
      caption.textContent = stills[index].source.title;
      if (stills[index + 1]) preload.src = address(index + 1);
    }
    const stage = timedStage(item, context, parts, {
      content: (elements, made) => {
        player = made;
        player.addEventListener('time', follow);
        images.forEach((image) => image.addEventListener('error', () => {
          const spare = stills[shown] && stills[shown].picture;
          if (spare && !image.src.endsWith(spare)) image.src = spare;
          else if (image === images[front]) caption.textContent = say('cannotShow');
        }));
        return [make('div', {class: 'stills'}, images), caption, elements];
      },
      chapters: stills,
      cover: false,
    });
    queueMicrotask(follow);
    return stage;
  }

  // A voice over pictures that stand still by themselves: the author's commentary on an image or a document.
  function voiceOver(item, context, stage, onTime) {
    if (!item.commentary) return stage;
    const spoken = timedStage({...item, duration: 0, category: 'Voice'}, context, [{source: item.commentary, kind: 'audio', leads: true}],
                              {content: (elements) => elements, cover: false});
    spoken.player.addEventListener('time', () => onTime(spoken.player));
    stage.player = spoken.player;
    stage.transport = spoken.transport;
    stage.controls.prepend(spoken.controls);
    stage.element.append(spoken.element.querySelector('.spinner'), ...spoken.elements);
    const closePictures = stage.close;
    stage.close = () => {
      closePictures();
      spoken.close();
    };
    return stage;
  }

  function pictureStage(item, context) {
    const source = item.sources[0];
    const sheet = Olive.makeSheet();
    const element = make('div', {class: 'stage image'}, sheet.element);
    const spare = source.previews[0] ? source.previews[0].picture : '';
    const complain = () => element.append(makeMessage(say('cannotShow'), bestFile(item), context.again));
    const stage = {
      element,
      sheet,
      controls: make('div', {class: 'controls'}, make('div', {class: 'buttons'}, sheet.tools, make('span', {class: 'gap'}),
        item.commentary ? [] : context.frameButtons(item, []))),
      player: null,
      close: sheet.close,
    };
    queueMicrotask(() => {
      const file = pictureFile(source, Olive.pixelsAcross(element)), larger = largestPicture(source);
      const label = item.description || item.title;
      sheet.onFail = () => {
        sheet.onFail = complain;
        if (spare && file) sheet.show(spare, {label});
        else complain();
      };
      if (!file && !spare) return complain();
      sheet.show(file ? file.address : spare, {label, width: file && file.width, height: file && file.height,
                                              larger: larger && larger !== file ? larger.address : ''});
      context.memory.keep(item, {done: true});
    });
    return voiceOver(item, context, stage, () => {});
  }

  function documentStage(item, context) {
    const pages = item.pages;
    const sheet = Olive.makeSheet();
    const element = make('div', {class: 'stage document'}, sheet.element);
    const file = bestFile(item);
    const words = make('section', {class: 'page-text', hidden: true, tabindex: 0, 'aria-label': say('pageText')});
    const number = make('input', {type: 'text', inputmode: 'numeric', class: 'page-number', 'aria-label': say('pageNumber'),
                                  onchange: () => pager.go(Math.round(Number(number.value)) - 1 || 0), onfocus: () => number.select()});
    const textButton = Olive.iconButton('text', say('pageText'), () => {
      showText(words.hidden);
      context.memory.choose('pageText', !words.hidden);
    }, {'aria-pressed': 'false'});
    const previous = Olive.iconButton('left', say('previousPage'), () => pager.go(pager.index - 1));
    const next = Olive.iconButton('right', say('nextPage'), () => pager.go(pager.index + 1));

    function showText(isShown) {
      words.hidden = !isShown;
      textButton.setAttribute('aria-pressed', isShown);
    }

    const pager = {
      count: pages.length,
      index: -1,
      go(index) {
        const target = clamp(index, 0, pages.length - 1);
        number.value = target + 1;
        if (target === pager.index) return;
        pager.index = target;
        const page = pages[target];
        sheet.onFail = () => element.append(makeMessage(say('cannotShow'), file, context.again));
        element.querySelectorAll('.message').forEach((node) => node.remove());
        sheet.show(page.picture, {label: say('pageOf', {page: target + 1, pages: pages.length}), width: page.width, height: page.height});
        words.replaceChildren(...(page.text ? page.text.split(/\n{2,}/).map((part) => make('p', {dir: 'auto'}, Olive.highlighted(part, context.terms(), true)))
                                            : [make('p', {text: say('noText')})]));
        previous.disabled = target === 0;
        next.disabled = target === pages.length - 1;
        if (pages[target + 1]) new Image().src = pages[target + 1].picture;
        context.memory.keep(item, {page: target, share: (target + 1) / pages.length, ...(target === pages.length - 1 ? {done: true} : {})});
        context.note();
        context.onPage(target);
      },
    };

    const stage = {
      element: make('div', {class: 'reader'}, element, words),
      sheet,
      controls: make('div', {class: 'controls'}, make('div', {class: 'buttons'},
        make('div', {class: 'tools', role: 'group', 'aria-label': say('pages')}, previous, number,
             make('span', {class: 'count', text: '/ ' + pages.length}), next),
        sheet.tools, pages.some((page) => page.text) && textButton, make('span', {class: 'gap'}),
        file && make('a', {class: 'icon-button', href: file.address, target: '_blank', rel: 'noopener', 'aria-label': say('openFile'), title: say('openFile')}, Olive.icon('open')),
        item.commentary ? [] : context.frameButtons(item, []))),
      player: null,
      pager: pages.length ? pager : null,
      close: sheet.close,
    };
    if (!pages.length) element.append(makeMessage(say('noPages'), file, null));
    else {
      showText(context.memory.choice('pageText', false));
      queueMicrotask(() => pager.go(context.start.page === null ? context.memory.place(item).page || 0 : context.start.page - 1));
    }
    return voiceOver(item, context, stage, (player) => {
      if (!player.isPlaying) return;
      const current = pages.filter((page) => page.start !== null && page.start <= player.time);
      if (current.length) pager.go(pages.indexOf(current[current.length - 1]));
    });
  }

  function webStage(item, context) {
    const address = item.link;
    const element = make('div', {class: 'stage web'},
      make('div', {class: 'web-card'},
        Olive.icon('Web'),
        make('p', {class: 'web-title', dir: 'auto', text: item.title}),
        address && make('p', {class: 'web-address', dir: 'ltr', text: address.replace(/^https?:\/\//, '').replace(/\/$/, '')}),
        address ? make('a', {class: 'primary', href: address, target: '_blank', rel: 'noopener noreferrer', onclick: () => context.memory.keep(item, {done: true})},
                       say('openLink'), Olive.icon('open'))
                : make('p', {text: say('badLink')}),
        address && make('p', {class: 'badge', text: say('needsInternet')})));
    return {element, controls: null, player: null, close() {}};
  }

  function emptyStage(item, context) {
    return {element: make('div', {class: 'stage'}, makeMessage(say('nothingToShow'), bestFile(item), null)), controls: null, player: null, close() {}};
  }

  const kStages = {Movie: movieStage, Audio: audioStage, Image: pictureStage, Document: documentStage, Web: webStage, Montage: montageStage, DualSource: dualStage};

  // context: {memory, start: {t, page, view, play}, frameButtons(item, elements), note(), focus(), again(), terms(), onPage(index)}
  Olive.makeStage = function (item, context) {
    const make = item.sources.length ? kStages[item.category] : null;
    return (make || emptyStage)(item, context);
  };
})(window.Olive);
