// SPDX-License-Identifier: Apache-2.0
// A picture to look at closely: fitted, zoomed by buttons, keys, wheel or double click, moved by dragging or scrolling.
'use strict';

((Olive) => {
  const {make, say, clamp} = Olive;
  const kSteps = [1, 1.25, 1.5, 2, 3, 4, 6, 8];

  // Returns {element, tools, show(path, {label, width, height, better}), zoomBy(step), fit(), onFail}.
  // `better` is a larger file of the same picture, taken when it is zoomed.
  Olive.makeSheet = () => {
    let picture = null,
      better = '',
      factor = 1,
      size = {width: 0, height: 0};
    const pane = make('div', {class: 'sheet', tabindex: 0, role: 'group'});
    const level = make('span', {class: 'level'});
    const sheet = /** @type {ReturnType<typeof Olive.makeSheet>} */ ({
      element: pane,
      onFail: () => {},
      onSize: (_width, _height) => {},
    });

    function place() {
      if (!picture) return;
      const width = size.width || picture.naturalWidth,
        height = size.height || picture.naturalHeight;
      if (!width || !height) return;
      const margin = 2 * Number.parseFloat(getComputedStyle(pane).paddingTop);
      const fitted = Math.min((pane.clientWidth - margin) / width, (pane.clientHeight - margin) / height);
      picture.style.width = width * fitted * factor + 'px';
      picture.style.height = height * fitted * factor + 'px';
      pane.classList.toggle('zoomed', factor > 1);
      level.textContent = Olive.number(factor * 100) + ' %';
    }

    function zoomTo(value, x, y) {
      if (!picture) return;
      const box = pane.getBoundingClientRect();
      const at = {x: x === undefined ? box.width / 2 : x - box.left, y: y === undefined ? box.height / 2 : y - box.top};
      const before = factor;
      factor = clamp(value, 1, kSteps[kSteps.length - 1]);
      const left = ((pane.scrollLeft + at.x) * factor) / before - at.x,
        top = ((pane.scrollTop + at.y) * factor) / before - at.y;
      if (factor > 1 && better) {
        picture.src = better;
        better = '';
      }
      place();
      pane.scrollTo({left, top, behavior: 'instant'});
    }

    sheet.zoomBy = (step) => {
      const next =
        step > 0
          ? kSteps.find((value) => value > factor + 0.01)
          : kSteps.filter((value) => value < factor - 0.01).pop();
      zoomTo(next || (step > 0 ? kSteps[kSteps.length - 1] : 1));
      Olive.announce(say('zoomNow', {percent: Olive.number(factor * 100)}));
    };
    sheet.fit = () => zoomTo(1);
    sheet.isZoomed = () => factor > 1;

    sheet.show = (path, {label, width, height, larger}) => {
      better = larger || '';
      size = {width: width || 0, height: height || 0};
      factor = 1;
      picture = make('img', {alt: label, draggable: 'false', decoding: 'async'});
      const mine = picture;
      picture.addEventListener('load', () => {
        place();
        if (picture === mine && factor === 1) sheet.onSize(mine.naturalWidth, mine.naturalHeight);
      });
      picture.addEventListener('error', () => {
        if (picture === mine) sheet.onFail();
      });
      picture.src = path;
      pane.setAttribute('aria-label', label);
      pane.replaceChildren(picture);
      place();
    };

    pane.addEventListener('dblclick', (event) => zoomTo(factor > 1 ? 1 : 2, event.clientX, event.clientY));
    pane.addEventListener(
      'wheel',
      (event) => {
        if (!event.ctrlKey) return;
        event.preventDefault();
        zoomTo(factor * Math.exp(-event.deltaY / 300), event.clientX, event.clientY);
      },
      {passive: false},
    );
    pane.addEventListener('pointerdown', (event) => {
      if (event.button || event.pointerType === 'touch' || factor === 1) return;
      pane.setPointerCapture(event.pointerId);
      const start = {x: event.clientX + pane.scrollLeft, y: event.clientY + pane.scrollTop};
      const move = (moved) =>
        pane.scrollTo({left: start.x - moved.clientX, top: start.y - moved.clientY, behavior: 'instant'});
      const end = () => pane.removeEventListener('pointermove', move);
      pane.addEventListener('pointermove', move);
      pane.addEventListener('pointerup', end, {once: true});
      pane.addEventListener('pointercancel', end, {once: true});
    });
    const watcher = new ResizeObserver(place);
    watcher.observe(pane);
    sheet.close = () => watcher.disconnect();

    sheet.tools = make(
      'div',
      {class: 'tools', role: 'group', 'aria-label': say('zoom')},
      Olive.iconButton('minus', say('zoomOut'), () => sheet.zoomBy(-1)),
      level,
      Olive.iconButton('plus', say('zoomIn'), () => sheet.zoomBy(1)),
      Olive.iconButton('fit', say('fit'), sheet.fit, {class: 'icon-button fit'}),
    );
    return sheet;
  };
})(window.Olive);
