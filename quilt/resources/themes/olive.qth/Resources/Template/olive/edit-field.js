// SPDX-License-Identifier: Apache-2.0
// The field in which one text is edited: it is saved or reverted, and says what went wrong or changed meanwhile.
'use strict';

((Olive) => {
  const {make, say} = Olive;
  const kMostBytes = 1000000; // what the program takes in one piece, with some room
  const kMostShown = 160; // characters
  let last = 0;

  // The record cannot hold other control characters nor halves of characters, and one line is one line.
  function tidy(text, isLong) {
    const clean = text.replace(/[\u0000-\u0008\u000b\u000c\u000e-\u001f\ufffe\uffff]|\p{Surrogate}/gu, '');
    return isLong ? clean.trimEnd() : clean.replace(/\s*\n\s*/g, ' ').trim();
  }

  // Why the model did not take an edit, for people.
  Olive.whyNotSaved = (error) => {
    if (typeof error.code !== 'string') return say('editLost'); // no answer at all
    switch (error.code) {
      case 'not-saved':
        return say('editUnsaved');
      case 'no-object':
        return say('editGone');
      case 'busy':
        return say('editBusy');
      default:
        return say('editRefused', {reason: error.message});
    }
  };

  const button = (label, kind, act) =>
    make('button', {
      type: 'button',
      class: kind,
      text: say(label),
      onclick: act,
      onpointerdown: (event) => event.preventDefault(),
    });

  class EditField {
    // text: a LiveText; isLong: of several lines; name: whose text it is, for those who listen; edit: what is done with
    // it; onShut(field, isSaved) when it has done its work; onLost(field, value, why) when its place is gone before.
    constructor({text, isLong, name, edit, onShut, onLost}) {
      this.text = text;
      this.isLong = isLong;
      this.onShut = onShut;
      this.onLost = onLost;
      this.id = 'edit-' + ++last;
      this.before = this.seen = text.value;
      this.isSaving = false;
      this.field = make('textarea', {
        class: 'edit-field',
        rows: 1,
        dir: 'auto',
        'aria-label': name,
        'aria-describedby': this.id + '-hint',
        spellcheck: isLong ? 'true' : null,
        enterkeyhint: isLong ? null : 'done',
      });
      this.field.value = this.before;
      this.problem = make('p', {class: 'edit-problem', role: 'alert', id: this.id + '-problem'});
      this.news = make('p', {class: 'edit-news', role: 'status'});
      this.element = make(
        'div',
        {class: 'editor', role: 'group', 'aria-label': edit},
        this.field,
        this.makeTools(),
        this.news,
        this.problem,
      );
      this.listen();
    }

    makeTools() {
      return make(
        'div',
        {class: 'edit-tools'},
        make('span', {
          class: 'edit-hint',
          id: this.id + '-hint',
          text: say(this.isLong ? 'editHintLong' : 'editHint'),
        }),
        make(
          'span',
          {class: 'edit-buttons'},
          button('revert', 'quiet', () => this.revert()),
          button('save', 'primary', () => this.commit()),
        ),
      );
    }

    listen() {
      const {field, element} = this;
      field.addEventListener('input', () => {
        if (!this.isLong && field.value.includes('\n')) field.value = tidy(field.value, false);
        field.removeAttribute('aria-invalid');
        this.fit();
      });
      element.addEventListener('keydown', (event) => {
        if (event.isComposing) return;
        const isDone = event.key === 'Enter' && event.target === field;
        if (event.key === 'Escape') this.revert();
        else if (isDone && (!this.isLong || event.ctrlKey || event.metaKey)) this.commit();
        else return;
        event.preventDefault();
      });
      element.addEventListener('focusout', (event) => {
        if (element.contains(event.relatedTarget)) return;
        // The window may lose the focus with the field keeping it.
        if (this.isOpen && element.isConnected && document.activeElement !== event.target) this.commit();
      });
      let width = 0;
      this.observer = new ResizeObserver(() => {
        if (element.clientWidth !== width) this.fit();
        width = element.clientWidth;
      });
    }

    // In the letters of what it takes the place of.
    begin(shown) {
      const {font, letterSpacing} = getComputedStyle(shown);
      Object.assign(this.field.style, {font, letterSpacing});
      this.isOpen = true;
      this.observer.observe(this.element);
      this.fit();
      this.field.focus();
      if (this.isLong) this.field.setSelectionRange(this.field.value.length, this.field.value.length);
      else this.field.select();
    }

    fit() {
      const {field} = this;
      field.style.height = 'auto';
      field.style.height = field.scrollHeight + field.offsetHeight - field.clientHeight + 'px';
    }

    complain(words) {
      this.problem.textContent = words;
      this.field.setAttribute('aria-invalid', 'true');
      this.field.setAttribute('aria-describedby', `${this.id}-problem ${this.id}-hint`);
    }

    get wanted() {
      return tidy(this.field.value, this.isLong);
    }

    get isChanged() {
      return this.wanted !== tidy(this.before, this.isLong);
    }

    shut(isSaved) {
      this.isOpen = false;
      this.observer.disconnect();
      this.onShut(this, isSaved);
    }

    revert() {
      if (!this.isSaving) this.shut(false);
    }

    async commit() {
      if (this.isSaving) return;
      if (!this.isChanged) {
        this.shut(false);
        return;
      }
      const value = this.wanted;
      if (new Blob([JSON.stringify(value)]).size > kMostBytes) {
        this.complain(say('editTooLong'));
        return;
      }
      this.setSaving(true);
      this.problem.textContent = '';
      try {
        await this.text.write(value);
        this.setSaving(false);
        this.shut(true);
      } catch (error) {
        this.setSaving(false);
        this.complain(Olive.whyNotSaved(error));
        if (!this.element.isConnected) this.onLost(this, value, this.problem.textContent);
      }
    }

    setSaving(isSaving) {
      this.isSaving = isSaving;
      this.field.readOnly = isSaving;
    }

    // The text was changed elsewhere: the one who types is told, and nothing typed is touched.
    meanwhile() {
      if (this.isSaving || this.text.value === this.seen) return;
      this.seen = this.text.value;
      this.news.replaceChildren();
      if (this.seen === this.wanted) return; // what is typed here, though it may not be on disk yet
      const shown = this.seen.length > kMostShown ? this.seen.slice(0, kMostShown) + '…' : this.seen;
      const take = button('takeTheirs', 'quiet', () => {
        this.field.value = this.seen;
        this.news.replaceChildren();
        this.fit();
        this.field.focus();
      });
      this.news.replaceChildren(make('span', {dir: 'auto', text: say('changedMeanwhile', {text: shown})}), take);
    }
  }

  Olive.EditField = EditField;
})(window.Olive);
