// SPDX-License-Identifier: Apache-2.0
// The model behind a page that "quilt serve" serves: its texts, their changes from anywhere, and where they are edited. A
// package from disk has no `conveyor`, and nothing here runs.
'use strict';

((Olive) => {
  if (!window.conveyor) return;
  const {make, say} = Olive;
  const kAtOnce = 4; // calls
  const kRetryAfter = 500; // ms
  // What the program answers for a document without a description.
  const kNoDescription =
    'Lorem ipsum dolor sit amet, consectetur adipiscing elit. In id laoreet arcu. Sed luctus velit ac lorem tincidunt tincidunt. Pellentesque vitae diam vitae leo cursus sodales. Sed non tortor eget libero malesuada elementum eu non elit. Quisque malesuada pellentesque porttitor.';
  const kMoved = ['cvMediaCount', 'cvSourcesCount', 'cvAudioCommentarySource'];

  // One text of one object of the model. Tells of a 'change' whenever it says something else.
  class LiveText extends EventTarget {
    constructor(name, value, again) {
      super();
      this.object = null;
      this.value = value;
      this.name = name;
      this.again = again; // gets the object anew
      this.reading = null;
      this.isOld = false;
    }

    // Asks the model, one question at a time, so that the last answer is the last word.
    refresh() {
      this.isOld = true;
      this.reading = this.reading || this.read();
      return this.reading;
    }

    async read() {
      try {
        while (this.isOld) {
          this.isOld = false;
          const answer = await this.object['cv' + this.name]();
          const value = answer === null || answer === kNoDescription ? '' : answer;
          if (value === this.value) continue;
          this.value = value;
          this.dispatchEvent(new Event('change'));
        }
      } finally {
        this.reading = null;
      }
    }

    async write(value) {
      const set = () => this.object['cvSet' + this.name](value || null);
      try {
        if (!this.object) await this.again();
        await set();
      } catch (error) {
        if (error.code !== 'no-session') throw error;
        await this.again();
        await set();
      }
      await this.refresh();
    }
  }

  Olive.goLive = (app) => {
    const root = document.documentElement;
    const texts = new Map(); // by the object's identity and the text's name
    const owners = new Map(); // an object of the model → its identity
    let items = new Map(); // an item's identity → its object
    let shown = []; // what the page shows editable
    let isThere = false,
      binding = null,
      toggle = null;

    // --- the model

    function keyOf(id, name) {
      return id + ' ' + name;
    }

    function textOf(thing, name) {
      const key = keyOf(thing.id, name);
      if (!texts.has(key)) {
        const text = new LiveText(name, typeof thing.record[name] === 'string' ? thing.record[name] : '', bind);
        text.addEventListener('change', () => changed(thing.id, name, text.value));
        texts.set(key, text);
      }
      return texts.get(key);
    }

    // Lets an object of the model answer for the texts of what the page knows under the same identity.
    function hold(object, thing, names) {
      owners.set(object, thing.id);
      return Promise.all(
        names.map((name) => {
          const text = textOf(thing, name);
          text.object = object;
          return text.refresh();
        }),
      );
    }

    async function holdItem(document_, item) {
      if (items.has(item.id)) return;
      const object = await document_.cvMediaAtIndex(item.index);
      if (!object || (await object.cvUUID()) !== item.id) {
        offerReload();
        return;
      }
      items.set(item.id, object);
      await hold(object, item, ['Title', 'Description']);
    }

    // The parts of an item are asked for when it is shown.
    async function holdParts(item) {
      const object = items.get(item.id);
      if (!object) return;
      const holdPart = async (part) => {
        if (!part) return;
        const id = owners.get(part) || (await part.cvUUID());
        const thing = Olive.partsOf(item).find((each) => each.id === id);
        if (thing) await hold(part, thing, ['Title']); // a source's description is in no record
      };
      for (let i = 0; i < item.sources.length; ++i) await holdPart(await object.cvSourceAtIndex(i));
      if (item.commentary) await holdPart(await object.cvAudioCommentarySource());
      await holdExtras(item, holdPart);
    }

    // The page shows the extras that are still there.
    async function holdExtras(item, each) {
      const object = items.get(item.id);
      const there = [];
      for (let i = (await object.cvExtraCount()) - 1; i >= 0; --i) {
        const extra = await object.cvExtraAtIndex(i);
        if (!extra) continue;
        there.push(await extra.cvUUID());
        if (each) await each(extra);
      }
      if (there.some((id) => !item.extras.some((extra) => extra.id === id))) offerReload();
      if (item.extras.every((extra) => there.includes(extra.id))) return;
      item.record.Extras = item.record.Extras.filter((record) => there.includes(record.UUID));
      item.extras = item.extras.filter((extra) => there.includes(extra.id));
      app.wordsChanged();
      if (app.item && app.item.id === item.id) showExtras(item);
    }

    // Finds the model's objects; again after the program let go of them.
    function bind() {
      binding =
        binding ||
        (async () => {
          try {
            const document_ = await conveyor.document();
            owners.clear();
            items = new Map();
            await hold(document_, app.pack, ['Title', 'Description', 'Author']);
            if (app.item) await holdItem(document_, app.item);
            setThere(true);
            if ((await document_.cvMediaCount()) !== app.pack.items.length) offerReload();
            if (app.item) await holdParts(app.item);
            const waiting = [...app.pack.items];
            await Promise.all(
              Array.from({length: kAtOnce}, async () => {
                while (waiting.length) await holdItem(document_, waiting.shift());
              }),
            );
            dress(); // an item that was opened meanwhile
          } finally {
            binding = null;
          }
        })();
      return binding;
    }

    function onChange({object, accessors}) {
      const id = owners.get(object);
      if (id === undefined) return;
      for (const accessor of accessors) {
        const text = texts.get(keyOf(id, accessor.slice(2)));
        if (text && text.object === object) text.refresh().catch(() => {}); // the end of the session is told by itself
      }
      if (accessors.includes('cvExtraCount')) holdExtras(app.pack.items.find((item) => item.id === id)).catch(() => {});
      if (accessors.some((accessor) => kMoved.includes(accessor))) offerReload();
    }

    // The program has ended, or has let go of a page that slept.
    function onClose() {
      setTimeout(
        () =>
          bind().catch(() => {
            setThere(false);
            showNotice(say('liveStopped'));
          }),
        kRetryAfter,
      );
    }

    // --- the page

    // A text of the model says something else: so do all places of the page that show it.
    function changed(id, name, value) {
      const thing =
        id === app.pack.id
          ? app.pack
          : app.pack.items.flatMap((item) => [item, ...Olive.partsOf(item)]).find((each) => each.id === id);
      if (!thing) return;
      if (value) thing.record[name] = value;
      else delete thing.record[name];
      Olive.rereadWords(app.pack);
      app.wordsChanged();
      showTitles();
    }

    function showTitles() {
      const titles = new Map([[app.pack.id, app.pack.title || say('untitledPackage')]]);
      for (const item of app.pack.items) {
        titles.set(item.id, item.title);
        for (const part of Olive.partsOf(item)) titles.set(part.id, Olive.titleOfPart(part));
        for (const chapter of item.chapters) if (chapter.source) titles.set(chapter.source.id, chapter.title);
      }
      for (const node of document.querySelectorAll('[data-title-of]')) {
        const title = titles.get(node.dataset.titleOf);
        if (title !== undefined && node.textContent !== title) node.textContent = title;
      }
      const caption = document.querySelector('[data-caption-of]');
      const still = caption && app.item && app.item.sources.find((source) => source.id === caption.dataset.captionOf);
      if (still) caption.textContent = still.title;
    }

    function showExtras(item) {
      const left = new Set(Olive.partsOf(item).map((part) => part.id));
      for (const row of document.querySelectorAll('.extras > li, .part'))
        if (!left.has(row.dataset.id) && !row.querySelector('.editor')) row.remove();
      const list = document.querySelector('.extras');
      if (list && !list.children.length) list.parentNode.remove();
    }

    function showNotice(words, ...actions) {
      const old = document.querySelector('.live-notice');
      if (old) old.remove();
      document
        .querySelector('.head')
        .after(
          make('div', {class: 'live-notice', role: 'status'}, Olive.icon('warning'), make('p', {text: words}), actions),
        );
    }

    function offerReload() {
      showNotice(
        say('liveChanged'),
        make('button', {type: 'button', class: 'quiet', text: say('liveShow'), onclick: () => location.reload()}),
      );
    }

    function setThere(value) {
      isThere = value;
      if (value && document.querySelector('.live-notice')) document.querySelector('.live-notice').remove();
      dress();
    }

    const isOn = () => app.memory.choice('editing', true);
    function showOn() {
      root.classList.toggle('editing', isThere && isOn());
      toggle.setAttribute('aria-pressed', isOn());
      toggle.disabled = !isThere;
    }

    function editable(node, thing, kind, {of, render = () => {}} = {}) {
      const made = Olive.makeEditable({
        node,
        text: textOf(thing, kind[0].toUpperCase() + kind.slice(1)),
        kind,
        of,
        render,
      });
      shown.push(made);
      return made.element;
    }

    const withParagraphs = (node) => (value) => node.replaceChildren(...Olive.paragraphs(value));
    const asLine = (node) => (value) => {
      node.textContent = value;
    };

    function dressPackage(title, author, description) {
      editable(title, app.pack, 'title');
      editable(author, app.pack, 'author', {render: asLine(author)});
      editable(description, app.pack, 'description', {render: withParagraphs(description)});
    }

    function dressHome(view) {
      const title = view.querySelector('.hero h1');
      const author = view.querySelector('.author') || make('p', {class: 'author', dir: 'auto'});
      if (!author.isConnected) title.after(author);
      dressPackage(title, author, view.querySelector('.lead'));
    }

    function dressItem(view, item) {
      const about = view.querySelector('.about'),
        description = about.querySelector('.description');
      editable(about.querySelector('h1'), item, 'title');
      editable(description, item, 'description', {render: withParagraphs(description)});
      const neighbours = about.querySelector('.neighbours');
      const sections = [makeParts(item), app.pack.items.length === 1 && makePackageTexts()].filter(Boolean);
      if (neighbours) neighbours.before(...sections);
      else about.append(...sections);
      dressExtras(view, item);
    }

    // A package of one item has no opening page.
    function makePackageTexts() {
      const title = make('p', {
        class: 'package-title',
        dir: 'auto',
        'data-title-of': app.pack.id,
        text: app.pack.title,
      });
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
      dressPackage(title, author, description);
      return section;
    }

    // The files of an item, with what each is called.
    function makeParts(item) {
      const list = make('ul', {class: 'parts'});
      const box = make(
        'details',
        {class: 'live-only part-box'},
        make('summary', null, make('h2', {text: say('parts')})),
        list,
      );
      const fill = () =>
        list.replaceChildren(
          ...Olive.partsOf(item).map((part) => {
            const of = part === item.commentary ? say('commentary') : Olive.titleOfPart(part);
            const title = make('p', {
              class: 'row-title',
              dir: 'auto',
              'data-title-of': part.id,
              text: Olive.titleOfPart(part),
            });
            const row = make(
              'li',
              {class: 'part', 'data-id': part.id},
              Olive.icon(part === item.commentary ? 'voice' : part.category || 'warning'),
              title,
            );
            editable(title, part, 'title', {of});
            return row;
          }),
        );
      box.addEventListener('toggle', () => {
        if (box.open && !list.children.length) fill();
      });
      return box;
    }

    function dressExtras(view, item) {
      for (const row of view.querySelectorAll('.extras > li')) {
        const extra = item.extras.find((each) => each.id === row.dataset.id);
        if (!extra || row.querySelector('.remove')) continue;
        const title = Olive.titleOfPart(extra);
        row.append(
          make(
            'button',
            {
              type: 'button',
              class: 'icon-button remove live-only',
              'aria-label': say('removeExtra', {title}),
              title: say('removeExtra', {title}),
              'data-remove': extra.id,
              onclick: () => askToRemove(item, extra),
            },
            Olive.icon('remove'),
          ),
        );
      }
    }

    function askToRemove(item, extra) {
      const title = Olive.titleOfPart(extra);
      Olive.ask({
        title: say('removeExtra', {title}),
        text: say('removeExtraAsk'),
        yes: say('remove'),
        why: Olive.whyNotSaved,
        act: async (close) => {
          const rows = [...document.querySelectorAll('[data-remove]')],
            place = rows.findIndex((row) => row.dataset.remove === extra.id);
          await removeExtra(item, extra);
          close();
          const next = [...document.querySelectorAll('[data-remove]')];
          (next[Math.min(place, next.length - 1)] || document.getElementById('main')).focus();
          Olive.announce(say('removed', {title}));
        },
      });
    }

    // By its identity, wherever it stands by now.
    async function removeExtra(item, extra) {
      const object = items.get(item.id);
      for (let i = (await object.cvExtraCount()) - 1; i >= 0; --i) {
        const each = await object.cvExtraAtIndex(i);
        if (!each || (await each.cvUUID()) !== extra.id) continue;
        await object.cvRemoveExtraAtIndex(i);
        break;
      }
      await holdExtras(item);
    }

    function dress() {
      const tools = document.querySelector('.head-tools');
      if (!tools.contains(toggle)) {
        toggle = Olive.iconButton('edit', say('editing'), () => {
          app.memory.choose('editing', !isOn());
          showOn();
        });
        tools.querySelector('.settings-button').before(toggle);
      }
      showOn();
      const view = document.getElementById('main');
      if (!isThere || view.dataset.dressed || (app.item && !items.has(app.item.id))) return;
      view.dataset.dressed = 'yes';
      if (app.item) dressItem(view, app.item);
      else dressHome(view);
    }

    document.addEventListener('olive:leave', () => {
      Olive.settleEdits();
      for (const each of shown) each.close();
      shown = [];
    });
    document.addEventListener('olive:shown', () => {
      delete document.getElementById('main').dataset.dressed;
      dress();
      if (app.item && items.has(app.item.id)) holdParts(app.item).catch(() => {});
    });
    conveyor.addEventListener('change', onChange);
    conveyor.addEventListener('close', onClose);
    bind().catch(onClose);
  };
})(window.Olive);
