// SPDX-License-Identifier: Apache-2.0
// What is printed instead of the page: the package's contents with posters, descriptions, chapters, page texts, links.
'use strict';

((Olive) => {
  const {make, say} = Olive;
  let paper = null;

  function printedItem(item) {
    return make(
      'section',
      {class: 'printed-item'},
      make('h2', {dir: 'auto', text: item.title}),
      make('p', {
        class: 'meta',
        text: [
          Olive.kindOf(item),
          item.duration ? Olive.clock(item.duration) : '',
          item.pages.length ? say('pageCount', {n: item.pages.length}) : '',
        ]
          .filter(Boolean)
          .join(' · '),
      }),
      item.poster && Olive.picture(item.poster, {loading: 'eager', class: 'printed-poster'}),
      Olive.paragraphs(item.description),
      item.link && make('p', null, Olive.outsideLink(item.link, item.link)),
      item.chapters.length > 0 &&
        make(
          'table',
          null,
          make(
            'tbody',
            null,
            item.chapters.map((chapter) =>
              make(
                'tr',
                null,
                make('td', {text: Olive.clock(chapter.start)}),
                make('td', {dir: 'auto', text: chapter.title}),
              ),
            ),
          ),
        ),
      item.pages.map(
        (page, i) =>
          page.text &&
          make(
            'div',
            {class: 'printed-page'},
            make('h3', {text: say('page', {n: i + 1})}),
            make('p', {dir: 'auto', text: page.text}),
          ),
      ),
      item.extras.length > 0 &&
        make('p', {
          text:
            say('extras') +
            ': ' +
            item.extras
              .map((extra) => extra.title)
              .filter(Boolean)
              .join(', '),
        }),
    );
  }

  function prepare() {
    if (paper) return;
    const {pack} = Olive.app;
    paper = make(
      'div',
      {id: 'paper'},
      make('h1', {dir: 'auto', text: pack.title}),
      make('p', {
        class: 'meta',
        text: [pack.author, pack.collection, pack.modified ? Olive.day(pack.modified) : ''].filter(Boolean).join(' · '),
      }),
      pack.poster && Olive.picture(pack.poster, {loading: 'eager', class: 'printed-poster'}),
      Olive.paragraphs(pack.description),
      pack.items.length > 1 &&
        make(
          'ol',
          {class: 'printed-contents'},
          pack.items.map((item) => make('li', {dir: 'auto', text: item.title})),
        ),
      pack.items.map(printedItem),
    );
    document.body.append(paper);
  }

  addEventListener('beforeprint', prepare);
  addEventListener('afterprint', () => {
    paper?.remove();
    paper = null;
  });

  // Prints the package once its pictures are there.
  Olive.print = async () => {
    prepare();
    await Promise.all([...paper.querySelectorAll('img')].map((image) => image.decode().catch(() => {})));
    print();
  };
})(window.Olive);
