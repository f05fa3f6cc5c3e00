// SPDX-License-Identifier: Apache-2.0
// Which of a source's files is shown: the smallest that fills the stage, or the one that the reader asked for; the next
// one when it fails.
'use strict';

((Olive) => {
  const probe = {video: document.createElement('video'), audio: document.createElement('audio')};

  // Some containers play although the browser does not promise it, so doubtful files come last instead of never.
  const isPromised = (file) =>
    !file.mime || ['video', 'audio'].some((kind) => probe[kind].canPlayType(file.mime) !== '');

  const wantsLess = () => !!navigator.connection?.saveData;

  class Grades {
    // wanted: a grade that the reader chose, or ''.
    constructor(source, wanted) {
      this.files = source.files.filter((file) => file.address);
      this.failed = new Set();
      this.wanted = wanted;
      this.current = null;
    }

    isPlayable() {
      return this.files.length > 0;
    }

    // The grades to choose from, best first, each with the file that carries it.
    choices() {
      const seen = new Set();
      return ['Desktop', '720p', '480p']
        .map((grade) => ({grade, file: this.files.find((file) => file.grades.includes(grade))}))
        .filter(({file}) => {
          if (!file || seen.has(file)) return false;
          return seen.add(file);
        });
    }

    // Picks for a stage of this width in device pixels; null when every file failed.
    pick(width) {
      const left = this.files.filter((file) => !this.failed.has(file));
      const asked = left.find((file) => this.wanted && file.grades.includes(this.wanted));
      const promised = left.filter(isPromised);
      const pool = (promised.length ? promised : left).slice().sort((a, b) => a.width - b.width);
      const enough = wantsLess() ? pool[0] : pool.find((file) => file.width >= width);
      this.current = asked || enough || pool[pool.length - 1] || null;
      return this.current;
    }

    fail() {
      if (this.current) this.failed.add(this.current);
    }
  }

  Olive.Grades = Grades;

  // The grade's name with what it means in pixels.
  Olive.gradeLabel = ({grade, file}) =>
    file.height ? `${grade} · ${Math.round(file.width)} × ${Math.round(file.height)}` : grade;
  Olive.pixelsAcross = (node) => (node.clientWidth || innerWidth) * (window.devicePixelRatio || 1);

  // The file of a picture for this width in device pixels, of those that the browser can draw; null when there is none.
  Olive.pictureFile = (source, width) => new Grades({files: source.files.filter(Olive.isPicture)}, '').pick(width);

  // The address that shows a still at this width: a file that the browser can draw, else the preview.
  Olive.stillAddress = (source, width) => {
    const file = Olive.pictureFile(source, width);
    return file ? file.address : source.previews[0]?.picture || '';
  };
})(window.Olive);
