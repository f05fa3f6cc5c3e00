// SPDX-License-Identifier: Apache-2.0
// A menu of choices and actions that opens from a button among the controls.
'use strict';

((Olive) => {
  const {make} = Olive;
  let last = 0;

  // One of several: options are [value, words]; onChoose(value). Returns {element, set(value)}.
  Olive.menuChoice = (label, options, value, onChoose) => {
    const name = 'choice-' + ++last;
    const radios = options.map(([key]) => {
      const radio = make('input', {type: 'radio', name, value: key, onchange: () => onChoose(key)});
      radio.checked = key === value;
      return radio;
    });
    const entries = options.map(([, words], i) =>
      make('label', {class: 'menu-choice'}, radios[i], make('span', {text: words})),
    );
    return {
      element: make(
        'fieldset',
        {class: 'menu-choices'},
        make('legend', {text: label}),
        make('div', {class: 'menu-options'}, entries),
      ),
      set(wanted) {
        options.forEach(([key], i) => {
          radios[i].checked = key === wanted;
        });
      },
    };
  };

  // {icon, label, act}: what can be done once.
  Olive.menuAction = ({icon, label, act}) =>
    make('button', {type: 'button', class: 'menu-action', onclick: act}, Olive.icon(icon), make('span', {text: label}));

  // The button and, while it is open, the menu. content: nodes
  Olive.makeMenu = (icon, label, content) => {
    const id = 'menu-' + ++last;
    const panel = make('div', {class: 'menu', id, role: 'group', 'aria-label': label, hidden: true}, content);
    const button = Olive.iconButton(icon, label, () => toggle(panel.hidden), {
      'aria-expanded': 'false',
      'aria-controls': id,
    });
    const element = make('div', {class: 'menu-place'}, button, panel);
    const leave = (event) => {
      if (!element.contains(event.target)) toggle(false);
    };

    function toggle(isOpen) {
      panel.hidden = !isOpen;
      button.setAttribute('aria-expanded', isOpen);
      document[isOpen ? 'addEventListener' : 'removeEventListener']('pointerdown', leave, true);
      if (isOpen) (panel.querySelector('input:checked') || panel.querySelector('button'))?.focus({preventScroll: true});
    }

    element.addEventListener('keydown', (event) => {
      if (event.key !== 'Escape' || panel.hidden) return;
      event.preventDefault();
      event.stopPropagation();
      toggle(false);
      button.focus();
    });
    element.addEventListener('focusout', (event) => {
      if (event.relatedTarget && !element.contains(event.relatedTarget)) toggle(false);
    });
    panel.addEventListener('click', (event) => {
      if (event.target.closest('.menu-action')) toggle(false);
    });
    return {element, button, close: () => toggle(false)};
  };
})(window.Olive);
