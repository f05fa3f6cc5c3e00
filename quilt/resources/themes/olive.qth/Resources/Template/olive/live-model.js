// SPDX-License-Identifier: Apache-2.0
// The objects of the model that stand for what the page knows, and the news of them.
'use strict';

((Olive) => {
  const kAtOnce = 4; // calls
  const kRetryAfter = 500; // ms
  const kMoved = ['cvMediaCount', 'cvSourcesCount', 'cvAudioCommentarySource'];

  const keyOf = (id, name) => id + ' ' + name;

  class LiveModel {
    // app: see app.js; told: what it tells: {there(), bound(), stopped(), moved(), words(id, name, value),
    // extras(item)}
    constructor(app, told) {
      this.app = app;
      this.told = told;
      this.texts = new Map(); // by the object's identity and the text's name
      this.owners = new Map(); // an object of the model → its identity
      this.items = new Map(); // an item's identity → its object
      this.binding = null;
    }

    begin() {
      conveyor.addEventListener('change', (event) => this.onChange(event));
      conveyor.addEventListener('close', () => this.onClose());
      this.bind().catch(() => this.onClose());
    }

    textOf(thing, name) {
      const key = keyOf(thing.id, name);
      if (!this.texts.has(key)) {
        const value = typeof thing.record[name] === 'string' ? thing.record[name] : '';
        const text = new Olive.LiveText(name, value, () => this.bind());
        text.addEventListener('change', () => this.told.words(thing.id, name, text.value));
        this.texts.set(key, text);
      }
      return this.texts.get(key);
    }

    // Finds the model's objects; again after the program let go of them.
    bind() {
      this.binding =
        this.binding ||
        this.bindAll().finally(() => {
          this.binding = null;
        });
      return this.binding;
    }

    async bindAll() {
      const document_ = await conveyor.document();
      const {pack} = this.app;
      this.owners.clear();
      this.items = new Map();
      await this.hold(document_, pack, ['Title', 'Description', 'Author']);
      if (this.app.item) await this.holdItem(document_, this.app.item);
      this.told.there();
      if ((await document_.cvMediaCount()) !== pack.items.length) this.told.moved();
      if (this.app.item) await this.holdParts(this.app.item);
      const waiting = [...pack.items];
      const work = async () => {
        while (waiting.length) await this.holdItem(document_, waiting.shift());
      };
      await Promise.all(Array.from({length: kAtOnce}, work));
      this.told.bound(); // an item that was opened meanwhile
    }

    // Lets an object of the model answer for the texts of what the page knows under the same identity.
    hold(object, thing, names) {
      this.owners.set(object, thing.id);
      return Promise.all(
        names.map((name) => {
          const text = this.textOf(thing, name);
          text.object = object;
          return text.refresh();
        }),
      );
    }

    async holdItem(document_, item) {
      if (this.items.has(item.id)) return;
      const object = await document_.cvMediaAtIndex(item.index);
      if (!object || (await object.cvUUID()) !== item.id) {
        this.told.moved();
        return;
      }
      this.items.set(item.id, object);
      await this.hold(object, item, ['Title', 'Description']);
    }

    // The parts of an item are asked for when it is shown.
    async holdParts(item) {
      const object = this.items.get(item.id);
      if (!object) return;
      for (let i = 0; i < item.sources.length; ++i) await this.holdPart(item, await object.cvSourceAtIndex(i));
      if (item.commentary) await this.holdPart(item, await object.cvAudioCommentarySource());
      await this.holdExtras(item, true);
    }

    async holdPart(item, part) {
      if (!part) return;
      const id = this.owners.get(part) || (await part.cvUUID());
      const thing = Olive.partsOf(item).find((each) => each.id === id);
      if (thing) await this.hold(part, thing, ['Title']); // a source's description is in no record
    }

    // The page shows the extras that are still there.
    async holdExtras(item, withTexts) {
      const object = this.items.get(item.id);
      const there = [];
      for (let i = (await object.cvExtraCount()) - 1; i >= 0; --i) {
        const extra = await object.cvExtraAtIndex(i);
        if (!extra) continue;
        there.push(await extra.cvUUID());
        if (withTexts) await this.holdPart(item, extra);
      }
      if (there.some((id) => !item.extras.some((extra) => extra.id === id))) this.told.moved();
      if (item.extras.every((extra) => there.includes(extra.id))) return;
      item.record.Extras = item.record.Extras.filter((record) => there.includes(record.UUID));
      item.extras = item.extras.filter((extra) => there.includes(extra.id));
      this.told.extras(item);
    }

    // By its identity, wherever it stands by now.
    async removeExtra(item, extra) {
      const object = this.items.get(item.id);
      for (let i = (await object.cvExtraCount()) - 1; i >= 0; --i) {
        const each = await object.cvExtraAtIndex(i);
        if (!each || (await each.cvUUID()) !== extra.id) continue;
        await object.cvRemoveExtraAtIndex(i);
        break;
      }
      await this.holdExtras(item, false);
    }

    onChange({object, accessors}) {
      const id = this.owners.get(object);
      if (id === undefined) return;
      const quietly = (promise) => promise.catch(() => {}); // the end of the session is told by itself
      for (const accessor of accessors) {
        const text = this.texts.get(keyOf(id, accessor.slice(2)));
        if (text && text.object === object) quietly(text.refresh());
      }
      const item = this.app.pack.items.find((each) => each.id === id);
      if (item && accessors.includes('cvExtraCount')) quietly(this.holdExtras(item, false));
      if (accessors.some((accessor) => kMoved.includes(accessor))) this.told.moved();
    }

    // The program has ended, or has let go of a page that slept.
    onClose() {
      setTimeout(() => this.bind().catch(() => this.told.stopped()), kRetryAfter);
    }
  }

  Olive.LiveModel = LiveModel;
})(window.Olive);
