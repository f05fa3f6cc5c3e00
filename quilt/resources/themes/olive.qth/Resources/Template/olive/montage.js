// SPDX-License-Identifier: Apache-2.0
// A montage: stills that follow a voice, or the clock where there is none.
'use strict';

((Olive) => {
  const {make, say} = Olive;

  // Two images that take turns, so that one fades into the other.
  class Stills {
    constructor(stills, player) {
      this.stills = stills;
      this.player = player;
      this.shown = -1;
      this.front = 0;
      this.images = [0, 1].map(() => make('img', {alt: '', draggable: 'false'}));
      this.caption = make('p', {class: 'caption', dir: 'auto'});
      this.next = new Image();
      this.element = make('div', {class: 'stills'}, this.images);
      for (const image of this.images) image.addEventListener('error', () => this.replace(image));
      player.addEventListener('time', () => this.follow());
    }

    address(index) {
      return Olive.stillAddress(this.stills[index].source, Olive.pixelsAcross(this.element));
    }

    follow() {
      const {stills, images, caption} = this;
      const index = Math.max(0, stills.filter((still) => still.start <= this.player.time + 0.01).length - 1);
      if (index === this.shown || !stills.length) return;
      this.shown = index;
      this.front = 1 - this.front;
      const image = images[this.front],
        behind = images[1 - this.front];
      image.alt = stills[index].title;
      image.src = this.address(index);
      image.classList.add('front');
      behind.classList.remove('front');
      behind.alt = '';
      caption.textContent = stills[index].source.title;
      caption.dataset.captionOf = stills[index].source.id;
      if (stills[index + 1]) this.next.src = this.address(index + 1);
    }

    // A file that cannot be drawn gives way to its preview.
    replace(image) {
      const spare = this.stills[this.shown]?.picture;
      if (spare && !image.src.endsWith(spare)) image.src = spare;
      else if (image === this.images[this.front]) this.caption.textContent = say('cannotShow');
    }
  }

  Olive.stages.Montage = (item, context) => {
    const parts = item.commentary ? [{source: item.commentary, kind: 'audio', leads: true}] : [];
    let stills;
    const stage = Olive.timedStage(item, context, parts, {
      content(elements, player) {
        stills = new Stills(item.chapters, player);
        return [stills.element, stills.caption, elements];
      },
      chapters: item.chapters,
      cover: false,
      ratio: item.sources.length ? Olive.ratioOf(item.sources[0]) : 0,
      runsAlone: true,
    });
    queueMicrotask(() => stills.follow());
    return stage;
  };
})(window.Olive);
