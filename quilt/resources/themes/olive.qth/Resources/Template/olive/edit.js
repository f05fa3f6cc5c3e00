// SPDX-License-Identifier: Apache-2.0
// Editing a text where it stands: a pencil beside it, a field in its place. Only a page with the model behind it has this.
'use strict';

((Olive) => {
  const {make, say} = Olive;
  const kSavedFor = 2500; // ms
  const kNames = {
    title: {name: 'title', edit: 'editTitle', add: 'addTitle'},
    author: {name: 'author', edit: 'editAuthor', add: 'addAuthor'},
    description: {name: 'description', edit: 'editDescription', add: 'addDescription'},
  };
  const fields = new Set(); // those that are open

  // The mark that says for a moment that a text was saved.
  function makeSavedMark() {
    let timer = 0;
    const element = make(
      'span',
      {class: 'saved-mark', 'aria-hidden': 'true', hidden: true},
      Olive.icon('check'),
      make('span', {text: say('saved')}),
    );
    return {
      element,
      show() {
        Olive.announce(say('saved'));
        element.hidden = false;
        clearTimeout(timer);
        timer = setTimeout(() => Olive.show(element, false), kSavedFor);
      },
    };
  }

  // One text that can be edited in its place.
  class Editable {
    constructor({node, text, kind, of, render}) {
      this.node = node;
      this.text = text;
      this.kind = kind;
      this.render = render;
      this.of = of ? ': ' + of : '';
      this.names = kNames[kind];
      this.field = null;
      this.pencil = make('button', {type: 'button', class: 'pencil', onclick: () => this.open()});
      this.mark = makeSavedMark();
      this.element = make('div', {class: 'editable of-' + kind});
      this.show = this.show.bind(this);
      node.addEventListener('click', (event) => this.onClick(event));
      text.addEventListener('change', this.show);
      node.replaceWith(this.element);
      this.element.append(node, this.pencil, this.mark.element);
      this.show();
    }

    show() {
      const isEmpty = !this.text.value,
        {pencil} = this;
      this.render(this.text.value);
      this.node.hidden = isEmpty && this.kind !== 'title';
      const label = say(isEmpty ? this.names.add : this.names.edit) + this.of;
      pencil.classList.toggle('adds', isEmpty);
      pencil.setAttribute('aria-label', label);
      pencil.title = isEmpty ? '' : label;
      const words = isEmpty ? [make('span', {text: say(this.names.add)})] : [];
      pencil.replaceChildren(Olive.icon(isEmpty ? 'plus' : 'edit'), ...words);
      this.field?.meanwhile();
    }

    onClick(event) {
      const isOn = document.documentElement.classList.contains('editing');
      if (isOn && !event.target.closest('a, button') && getSelection().isCollapsed) this.open();
    }

    open() {
      if (this.field) return;
      this.field = new Olive.EditField({
        text: this.text,
        isLong: this.kind === 'description',
        name: say(this.names.name) + this.of,
        edit: say(this.names.edit),
        onShut: (_field, isSaved) => this.shut(isSaved),
        onLost: (field, value, why) => {
          fields.delete(field); // the page has moved on; the text has not been lost
          Olive.openUnsaved(say(this.names.name), value, why);
        },
      });
      fields.add(this.field);
      this.node.classList.add('unseen');
      this.pencil.hidden = this.mark.element.hidden = true;
      this.element.append(this.field.element);
      this.field.begin(this.node);
    }

    shut(isSaved) {
      const left = this.field;
      const hadFocus = left.element.contains(document.activeElement);
      this.field = null;
      fields.delete(left);
      left.element.remove();
      this.node.classList.remove('unseen');
      this.pencil.hidden = false;
      this.show();
      if (hadFocus) this.pencil.focus();
      if (isSaved) this.mark.show();
    }

    close() {
      this.text.removeEventListener('change', this.show);
    }
  }

  // Makes what `node` shows editable in its place. text: a LiveText; kind: title, author or description; of: whose text
  // it is, where a page has several; render(value) shows a value in the node. Returns {element, close()}.
  Olive.makeEditable = (options) => new Editable(options);

  // Before the page shows something else: what was typed is saved, or told if that fails.
  Olive.settleEdits = () => {
    for (const field of [...fields]) field.commit();
  };

  addEventListener('beforeunload', (event) => {
    if ([...fields].some((field) => field.isChanged)) event.preventDefault();
  });
})(window.Olive);
