// SPDX-License-Identifier: Apache-2.0
// How two pictures lie on the stage: side by side (one above the other in portrait), one in the corner of the other, or one
// alone. The stage takes the shape of the arrangement.
'use strict';

((Olive) => {
  const {make, say} = Olive;
  const kViews = ['side', 'corner', 'first', 'second'];
  const portrait = matchMedia('(orientation: portrait)');

  class Arrangement {
    // panes: two elements; ratioOf(i): width by height of what the pane shows; share: percent of the first pane by default;
    // onHide(i, isHidden); onChange()
    constructor({panes, ratioOf, share, memory, onHide, onChange}) {
      this.panes = panes;
      this.ratioOf = ratioOf;
      this.memory = memory;
      this.onHide = onHide;
      this.onChange = onChange;
      this.name = 'side';
      this.isSwapped = false;
      this.choiceName = share < 50 ? 'split' : 'split-second';
      this.usual = [100 - share, 50, share].sort((a, b) => a - b);
      this.share = memory.choice(this.choiceName, share);
      this.divider = Olive.makeDivider({
        value: () => this.left,
        set: (percent) => this.setLeft(percent),
        usual: () => this.usual,
      });
      this.element = make('div', {class: 'dual', dir: 'ltr'}, panes[0], this.divider, panes[1]);
      this.buttons = kViews.map((name) =>
        Olive.iconButton(name, say('view-' + name), () => this.choose(name), {
          'data-view': name,
          'aria-pressed': 'false',
        }),
      );
      this.chooser = Olive.menuChoice(
        say('views'),
        kViews.map((name) => [name, say('view-' + name)]),
        'side',
        (name) => this.choose(name),
      );
      for (const pane of panes) pane.addEventListener('click', (event) => this.onClick(pane, event));
      this.fit = this.fit.bind(this);
      portrait.addEventListener('change', this.fit);
    }

    // The controls of the row.
    get controls() {
      const swap = Olive.iconButton('swap', say('swap'), () => this.swap());
      return make('div', {class: 'views', role: 'group', 'aria-label': say('views')}, this.buttons, swap);
    }

    get value() {
      return this.name + (this.isSwapped ? '.swapped' : '');
    }

    // What lies on the left, in percent.
    get left() {
      return this.isSwapped ? 100 - this.share : this.share;
    }

    setLeft(percent) {
      this.share = this.isSwapped ? 100 - percent : percent;
      this.memory.choose(this.choiceName, this.share);
      this.fit();
    }

    set(value) {
      const [name, swapped] = String(value).split('.');
      this.name = kViews.includes(name) ? name : 'side';
      this.isSwapped = swapped === 'swapped';
      this.element.dataset.view = this.name;
      this.element.dataset.swapped = String(this.isSwapped);
      const small = this.name === 'corner' ? this.panes[this.isSwapped ? 0 : 1] : null;
      const hidden = {first: this.isSwapped ? 0 : 1, second: this.isSwapped ? 1 : 0}[this.name];
      this.panes.forEach((pane, i) => {
        pane.classList.toggle('small', pane === small);
        pane.hidden = i === hidden;
        this.onHide(i, i === hidden);
      });
      this.divider.hidden = this.name !== 'side';
      for (const button of this.buttons) button.setAttribute('aria-pressed', String(button.dataset.view === this.name));
      this.chooser.set(this.name);
      this.memory.choose('view', this.value);
      this.fit();
      this.onChange();
    }

    // As a reader does it: it is told.
    choose(name) {
      this.set(name + (this.isSwapped ? '.swapped' : ''));
      Olive.announce(say('view-' + this.name));
    }

    swap() {
      this.set(this.name + (this.isSwapped ? '' : '.swapped'));
      Olive.announce(say('swapped'));
    }

    next() {
      this.choose(kViews[(kViews.indexOf(this.name) + 1) % kViews.length]);
    }

    onClick(pane, event) {
      if (!pane.classList.contains('small')) return;
      event.stopPropagation();
      this.swap();
    }

    // The shape of the whole, width by height.
    get ratio() {
      const [first, second] = [this.ratioOf(0), this.ratioOf(1)];
      if (this.name === 'side') {
        if (portrait.matches) return 1 / (1 / first + 1 / second);
        return 1 / Math.max(this.share / 100 / first, (1 - this.share / 100) / second);
      }
      const isSecond = (this.name === 'second') !== this.isSwapped;
      return isSecond ? second : first;
    }

    fit() {
      const {element, divider} = this;
      element.dataset.stacked = String(portrait.matches);
      element.style.setProperty('--split', this.left + '%');
      element.style.setProperty('--first', String(1 / this.ratioOf(this.isSwapped ? 1 : 0)));
      element.style.setProperty('--second', String(1 / this.ratioOf(this.isSwapped ? 0 : 1)));
      divider.setAttribute('aria-valuenow', this.left);
      const stage = element.closest('.stage');
      if (stage) Olive.setShape(stage, this.ratio);
    }

    close() {
      portrait.removeEventListener('change', this.fit);
    }
  }

  Olive.Arrangement = Arrangement;
})(window.Olive);
