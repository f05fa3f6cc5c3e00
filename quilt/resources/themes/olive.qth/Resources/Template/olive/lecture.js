// SPDX-License-Identifier: Apache-2.0
// Two sources shown together: side by side, one in the corner of the other, or one alone.
'use strict';

((Olive) => {
  const {make, say, clamp} = Olive;

  const kViews = ['side', 'corner', 'first', 'second'];

  Olive.stages.DualSource = (item, context) => {
    const [first, second] = item.sources;
    if (!second) return Olive.stages.Movie(item, context);
    const timed = (source) => source.category === 'Movie' || source.category === 'Audio';
    const kind = (source) => (source.category === 'Audio' ? 'audio' : 'video');
    const sources = [first, second].filter(timed);
    if (!sources.length) return Olive.stages.Image(item, context);
    const leader = sources.find((source) => source.hasSound) || sources[0];
    const parts = sources.map((source) => ({
      source,
      kind: kind(source),
      offset: source.start || 0,
      leads: source === leader,
    }));
    let panes, player, view;

    function still(source) {
      const pictures = source.previews;
      const image = make('img', {alt: '', draggable: 'false', src: pictures[0] ? pictures[0].picture : undefined});
      return {
        image,
        follow(time) {
          const current =
            pictures.filter((preview) => preview.start !== null && preview.start <= time).pop() || pictures[0];
          if (current && image.getAttribute('src') !== current.picture) image.src = current.picture;
        },
      };
    }

    function content(elements, made) {
      player = made;
      const stills = [];
      panes = [first, second].map((source, i) => {
        const at = sources.indexOf(source);
        if (at < 0) stills.push(still(source));
        return make(
          'div',
          {class: 'pane', 'data-source': i + 1},
          at < 0 ? stills[stills.length - 1].image : elements[at],
        );
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
      const divider = make('div', {
        class: 'divider',
        role: 'separator',
        tabindex: 0,
        'aria-orientation': 'vertical',
        'aria-label': say('divider'),
        'aria-valuemin': 20,
        'aria-valuemax': 80,
      });
      const set = (percent) => {
        const value = Math.round(clamp(percent, 20, 80));
        divider.setAttribute('aria-valuenow', value);
        divider.parentNode?.style.setProperty('--split', value + '%');
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
        const move = (moved) => set(((moved.clientX - box.left) / box.width) * 100);
        divider.addEventListener('pointermove', move);
        divider.addEventListener('lostpointercapture', () => divider.removeEventListener('pointermove', move), {
          once: true,
        });
      });
      divider.addEventListener('dblclick', () => set(50));
      return divider;
    }

    function makeView(box) {
      let name = 'side',
        isSwapped = false;
      const made = {
        get value() {
          return name + (isSwapped ? '.swapped' : '');
        },
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
          made.buttons?.forEach((button) => button.setAttribute('aria-pressed', button.dataset.view === name));
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

    const stage = Olive.timedStage(item, context, parts, {
      content,
      chapters: item.chapters,
      extras: () => {
        view.buttons = kViews.map((name) =>
          Olive.iconButton(
            name,
            say('view-' + name),
            () => view.set(name + (view.value.endsWith('.swapped') ? '.swapped' : '')),
            {'data-view': name, 'aria-pressed': 'false'},
          ),
        );
        return [
          make(
            'div',
            {class: 'views', role: 'group', 'aria-label': say('views')},
            view.buttons,
            Olive.iconButton('swap', say('swap'), () => view.swap()),
          ),
        ];
      },
    });
    stage.view = view;
    view.set(context.start.view || context.memory.choice('view', 'side'));
    return stage;
  };
})(window.Olive);
