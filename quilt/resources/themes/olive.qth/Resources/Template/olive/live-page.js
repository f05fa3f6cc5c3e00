// SPDX-License-Identifier: Apache-2.0
// The page of a served document: which of its texts can be edited, and what says that the model has changed.
'use strict';

((Olive) => {
  const {make, say} = Olive;
  const withParagraphs = (node) => (value) => node.replaceChildren(...Olive.paragraphs(value));
  const asLine = (node) => (value) => {
    node.textContent = value;
  };

  class LivePage {
    // app: see app.js; model: a LiveModel
    constructor(app, model) {
      this.app = app;
      this.model = model;
      this.shown = []; // what the page shows editable
    }

    editable(node, thing, kind, {of = '', render = (_value) => {}} = {}) {
      const text = this.model.textOf(thing, kind[0].toUpperCase() + kind.slice(1));
      this.shown.push(Olive.makeEditable({node, text, kind, of, render}));
    }

    // Makes the texts of the page that is shown editable, once.
    dress(view) {
      if (view.dataset.dressed) return;
      view.dataset.dressed = 'yes';
      if (this.app.item) this.dressItem(view, this.app.item);
      else this.dressHome(view);
    }

    undress() {
      for (const each of this.shown) each.close();
      this.shown = [];
    }

    dressPackage(title, author, description) {
      const {pack} = this.app;
      this.editable(title, pack, 'title');
      this.editable(author, pack, 'author', {render: asLine(author)});
      this.editable(description, pack, 'description', {render: withParagraphs(description)});
    }

    dressHome(view) {
      const title = view.querySelector('.hero h1');
      const author = view.querySelector('.author') || make('p', {class: 'author', dir: 'auto'});
      if (!author.isConnected) title.after(author);
      this.dressPackage(title, author, view.querySelector('.lead'));
    }

    dressItem(view, item) {
      const about = view.querySelector('.about'),
        description = about.querySelector('.description');
      this.editable(about.querySelector('h1'), item, 'title');
      this.editable(description, item, 'description', {render: withParagraphs(description)});
      const neighbours = about.querySelector('.neighbours');
      const sections = [this.makeParts(item)];
      if (this.app.isLonely) sections.push(this.makePackageTexts());
      if (neighbours) neighbours.before(...sections);
      else about.append(...sections);
      Olive.dressExtras(view, this.model, item);
    }

    // A package of one item has no opening page.
    makePackageTexts() {
      const {pack} = this.app;
      const title = make('p', {class: 'package-title', dir: 'auto', 'data-title-of': pack.id, text: pack.title});
      const author = make('p', {class: 'author', dir: 'auto'}),
        description = make('div', {class: 'description'});
      const section = make(
        'section',
        {class: 'live-only package-texts', 'aria-labelledby': 'package-texts'},
        make('h2', {id: 'package-texts', text: say('packageTexts')}),
        title,
        author,
        description,
      );
      this.dressPackage(title, author, description);
      return section;
    }

    // The files of an item, with what each is called.
    makeParts(item) {
      const list = make('ul', {class: 'parts'});
      const head = make('summary', null, make('h2', {text: say('parts')}));
      const box = make('details', {class: 'live-only part-box'}, head, list);
      const fill = () => list.replaceChildren(...Olive.partsOf(item).map((part) => this.makePart(item, part)));
      box.addEventListener('toggle', () => {
        if (box.open && !list.children.length) fill();
      });
      return box;
    }

    makePart(item, part) {
      const isVoice = part === item.commentary;
      const name = Olive.titleOfPart(part);
      const title = make('p', {class: 'row-title', dir: 'auto', 'data-title-of': part.id, text: name});
      const icon = Olive.icon(isVoice ? 'voice' : part.category || 'warning');
      const row = make('li', {class: 'part', 'data-id': part.id}, icon, title);
      this.editable(title, part, 'title', {of: isVoice ? say('commentary') : name});
      return row;
    }

    // Shows the titles everywhere as they are now.
    showTitles() {
      const {pack, item: current} = this.app;
      const titles = new Map([[pack.id, pack.title || say('untitledPackage')]]);
      for (const item of pack.items) {
        titles.set(item.id, item.title);
        for (const part of Olive.partsOf(item)) titles.set(part.id, Olive.titleOfPart(part));
        for (const chapter of item.chapters) if (chapter.source) titles.set(chapter.source.id, chapter.title);
      }
      for (const node of document.querySelectorAll('[data-title-of]')) {
        const title = titles.get(node.dataset.titleOf);
        if (title !== undefined && node.textContent !== title) node.textContent = title;
      }
      const caption = document.querySelector('[data-caption-of]');
      const still = caption && current?.sources.find((source) => source.id === caption.dataset.captionOf);
      if (still) caption.textContent = still.title;
    }

    hideNotice() {
      document.querySelector('.live-notice')?.remove();
    }

    showNotice(words, ...actions) {
      this.hideNotice();
      const notice = make(
        'div',
        {class: 'live-notice', role: 'status'},
        Olive.icon('warning'),
        make('p', {text: words}),
      );
      notice.append(...actions);
      document.querySelector('.head').after(notice);
    }

    offerReload() {
      const onclick = () => location.reload();
      this.showNotice(
        say('liveChanged'),
        make('button', {type: 'button', class: 'quiet', text: say('liveShow'), onclick}),
      );
    }
  }

  Olive.LivePage = LivePage;
})(window.Olive);
