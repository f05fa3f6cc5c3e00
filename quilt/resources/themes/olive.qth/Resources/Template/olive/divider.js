// SPDX-License-Identifier: Apache-2.0
// What lies between two pictures that stand side by side: dragged, moved by keys, or pressed for the next division.
'use strict';

((Olive) => {
  const {make, say, clamp} = Olive;
  const [kLeast, kMost, kStep] = [20, 80, 5]; // percent
  const kDrag = 4; // pixels that a press may wander

  // value(): the left picture's share in percent; set(percent); usual: where presses lead, in order.
  Olive.makeDivider = ({value, set, usual}) => {
    const divider = make('div', {
      class: 'divider',
      role: 'separator',
      tabindex: 0,
      'aria-orientation': 'vertical',
      'aria-label': say('divider'),
      'aria-valuemin': kLeast,
      'aria-valuemax': kMost,
      title: say('divider'),
    });
    const move = (percent) => set(Math.round(clamp(percent, kLeast, kMost)));
    const next = () => move(usual().find((each) => each > value() + 1) ?? usual()[0]);

    divider.addEventListener('keydown', (event) => {
      const step = {ArrowLeft: -kStep, ArrowRight: kStep, ArrowUp: -kStep, ArrowDown: kStep}[event.key];
      if (step) move(value() + step);
      else if (event.key === 'Home') move(kLeast);
      else if (event.key === 'End') move(kMost);
      else if (event.key === 'Enter' || event.key === ' ') next();
      else return;
      event.preventDefault();
      event.stopPropagation();
    });
    divider.addEventListener('pointerdown', (event) => {
      event.preventDefault();
      divider.setPointerCapture(event.pointerId);
      const box = divider.parentNode.getBoundingClientRect();
      let isDragged = false;
      const drag = (moved) => {
        isDragged = isDragged || Math.abs(moved.clientX - event.clientX) > kDrag;
        if (isDragged) move(((moved.clientX - box.left) / box.width) * 100);
      };
      const end = () => {
        divider.removeEventListener('pointermove', drag);
        if (!isDragged) next();
      };
      divider.addEventListener('pointermove', drag);
      divider.addEventListener('lostpointercapture', end, {once: true});
    });
    return divider;
  };
})(window.Olive);
