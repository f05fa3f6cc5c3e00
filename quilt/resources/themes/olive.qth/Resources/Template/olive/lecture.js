// SPDX-License-Identifier: Apache-2.0
// Two sources shown together, such as a speaker and slides. One of them may be a voice alone: then there is one picture.
'use strict';

((Olive) => {
  const {make} = Olive;
  const kSilentShare = 67; // percent of the width for the picture that says nothing: slides

  const isTimed = (source) => source.category === 'Movie' || source.category === 'Audio';
  const isSeen = (source) => source.category !== 'Audio';

  // A source that stands still: its pages or pictures, by their time codes.
  function makeStills(source) {
    const pictures = source.previews;
    const image = make('img', {alt: '', draggable: 'false', src: pictures[0]?.picture});
    return {
      element: image,
      follow(time) {
        const begun = pictures.filter((preview) => preview.start !== null && preview.start <= time);
        const current = begun.pop() || pictures[0];
        if (current && image.getAttribute('src') !== current.picture) image.src = current.picture;
      },
    };
  }

  // The stage of a lecture of which only one source can be seen.
  function oneSeen(item, context, parts, seen) {
    return Olive.timedStage(item, context, parts, {
      content(elements, player) {
        if (isTimed(seen)) return elements;
        const stills = makeStills(seen);
        player.addEventListener('time', () => stills.follow(player.time));
        return [make('div', {class: 'pane whole'}, stills.element), elements];
      },
      chapters: item.chapters,
      cover: false,
      ratio: Olive.ratioOf(seen),
      keepsShape: true,
    });
  }

  function bothSeen(item, context, parts, leader) {
    const [first, second] = item.sources;
    const panes = [],
      shown = [];
    /** @type {InstanceType<typeof Olive.Arrangement>} */
    let arrangement;
    let player;

    function content(elements, made) {
      player = made;
      [first, second].forEach((source, i) => {
        const at = parts.findIndex((part) => part.source === source);
        const stills = at < 0 ? makeStills(source) : null;
        if (stills) player.addEventListener('time', () => stills.follow(player.time));
        shown.push(stills ? stills.element : elements[at]);
        panes.push(make('div', {class: 'pane', 'data-source': i + 1}, shown[i]));
      });
      arrangement = new Olive.Arrangement({
        panes,
        ratioOf: (i) => Olive.shownRatio(shown[i], Olive.ratioOf(i ? second : first)),
        share: leader === first ? 100 - kSilentShare : kSilentShare,
        memory: context.memory,
        onHide(i, isHidden) {
          const stream = player.streams.find((each) => panes[i].contains(each.element));
          if (stream) player.enable(stream, !isHidden);
        },
        onChange: context.note,
      });
      for (const node of shown) {
        for (const event of ['loadedmetadata', 'load']) node.addEventListener(event, arrangement.fit);
      }
      return arrangement.element;
    }

    const stage = Olive.timedStage(item, context, parts, {
      content,
      chapters: item.chapters,
      cover: false,
      extras: () => [arrangement.controls],
      choosers: () => [arrangement.chooser.element],
      ratio: Math.max(Olive.ratioOf(first), Olive.ratioOf(second)),
      keepsShape: true,
    });
    const close = stage.close;
    stage.view = arrangement;
    stage.close = () => {
      arrangement.close();
      for (const node of shown) {
        for (const event of ['loadedmetadata', 'load']) node.removeEventListener(event, arrangement.fit);
      }
      close();
    };
    arrangement.set(context.start.view || context.memory.choice('view', 'side'));
    return stage;
  }

  Olive.stages.DualSource = (item, context) => {
    if (item.sources.length < 2)
      return Olive.stages[item.sources[0].category === 'Audio' ? 'Audio' : 'Movie'](item, context);
    const sources = item.sources.slice(0, 2);
    const timed = sources.filter(isTimed),
      seen = sources.filter(isSeen);
    if (!timed.length) return Olive.stages.Image(item, context);
    const leader = timed.find((source) => source.hasSound) || timed[0];
    const parts = timed.map((source) => ({
      source,
      kind: isSeen(source) ? 'video' : 'audio',
      offset: source.start || 0,
      leads: source === leader,
      poster: source.previews[0]?.picture,
    }));
    if (!seen.length) return Olive.stages.Audio(item, context);
    return seen.length === 1 ? oneSeen(item, context, parts, seen[0]) : bothSeen(item, context, parts, leader);
  };
})(window.Olive);
