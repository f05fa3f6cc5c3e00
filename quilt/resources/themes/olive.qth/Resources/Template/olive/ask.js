// SPDX-License-Identifier: Apache-2.0
// Questions before something that cannot be undone, and texts that found no place.
'use strict';

((Olive) => {
  const {make, say} = Olive;

  // Asks before something is done that cannot be undone. act() does it; what why(error) says of its failure stays with
  // the question.
  Olive.ask = ({title, text, yes, act, why}) => {
    const problem = make('p', {class: 'edit-problem', role: 'alert'});
    const no = make('button', {type: 'button', class: 'quiet', text: say('cancel'), onclick: () => dialog.close()});
    const go = make('button', {
      type: 'button',
      class: 'primary danger',
      text: yes,
      onclick: async () => {
        go.disabled = true;
        try {
          await act(() => dialog.close());
        } catch (error) {
          problem.textContent = why(error);
          go.disabled = false;
          no.focus();
        }
      },
    });
    const dialog = Olive.openDialog(
      'ask-dialog',
      title,
      make('div', {class: 'ask'}, make('p', {text}), problem, make('div', {class: 'ask-actions'}, no, go)),
    );
    no.focus();
  };

  // A text that could not be saved although its place is gone.
  Olive.openUnsaved = (name, value, why) => {
    const field = make('textarea', {
      class: 'edit-field unsaved',
      readonly: true,
      rows: 6,
      dir: 'auto',
      'aria-label': name,
    });
    field.value = value;
    Olive.openDialog('ask-dialog', say('unsavedText'), make('div', {class: 'ask'}, make('p', {text: why}), field));
    field.select();
  };
})(window.Olive);
