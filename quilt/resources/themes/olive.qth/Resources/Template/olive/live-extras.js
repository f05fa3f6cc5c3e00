// SPDX-License-Identifier: Apache-2.0
// Extras of a served document can be removed, after a question.
'use strict';

((Olive) => {
  const {say} = Olive;
  const buttons = () => [...document.querySelectorAll('[data-remove]')];

  function askToRemove(model, item, extra) {
    const title = Olive.titleOfPart(extra);
    Olive.ask({
      title: say('removeExtra', {title}),
      text: say('removeExtraAsk'),
      yes: say('remove'),
      why: Olive.whyNotSaved,
      act: async (close) => {
        const place = buttons().findIndex((button) => button.dataset.remove === extra.id);
        await model.removeExtra(item, extra);
        close();
        const left = buttons();
        (left[Math.min(place, left.length - 1)] || document.getElementById('main')).focus();
        Olive.announce(say('removed', {title}));
      },
    });
  }

  // Puts a button beside each extra of the item on the page.
  Olive.dressExtras = (view, model, item) => {
    for (const row of view.querySelectorAll('.extras > li')) {
      const extra = item.extras.find((each) => each.id === row.dataset.id);
      if (!extra || row.querySelector('.remove')) continue;
      const label = say('removeExtra', {title: Olive.titleOfPart(extra)});
      row.append(
        Olive.iconButton('remove', label, () => askToRemove(model, item, extra), {
          class: 'icon-button remove live-only',
          'data-remove': extra.id,
        }),
      );
    }
  };

  // Takes off the page what the item no longer has.
  Olive.dropExtras = (item) => {
    const left = new Set(Olive.partsOf(item).map((part) => part.id));
    for (const row of document.querySelectorAll('.extras > li, .part')) {
      if (!left.has(row.dataset.id) && !row.querySelector('.editor')) row.remove();
    }
    const list = document.querySelector('.extras');
    if (list && !list.children.length) list.parentElement.remove();
  };
})(window.Olive);
