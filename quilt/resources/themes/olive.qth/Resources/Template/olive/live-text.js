// SPDX-License-Identifier: Apache-2.0
// One text of one object of the model. Tells of a 'change' whenever it says something else.
'use strict';

((Olive) => {
  class LiveText extends EventTarget {
    // name: 'Title', …; value: as the records have it; again: gets the object anew
    constructor(name, value, again) {
      super();
      this.object = null;
      this.value = value;
      this.name = name;
      this.again = again;
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
          const value = (await this.object.stored('cv' + this.name)) || '';
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

  Olive.LiveText = LiveText;
})(window.Olive);
