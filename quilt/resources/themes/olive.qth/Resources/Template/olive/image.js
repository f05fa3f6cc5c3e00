// SPDX-License-Identifier: Apache-2.0
// A picture to look at.
'use strict';

((Olive) => {
  const {make, say} = Olive;

  Olive.stages.Image = (item, context) => {
    const source = item.sources[0];
    const sheet = Olive.makeSheet();
    const element = make('div', {class: 'stage image'}, sheet.element);
    const spare = source.previews[0]?.picture || '';
    const complain = () => element.append(Olive.makeMessage(say('cannotShow'), Olive.bestFile(item), context.again));
    const stage = {
      element,
      sheet,
      controls: make(
        'div',
        {class: 'controls'},
        make(
          'div',
          {class: 'buttons'},
          sheet.tools,
          make('span', {class: 'gap'}),
          item.commentary ? [] : context.frameMenu(),
        ),
      ),
      player: null,
      close: sheet.close,
    };
    Olive.setShape(element, Olive.ratioOf(source));
    sheet.onSize = (width, height) => Olive.setShape(element, width / height);
    context.listenToGestures(element, stage);
    queueMicrotask(() => {
      const file = Olive.pictureFile(source, Olive.pixelsAcross(element)),
        larger = Olive.pictureFile(source, Number.POSITIVE_INFINITY);
      const label = item.description || item.title;
      sheet.onFail = () => {
        sheet.onFail = complain;
        if (spare && file) sheet.show(spare, {label});
        else complain();
      };
      if (!file && !spare) return complain();
      sheet.show(file ? file.address : spare, {
        label,
        width: file?.width,
        height: file?.height,
        larger: larger && larger !== file ? larger.address : '',
      });
      context.memory.keep(item, {done: true});
    });
    return Olive.voiceOver(item, context, stage, () => {});
  };
})(window.Olive);
