// SPDX-License-Identifier: Apache-2.0
// Brings the model behind a served page and the page together. A package from disk has no `conveyor`, and never fetches
// this.
'use strict';

((Olive) => {
  const {say} = Olive;
  const root = document.documentElement;

  Olive.goLive = (app) => {
    let isThere = false,
      toggle = null;
    const model = new Olive.LiveModel(app, {
      there() {
        isThere = true;
        page.hideNotice();
        dress();
      },
      bound: () => dress(),
      stopped() {
        isThere = false;
        dress();
        page.showNotice(say('liveStopped'));
      },
      moved: () => page.offerReload(),
      words: changeWords,
      extras(item) {
        app.wordsChanged();
        if (app.item?.id === item.id) Olive.dropExtras(item);
      },
    });
    const page = new Olive.LivePage(app, model);

    // A text of the model says something else: so do all places of the page that show it.
    function changeWords(id, name, value) {
      const things = [app.pack, ...app.pack.items.flatMap((item) => [item, ...Olive.partsOf(item)])];
      const thing = things.find((each) => each.id === id);
      if (!thing) return;
      if (value) thing.record[name] = value;
      else delete thing.record[name];
      Olive.rereadWords(app.pack);
      app.wordsChanged();
      page.showTitles();
    }

    const isOn = () => app.memory.choice('editing', true);
    function showOn() {
      root.classList.toggle('editing', isThere && isOn());
      toggle.setAttribute('aria-pressed', isOn());
      toggle.disabled = !isThere;
    }

    function placeToggle() {
      const tools = document.querySelector('.head-tools');
      if (tools.contains(toggle)) return;
      toggle = Olive.iconButton('edit', say('editing'), () => {
        app.memory.choose('editing', !isOn());
        showOn();
      });
      tools.querySelector('.settings-button').before(toggle);
    }

    function dress() {
      placeToggle();
      showOn();
      if (isThere && (!app.item || model.items.has(app.item.id))) page.dress(document.getElementById('main'));
    }

    document.addEventListener('olive:leave', () => {
      Olive.settleEdits();
      page.undress();
    });
    document.addEventListener('olive:shown', () => {
      delete document.getElementById('main').dataset.dressed;
      dress();
      if (app.item && model.items.has(app.item.id)) model.holdParts(app.item).catch(() => {});
    });
    model.begin();
  };
})(window.Olive);
