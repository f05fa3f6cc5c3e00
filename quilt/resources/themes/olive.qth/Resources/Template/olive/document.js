// SPDX-License-Identifier: Apache-2.0
// The pages of a document, one at a time, with their text beside them.
'use strict';

((Olive) => {
  const {make, say, clamp} = Olive;

  function makeWords() {
    return make('section', {class: 'page-text', hidden: true, tabindex: 0, 'aria-label': say('pageText')});
  }

  function showWords(words, page, terms) {
    const parts = page.text ? page.text.split(/\n{2,}/) : [];
    const paragraphs = parts.map((part) => make('p', {dir: 'auto'}, Olive.highlighted(part, terms, true)));
    words.replaceChildren(...(parts.length ? paragraphs : [make('p', {text: say('noText')})]));
  }

  const openAction = (file) => ({
    icon: 'open',
    label: say('openFile'),
    act: () => window.open(file.address, '_blank', 'noopener'),
  });

  // The controls that turn pages: {element, update(index)}.
  function makeTurner(count, go) {
    let now = 0;
    const number = make('input', {
      type: 'text',
      inputmode: 'numeric',
      class: 'page-number',
      'aria-label': say('pageNumber'),
      onchange: () => go(Math.round(Number(number.value)) - 1 || 0),
      onfocus: () => number.select(),
    });
    const previous = Olive.iconButton('left', say('previousPage'), () => go(now - 1));
    const next = Olive.iconButton('right', say('nextPage'), () => go(now + 1));
    return {
      element: make(
        'div',
        {class: 'tools', role: 'group', 'aria-label': say('pages')},
        previous,
        number,
        make('span', {class: 'count', text: '/ ' + count}),
        next,
      ),
      update(index) {
        now = index;
        number.value = index + 1;
        previous.disabled = index === 0;
        next.disabled = index === count - 1;
      },
    };
  }

  function makePager(item, context, {sheet, element, words}) {
    const {pages} = item;
    const pager = {
      count: pages.length,
      index: -1,
      turner: makeTurner(pages.length, (index) => pager.go(index)),
      go(index) {
        const target = clamp(index, 0, pages.length - 1),
          page = pages[target];
        pager.turner.update(target);
        if (target === pager.index) return;
        pager.index = target;
        sheet.onFail = () => {
          element.append(Olive.makeMessage(say('cannotShow'), Olive.bestFile(item), context.again));
        };
        for (const node of element.querySelectorAll('.message')) node.remove();
        const label = say('pageOf', {page: target + 1, pages: pages.length});
        sheet.show(page.picture, {label, width: page.width, height: page.height});
        showWords(words, page, context.terms());
        if (pages[target + 1]) new Image().src = pages[target + 1].picture;
        const isLast = target === pages.length - 1;
        context.memory.keep(item, {page: target, share: (target + 1) / pages.length, ...(isLast ? {done: true} : {})});
        context.note();
        context.onPage(target);
      },
    };
    return pager;
  }

  Olive.stages.Document = (item, context) => {
    const {pages} = item,
      {memory} = context;
    const sheet = Olive.makeSheet(),
      words = makeWords(),
      file = Olive.bestFile(item);
    const element = make('div', {class: 'stage document'}, sheet.element);
    const pager = makePager(item, context, {sheet, element, words});
    const hasText = pages.some((page) => page.text);
    const showText = (isShown) => {
      words.hidden = !isShown;
      textButton.setAttribute('aria-pressed', isShown);
    };
    const toggleText = () => {
      showText(words.hidden);
      memory.choose('pageText', !words.hidden);
    };
    const textButton = Olive.iconButton('text', say('pageText'), toggleText, {'aria-pressed': 'false'});
    const open =
      file &&
      make(
        'a',
        {
          class: 'icon-button open-file',
          href: file.address,
          target: '_blank',
          rel: 'noopener',
          'aria-label': say('openFile'),
          title: say('openFile'),
        },
        Olive.icon('open'),
      );
    const stage = {
      element: make('div', {class: 'reader'}, element, words),
      sheet,
      controls: make(
        'div',
        {class: 'controls'},
        make(
          'div',
          {class: 'buttons'},
          pager.turner.element,
          sheet.tools,
          hasText && textButton,
          make('span', {class: 'gap'}),
          open,
          item.commentary ? [] : context.frameMenu(file ? [openAction(file)] : []),
        ),
      ),
      player: null,
      pager: pages.length ? pager : null,
      toggleText: () => hasText && toggleText(),
      close: sheet.close,
    };
    if (pages.length) {
      showText(memory.choice('pageText', false));
      const {page} = context.start;
      queueMicrotask(() => pager.go(page === null ? memory.place(item).page || 0 : page - 1));
    } else {
      element.append(Olive.makeMessage(say('noPages'), file, null));
    }
    context.listenToGestures(element, stage);
    return Olive.voiceOver(item, context, stage, (player) => {
      if (!player.isPlaying) return;
      const current = pages.filter((each) => each.start !== null && each.start <= player.time).pop();
      if (current) pager.go(pages.indexOf(current));
    });
  };
})(window.Olive);
