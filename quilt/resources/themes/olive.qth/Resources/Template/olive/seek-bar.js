// SPDX-License-Identifier: Apache-2.0
// The time line: a slider with marks for chapters and a bubble that names the place under the pointer.
'use strict';

((Olive) => {
  const {make, say, clock, clamp} = Olive;

  class SeekBar {
    constructor(player, chapters) {
      this.player = player;
      this.chapters = chapters;
      this.isDragged = false;
      this.range = make('input', {
        type: 'range',
        class: 'seek',
        min: 0,
        max: 1,
        step: 'any',
        value: 0,
        'aria-label': say('seek'),
      });
      this.marks = make('div', {class: 'marks', 'aria-hidden': 'true'});
      this.bubble = make('div', {class: 'bubble', hidden: true, 'aria-hidden': 'true'});
      this.bar = make('div', {class: 'seek-bar'}, this.range, this.marks, this.bubble);
      this.range.addEventListener('input', () => {
        this.isDragged = true;
        player.seek(Number(this.range.value));
        this.update();
      });
      this.range.addEventListener('change', () => {
        this.isDragged = false;
      });
      this.bar.addEventListener('pointermove', (event) => this.point(event));
      this.bar.addEventListener('pointerleave', () => Olive.show(this.bubble, false));
    }

    chapterAt(seconds) {
      return this.chapters.filter((chapter) => chapter.start !== null && chapter.start <= seconds + 0.05).pop();
    }

    share(seconds) {
      return this.player.duration ? clamp(seconds / this.player.duration, 0, 1) : 0;
    }

    drawMarks() {
      const inside = this.chapters.filter((chapter) => chapter.start > 0 && chapter.start < this.player.duration);
      this.marks.replaceChildren(
        ...inside.map((chapter) => {
          const mark = make('i');
          mark.style.insetInlineStart = this.share(chapter.start) * 100 + '%';
          return mark;
        }),
      );
    }

    update() {
      const {player, range} = this,
        duration = player.duration;
      if (Number(range.max) !== duration) {
        range.max = String(duration || 1);
        this.drawMarks();
      }
      if (!this.isDragged) range.value = player.time;
      const shown = Number(range.value),
        chapter = this.chapterAt(shown);
      this.bar.style.setProperty('--done', this.share(shown) * 100 + '%');
      const place = say('timeOf', {time: Olive.spokenTime(shown), total: Olive.spokenTime(duration)});
      range.setAttribute('aria-valuetext', place + (chapter ? ', ' + chapter.title : ''));
    }

    point(event) {
      const {bubble, player} = this,
        box = this.range.getBoundingClientRect();
      const part = clamp((event.clientX - box.left) / box.width, 0, 1);
      const seconds = part * player.duration,
        chapter = this.chapterAt(seconds);
      bubble.replaceChildren(
        ...(chapter?.picture ? [Olive.picture(chapter.picture, {loading: 'eager'})] : []),
        ...(chapter ? [make('span', {class: 'bubble-title', dir: 'auto', text: chapter.title})] : []),
        make('span', {text: clock(seconds)}),
      );
      bubble.hidden = !player.duration;
      const half = bubble.offsetWidth / 2;
      bubble.style.left = clamp(part * box.width, half, box.width - half) + 'px';
    }
  }

  Olive.SeekBar = SeekBar;
})(window.Olive);
