// SPDX-License-Identifier: Apache-2.0
// The stage takes the shape of what it shows; the style sheet makes it as large as the window allows.
'use strict';

((Olive) => {
  const kUsual = 16 / 9;
  const [kNarrowest, kWidest] = [0.4, 4];

  // Width by height of a source's picture, as far as the package tells.
  Olive.ratioOf = (source) => {
    const told = [...source.files, ...source.previews].find((each) => each.width > 0 && each.height > 0);
    return told ? told.width / told.height : kUsual;
  };

  // Width by height of an element that shows a picture, once its file is known; else what was told.
  Olive.shownRatio = (element, told) => {
    const width = element.videoWidth || element.naturalWidth,
      height = element.videoHeight || element.naturalHeight;
    return width && height ? width / height : told;
  };

  Olive.setShape = (stage, ratio) => {
    stage.style.setProperty('--ratio', Olive.clamp(ratio || kUsual, kNarrowest, kWidest).toFixed(4));
  };
})(window.Olive);
