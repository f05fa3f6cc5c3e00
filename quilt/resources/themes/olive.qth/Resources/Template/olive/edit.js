// SPDX-License-Identifier: Apache-2.0
// Editing a text where it stands: a pencil beside it, a field in its place. Only a page with the model behind it has this.
'use strict';

((Olive) => {
  if (!window.conveyor) return;
  const {make, say} = Olive;
  const kMostBytes = 1000000; // what the program takes in one piece, with some room
  const kNames = {
    title: {name: 'title', edit: 'editTitle', add: 'addTitle'},
    author: {name: 'author', edit: 'editAuthor', add: 'addAuthor'},
    description: {name: 'description', edit: 'editDescription', add: 'addDescription'},
  };
  const editors = new Set(); // those that are open
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

  // Makes what `node` shows editable in its place. text: a LiveText; kind: title, author or description; of: whose text it
  // is, where a page has several; render(value) shows a value in the node. Returns {element, close()}.
  Olive.makeEditable = ({node, text, kind, of, render}) => {
    const isLong = kind === 'description',
      names = kNames[kind];
    const pencil = make('button', {type: 'button', class: 'pencil', onclick: () => open()});
    const mark = make(
      'span',
      {class: 'saved-mark', 'aria-hidden': 'true', hidden: true},
      Olive.icon('check'),
      make('span', {text: say('saved')}),
    );
    const element = make('div', {class: 'editable of-' + kind});
    let editor = null,
      timer = 0;

    function show() {
      const isEmpty = !text.value;
      render(text.value);
      node.hidden = isEmpty && kind !== 'title';
      const label = say(isEmpty ? names.add : names.edit) + (of ? ': ' + of : '');
      pencil.classList.toggle('adds', isEmpty);
      pencil.setAttribute('aria-label', label);
      pencil.title = isEmpty ? '' : label;
      pencil.replaceChildren(
        Olive.icon(isEmpty ? 'plus' : 'edit'),
        ...(isEmpty ? [make('span', {text: say(names.add)})] : []),
      );
      if (editor) editor.meanwhile();
    }

    function open() {
      if (editor) return;
      editor = makeEditor();
      editors.add(editor);
      node.classList.add('unseen');
      pencil.hidden = mark.hidden = true;
      element.append(editor.element);
      editor.begin(node);
    }

    function shut(takesFocus) {
      const hadFocus = editor.element.contains(document.activeElement);
      const left = editor;
      editor = null;
      editors.delete(left);
      left.element.remove();
      node.classList.remove('unseen');
      pencil.hidden = false;
      show();
      if (takesFocus && hadFocus) pencil.focus();
    }

    function showSaved() {
      Olive.announce(say('saved'));
      mark.hidden = false;
      clearTimeout(timer);
      timer = setTimeout(() => {
        mark.hidden = true;
      }, 2500);
    }

    function makeEditor() {
      const id = 'edit-' + ++last;
      const before = text.value;
      const field = make('textarea', {
        class: 'edit-field',
        rows: 1,
        dir: 'auto',
        'aria-label': say(names.name) + (of ? ': ' + of : ''),
        'aria-describedby': id + '-hint',
        spellcheck: isLong ? 'true' : null,
        enterkeyhint: isLong ? null : 'done',
      });
      const problem = make('p', {class: 'edit-problem', role: 'alert', id: id + '-problem'});
      const news = make('p', {class: 'edit-news', role: 'status'});
      const button = (label, kindOf, act) =>
        make('button', {
          type: 'button',
          class: kindOf,
          text: say(label),
          onclick: act,
          onpointerdown: (event) => event.preventDefault(),
        });
      const element = make(
        'div',
        {class: 'editor', role: 'group', 'aria-label': say(names.edit)},
        field,
        make(
          'div',
          {class: 'edit-tools'},
          make('span', {class: 'edit-hint', id: id + '-hint', text: say(isLong ? 'editHintLong' : 'editHint')}),
          make(
            'span',
            {class: 'edit-buttons'},
            button('revert', 'quiet', () => revert()),
            button('save', 'primary', () => commit()),
          ),
        ),
        news,
        problem,
      );
      let saving = false,
        seen = before,
        width = 0;
      field.value = before;

      function fit() {
        field.style.height = 'auto';
        field.style.height = field.scrollHeight + field.offsetHeight - field.clientHeight + 'px';
      }

      function complain(words) {
        problem.textContent = words;
        field.setAttribute('aria-invalid', 'true');
        field.setAttribute('aria-describedby', `${id}-problem ${id}-hint`);
      }

      const wanted = () => tidy(field.value, isLong);
      const isChanged = () => wanted() !== tidy(before, isLong);

      function revert() {
        if (!saving) shut(true);
      }

      async function commit() {
        if (saving) return;
        if (!isChanged()) {
          shut(true);
          return;
        }
        const value = wanted();
        if (new Blob([JSON.stringify(value)]).size > kMostBytes) {
          complain(say('editTooLong'));
          return;
        }
        saving = field.readOnly = true;
        problem.textContent = '';
        try {
          await text.write(value);
          saving = false;
          shut(true);
          showSaved();
        } catch (error) {
          saving = field.readOnly = false;
          complain(Olive.whyNotSaved(error));
          if (element.isConnected) return;
          editors.delete(me); // the page has moved on; the text has not been lost
          openUnsaved(say(names.name), value, problem.textContent);
        }
      }

      field.addEventListener('input', () => {
        if (!isLong && field.value.includes('\n')) field.value = tidy(field.value, false);
        field.removeAttribute('aria-invalid');
        fit();
      });
      element.addEventListener('keydown', (event) => {
        if (event.isComposing) return;
        if (event.key === 'Escape') revert();
        else if (event.key === 'Enter' && event.target === field && (!isLong || event.ctrlKey || event.metaKey))
          commit();
        else return;
        event.preventDefault();
      });
      element.addEventListener('focusout', (event) => {
        // The window may lose the focus with the field keeping it.
        if (
          editor === me &&
          element.isConnected &&
          !element.contains(event.relatedTarget) &&
          document.activeElement !== event.target
        )
          commit();
      });
      const observer = new ResizeObserver(() => {
        if (element.clientWidth !== width) fit();
        width = element.clientWidth;
      });

      const me = {
        element,
        isChanged,
        commit,
        begin(shown) {
          const {font, letterSpacing} = getComputedStyle(shown);
          Object.assign(field.style, {font, letterSpacing});
          observer.observe(element);
          fit();
          field.focus();
          if (isLong) field.setSelectionRange(field.value.length, field.value.length);
          else field.select();
        },
        // The text was changed elsewhere: the one who types is told, and nothing typed is touched.
        meanwhile() {
          if (saving || text.value === seen) return;
          seen = text.value;
          news.replaceChildren();
          if (seen === wanted()) return; // what is typed here, though it may not be on disk yet
          const take = button('takeTheirs', 'quiet', () => {
            field.value = seen;
            news.replaceChildren();
            fit();
            field.focus();
          });
          news.replaceChildren(
            make('span', {
              dir: 'auto',
              text: say('changedMeanwhile', {text: seen.length > 160 ? seen.slice(0, 160) + '…' : seen}),
            }),
            take,
          );
        },
      };
      return me;
    }

    node.addEventListener('click', (event) => {
      if (
        document.documentElement.classList.contains('editing') &&
        !event.target.closest('a, button') &&
        getSelection().isCollapsed
      )
        open();
    });
    text.addEventListener('change', show);
    node.replaceWith(element);
    element.append(node, pencil, mark);
    show();
    return {element, close: () => text.removeEventListener('change', show)};
  };

  // Asks before something is done that cannot be undone. act() does it; what why(error) says of its failure stays with the
  // question.
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
  function openUnsaved(name, value, why) {
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
  }

  // Before the page shows something else: what was typed is saved, or told if that fails.
  Olive.settleEdits = () => {
    for (const editor of [...editors]) editor.commit();
  };

  addEventListener('beforeunload', (event) => {
    if ([...editors].some((editor) => editor.isChanged())) event.preventDefault();
  });
})(window.Olive);
