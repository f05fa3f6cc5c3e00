// SPDX-License-Identifier: Apache-2.0
// The items of the package, as cards on the opening page and as rows beside the stage; the chapters and pages of one.
'use strict';

((Olive) => {
  const {make, say} = Olive;

  const subtitle = (item) =>
    item.duration ? Olive.clock(item.duration) : item.pages.length ? say('pageCount', {n: item.pages.length}) : '';

  function thumbnail(item, memory) {
    const place = memory.place(item);
    const bar = !place.done && place.share > 0.01 && make('span', {class: 'seen-bar'});
    if (bar) bar.style.setProperty('--done', Math.min(100, place.share * 100) + '%');
    return make(
      'span',
      {class: 'thumb ' + item.category.toLowerCase()},
      item.poster
        ? Olive.picture(item.poster, {}, () => Olive.icon(item.category || 'warning'))
        : Olive.icon(item.category || 'warning'),
      item.duration > 0 && make('span', {class: 'length', text: Olive.clock(item.duration)}),
      place.done &&
        make(
          'span',
          {class: 'tick', title: say('seen')},
          Olive.icon('check'),
          make('span', {class: 'unseen', text: say('seen')}),
        ),
      bar,
    );
  }

  const kindOf = (item) => (item.category ? say('category-' + item.category) : '');
  Olive.kindOf = kindOf;

  function meta(item) {
    const parts = [
      kindOf(item),
      item.category === 'Web' ? say('needsInternet') : item.pages.length ? subtitle(item) : '',
    ].filter(Boolean);
    return make('span', {class: 'meta'}, Olive.icon(item.category || 'warning'), parts.join(' · '));
  }

  // The browser draws the entries of a long list only when they come into sight.
  const kLong = 60;
  const listClass = (name, entries) => (entries.length > kLong ? name + ' long' : name);

  // The words come before the picture, so that the name of a link begins with the title; styles put the picture first.
  Olive.makeCards = (items, memory) =>
    make(
      'ul',
      {class: listClass('cards', items)},
      items.map((item) =>
        make(
          'li',
          {class: 'card', 'data-category': item.category, 'data-id': item.id},
          make(
            'a',
            {href: Olive.address.to({item: item.id})},
            make(
              'span',
              {class: 'card-text'},
              make('span', {class: 'card-title', dir: 'auto', 'data-title-of': item.id, text: item.title}),
              meta(item),
            ),
            thumbnail(item, memory),
          ),
        ),
      ),
    );

  Olive.makeContents = (items, current, memory) =>
    make(
      'ol',
      {class: listClass('rows', items)},
      items.map((item) =>
        make(
          'li',
          null,
          make(
            'a',
            {
              class: 'row',
              href: Olive.address.to({item: item.id}),
              'aria-current': item === current ? 'true' : null,
            },
            make(
              'span',
              {class: 'row-text'},
              make('span', {class: 'row-title', dir: 'auto', 'data-title-of': item.id, text: item.title}),
              meta(item),
            ),
            thumbnail(item, memory),
          ),
        ),
      ),
    );

  // Scrolls the list, and only the list, so that the entry is seen. Entries that were never drawn have estimated heights,
  // so it looks again once they are.
  Olive.reveal = (entry) => {
    const box = entry?.closest('.panel');
    if (!box) return;
    const scroll = () => {
      const [inner, outer] = [entry.getBoundingClientRect(), box.getBoundingClientRect()];
      if (inner.height && (inner.top < outer.top || inner.bottom > outer.bottom))
        box.scrollBy({top: inner.top - outer.top - outer.height / 3, behavior: 'instant'});
    };
    scroll();
    requestAnimationFrame(() => requestAnimationFrame(scroll));
  };

  // Chapters with their pictures; follow(time) marks the one that runs.
  Olive.makeChapters = (chapters, onChoice) => {
    const buttons = chapters.map((chapter) =>
      make(
        'button',
        {type: 'button', class: 'row', onclick: () => onChoice(chapter.start)},
        make('span', {class: 'thumb'}, chapter.picture ? Olive.picture(chapter.picture) : null),
        make(
          'span',
          {class: 'row-text'},
          make('span', {
            class: 'row-title',
            dir: 'auto',
            'data-title-of': chapter.source ? chapter.source.id : null,
            text: chapter.title,
          }),
          make('span', {class: 'meta', text: Olive.clock(chapter.start)}),
        ),
      ),
    );
    let marked = -1;
    return {
      element: make(
        'ol',
        {class: listClass('rows', buttons)},
        buttons.map((button) => make('li', null, button)),
      ),
      follow(time) {
        const index = chapters.filter((chapter) => chapter.start <= time + 0.05).length - 1;
        if (index === marked) return;
        if (buttons[marked]) buttons[marked].removeAttribute('aria-current');
        if (buttons[index]) {
          buttons[index].setAttribute('aria-current', 'true');
          Olive.reveal(buttons[index]);
        }
        marked = index;
      },
    };
  };

  Olive.makePages = (pages, onChoice) => {
    const buttons = pages.map((page, i) =>
      make(
        'button',
        {
          type: 'button',
          class: 'page',
          title: page.title,
          onclick: () => onChoice(i),
          'aria-label': say('page', {n: i + 1}) + (page.title ? ': ' + page.title : ''),
        },
        Olive.picture(
          page.picture,
          page.width && page.height ? {width: Math.round(page.width), height: Math.round(page.height)} : {},
        ),
        make('span', {text: i + 1}),
      ),
    );
    let marked = -1;
    return {
      element: make(
        'ol',
        {class: listClass('pages', buttons)},
        buttons.map((button) => make('li', null, button)),
      ),
      follow(index) {
        if (buttons[marked]) buttons[marked].removeAttribute('aria-current');
        marked = index;
        buttons[index].setAttribute('aria-current', 'true');
        Olive.reveal(buttons[index]);
      },
    };
  };

  Olive.titleOfPart = (part) => part.title || kindOf({category: part.category}) || say('file');

  // A title as a file name: without what file systems refuse and without what turns the direction of writing.
  const safeName = (title) =>
    title.replace(/[\u200e\u200f\u202a-\u202e\u2066-\u2069]/g, '').replace(/[\\/:*?"<>|]/g, '_');

  Olive.makeExtras = (extras) =>
    make(
      'ul',
      {class: 'extras'},
      extras.map((extra) => {
        const file = extra.files[0];
        const address = file && (file.address || file.link);
        if (!address) return null;
        const ending = (/\.(\w{1,5})$/.exec(file.name) || [])[1] || '';
        const title = Olive.titleOfPart(extra);
        const size = file.megaBytes > 0 ? Olive.fileSize(file.megaBytes) : '';
        return make(
          'li',
          {'data-id': extra.id},
          make(
            'a',
            {
              class: 'extra',
              href: address,
              target: '_blank',
              rel: 'noopener noreferrer',
              download: file.address ? safeName(title) + (ending ? '.' + ending : '') : null,
            },
            Olive.icon(file.address ? 'download' : 'open'),
            make(
              'span',
              {class: 'row-text'},
              make('span', {class: 'row-title', dir: 'auto', 'data-title-of': extra.id, text: title}),
              make('span', {
                class: 'meta',
                text: file.address ? [ending.toUpperCase(), size].filter(Boolean).join(' · ') : say('needsInternet'),
              }),
            ),
          ),
        );
      }),
    );
})(window.Olive);
