// SPDX-License-Identifier: Apache-2.0
// A voice over pictures that stand still by themselves: the author's commentary on an image or a document.
'use strict';

((Olive) => {
  // Adds the item's voice to a stage with a sheet; onTime(player) follows it.
  Olive.voiceOver = (item, context, stage, onTime) => {
    if (!item.commentary) return stage;
    const voice = [{source: item.commentary, kind: 'audio', leads: true}];
    const spoken = Olive.timedStage({...item, duration: 0}, context, voice, {
      content: (elements) => elements,
      host: stage.sheet.element.parentElement,
    });
    spoken.player.addEventListener('time', () => onTime(spoken.player));
    stage.player = spoken.player;
    stage.transport = spoken.transport;
    stage.controls.prepend(spoken.controls);
    const closePictures = stage.close;
    stage.close = () => {
      closePictures();
      spoken.close();
    };
    return stage;
  };
})(window.Olive);
