// SPDX-License-Identifier: Apache-2.0
// Pictures: a montage of stills, an image, the pages of a document; and a voice over those that stand still.
'use strict';

((Olive) => {
  const {make, say, clamp} = Olive;

  const pictureFile = (source, width) => {
    const grades = new Olive.Grades({files: source.files.filter(Olive.isPicture)}, '');
    return grades.pick(width);
  };
  const largestPicture = (source) => pictureFile(source, Number.POSITIVE_INFINITY);

  // The address that shows a still at this width: a file that the browser can draw, else the preview.
  function stillAddress(source, width) {
    const file = pictureFile(source, width);
    return file ? file.address : source.previews[0] ? source.previews[0].picture : '';
  }

  Olive.stages.Montage = (item, context) => {
    const voice = item.commentary;
    const parts = voice ? [{source: voice, kind: 'audio', leads: true}] : [];
    const stills = item.chapters;
    const images = [make('img', {alt: '', draggable: 'false'}), make('img', {alt: '', draggable: 'false'})];
    const caption = make('p', {class: 'caption', dir: 'auto'});
    const preload = new Image();
    let shown = -1,
      front = 0,
      player;

    const indexAt = (time) => Math.max(0, stills.filter((still) => still.start <= time + 0.01).length - 1);
    const address = (index) =>
      stillAddress(stills[index].source, Olive.pixelsAcross(images[0].parentNode || document.body));
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
      caption.dataset.captionOf = stills[index].source.id;
      if (stills[index + 1]) preload.src = address(index + 1);
    }
    const stage = Olive.timedStage(item, context, parts, {
      content: (elements, made) => {
        player = made;
        player.addEventListener('time', follow);
        images.forEach((image) =>
          image.addEventListener('error', () => {
            const spare = stills[shown]?.picture;
            if (spare && !image.src.endsWith(spare)) image.src = spare;
            else if (image === images[front]) caption.textContent = say('cannotShow');
          }),
        );
        return [make('div', {class: 'stills'}, images), caption, elements];
      },
      chapters: stills,
      cover: false,
    });
    queueMicrotask(follow);
    return stage;
  };

  // A voice over pictures that stand still by themselves: the author's commentary on an image or a document.
  function voiceOver(item, context, stage, onTime) {
    if (!item.commentary) return stage;
    const spoken = Olive.timedStage(
      {...item, duration: 0},
      context,
      [{source: item.commentary, kind: 'audio', leads: true}],
      {content: (elements) => elements, host: stage.element.querySelector('.sheet').parentNode},
    );
    spoken.player.addEventListener('time', () => onTime(spoken.player));
    stage.player = spoken.player;
    stage.transport = spoken.transport;
    stage.controls.prepend(spoken.controls);
    const closePictures = stage.close;
    stage.close = () => {
      closePictures();
      spoken.close();
    };
    return stage;
  }

  Olive.stages.Image = (item, context) => {
    const source = item.sources[0];
    const sheet = Olive.makeSheet();
    const element = make('div', {class: 'stage image'}, sheet.element);
    const spare = source.previews[0] ? source.previews[0].picture : '';
    const complain = () => element.append(Olive.makeMessage(say('cannotShow'), Olive.bestFile(item), context.again));
    const stage = {
      element,
      sheet,
      controls: make(
        'div',
        {class: 'controls'},
        make(
          'div',
          {class: 'buttons'},
          sheet.tools,
          make('span', {class: 'gap'}),
          item.commentary ? [] : context.frameButtons([]),
        ),
      ),
      player: null,
      close: sheet.close,
    };
    queueMicrotask(() => {
      const file = pictureFile(source, Olive.pixelsAcross(element)),
        larger = largestPicture(source);
      const label = item.description || item.title;
      sheet.onFail = () => {
        sheet.onFail = complain;
        if (spare && file) sheet.show(spare, {label});
        else complain();
      };
      if (!file && !spare) return complain();
      sheet.show(file ? file.address : spare, {
        label,
        width: file?.width,
        height: file?.height,
        larger: larger && larger !== file ? larger.address : '',
      });
      context.memory.keep(item, {done: true});
    });
    return voiceOver(item, context, stage, () => {});
  };

  Olive.stages.Document = (item, context) => {
    const pages = item.pages;
    const sheet = Olive.makeSheet();
    const element = make('div', {class: 'stage document'}, sheet.element);
    const file = Olive.bestFile(item);
    const words = make('section', {class: 'page-text', hidden: true, tabindex: 0, 'aria-label': say('pageText')});
    const number = make('input', {
      type: 'text',
      inputmode: 'numeric',
      class: 'page-number',
      'aria-label': say('pageNumber'),
      onchange: () => pager.go(Math.round(Number(number.value)) - 1 || 0),
      onfocus: () => number.select(),
    });
    const textButton = Olive.iconButton(
      'text',
      say('pageText'),
      () => {
        showText(words.hidden);
        context.memory.choose('pageText', !words.hidden);
      },
      {'aria-pressed': 'false'},
    );
    const previous = Olive.iconButton('left', say('previousPage'), () => pager.go(pager.index - 1));
    const next = Olive.iconButton('right', say('nextPage'), () => pager.go(pager.index + 1));

    function showText(isShown) {
      words.hidden = !isShown;
      textButton.setAttribute('aria-pressed', isShown);
    }
    const hasText = pages.some((page) => page.text);

    const pager = {
      count: pages.length,
      index: -1,
      go(index) {
        const target = clamp(index, 0, pages.length - 1);
        number.value = target + 1;
        if (target === pager.index) return;
        pager.index = target;
        const page = pages[target];
        sheet.onFail = () => element.append(Olive.makeMessage(say('cannotShow'), file, context.again));
        element.querySelectorAll('.message').forEach((node) => node.remove());
        sheet.show(page.picture, {
          label: say('pageOf', {page: target + 1, pages: pages.length}),
          width: page.width,
          height: page.height,
        });
        words.replaceChildren(
          ...(page.text
            ? page.text
                .split(/\n{2,}/)
                .map((part) => make('p', {dir: 'auto'}, Olive.highlighted(part, context.terms(), true)))
            : [make('p', {text: say('noText')})]),
        );
        previous.disabled = target === 0;
        next.disabled = target === pages.length - 1;
        if (pages[target + 1]) new Image().src = pages[target + 1].picture;
        context.memory.keep(item, {
          page: target,
          share: (target + 1) / pages.length,
          ...(target === pages.length - 1 ? {done: true} : {}),
        });
        context.note();
        context.onPage(target);
      },
    };

    const stage = {
      element: make('div', {class: 'reader'}, element, words),
      sheet,
      controls: make(
        'div',
        {class: 'controls'},
        make(
          'div',
          {class: 'buttons'},
          make(
            'div',
            {class: 'tools', role: 'group', 'aria-label': say('pages')},
            previous,
            number,
            make('span', {class: 'count', text: '/ ' + pages.length}),
            next,
          ),
          sheet.tools,
          hasText && textButton,
          make('span', {class: 'gap'}),
          file &&
            make(
              'a',
              {
                class: 'icon-button',
                href: file.address,
                target: '_blank',
                rel: 'noopener',
                'aria-label': say('openFile'),
                title: say('openFile'),
              },
              Olive.icon('open'),
            ),
          item.commentary ? [] : context.frameButtons([]),
        ),
      ),
      player: null,
      pager: pages.length ? pager : null,
      toggleText: () => hasText && textButton.click(),
      close: sheet.close,
    };
    if (!pages.length) element.append(Olive.makeMessage(say('noPages'), file, null));
    else {
      showText(context.memory.choice('pageText', false));
      queueMicrotask(() =>
        pager.go(context.start.page === null ? context.memory.place(item).page || 0 : context.start.page - 1),
      );
    }
    return voiceOver(item, context, stage, (player) => {
      if (!player.isPlaying) return;
      const current = pages.filter((page) => page.start !== null && page.start <= player.time);
      if (current.length) pager.go(pages.indexOf(current[current.length - 1]));
    });
  };
})(window.Olive);
