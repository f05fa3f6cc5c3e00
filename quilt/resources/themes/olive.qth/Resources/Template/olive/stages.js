// SPDX-License-Identifier: Apache-2.0
// What an item looks like on the stage, by its category. A stage is {element, controls, player, transport, pager, sheet,
// view, toggleText, close}:
// player is a Player or null; pager {count, index, go(index)} or null; view {value, set(name), swap()} of two pictures.
'use strict';

((Olive) => {
  const {make, say} = Olive;
  Olive.stages = {};

  Olive.bestFile = (item) => {
    const files = item.sources.flatMap((source) => source.files).filter((file) => file.address);
    return files[0] || null;
  };

  Olive.posterOf = (item) => item.poster || item.sources[0]?.previews[0]?.picture || '';

  // The voice that an author added to a movie: heard instead of the movie's own sound, until it ends.
  function commentarySwitch(player) {
    const voice = player.streams[player.streams.length - 1],
      own = player.leader;
    player.enable(voice, false);
    const toggle = () => {
      const isOn = player.leader !== voice;
      player.lead(isOn ? voice : own);
      if (!isOn) player.enable(voice, false);
      button.setAttribute('aria-pressed', String(isOn));
      Olive.announce(say(isOn ? 'commentaryOn' : 'commentaryOff'));
    };
    const button = Olive.iconButton('voice', say('commentary'), toggle, {'aria-pressed': 'false'});
    return button;
  }

  Olive.stages.Movie = (item, context) => {
    const [film] = item.sources;
    /** @type {Parameters<typeof Olive.timedStage>[2]} */
    const parts = [{source: film, kind: 'video', leads: true, speaksAgain: true}];
    if (item.commentary) parts.push({source: item.commentary, kind: 'audio'});
    return Olive.timedStage(item, context, parts, {
      content: ([video]) => video,
      chapters: item.chapters,
      extras: (player) => (item.commentary ? [commentarySwitch(player)] : []),
      ratio: Olive.ratioOf(film),
    });
  };

  Olive.stages.Audio = (item, context) => {
    const poster = Olive.posterOf(item);
    return Olive.timedStage(item, context, [{source: item.sources[0], kind: 'audio', leads: true}], {
      content: ([audio]) => [
        make(
          'div',
          {class: 'record'},
          poster ? Olive.picture(poster, {loading: 'eager'}, () => Olive.icon('Audio')) : Olive.icon('Audio'),
        ),
        audio,
      ],
      cover: false,
    });
  };

  Olive.stages.Web = (item, context) => {
    const address = item.link;
    const shown = address?.replace(/^https?:\/\//, '').replace(/\/$/, '');
    const link = {
      class: 'primary',
      href: address,
      target: '_blank',
      rel: 'noopener noreferrer',
      onclick: () => context.memory.keep(item, {done: true}),
    };
    const element = make(
      'div',
      {class: 'stage web'},
      make(
        'div',
        {class: 'web-card'},
        Olive.icon('Web'),
        make('p', {class: 'web-title', dir: 'auto', 'data-title-of': item.id, text: item.title}),
        address && make('p', {class: 'web-address', dir: 'ltr', text: shown}),
        address ? make('a', link, say('openLink'), Olive.icon('open')) : make('p', {text: say('badLink')}),
        address && make('p', {class: 'badge', text: say('needsInternet')}),
      ),
    );
    return {element, controls: null, player: null, close() {}};
  };

  function emptyStage(item) {
    const message = Olive.makeMessage(say('nothingToShow'), Olive.bestFile(item), null);
    return {element: make('div', {class: 'stage'}, message), controls: null, player: null, close() {}};
  }

  // context: {memory, start: {t, page, view, play}, frameButtons(), frameActions(elements), listenToGestures(element, stage),
  // note(), focus(), again(), terms(), onPage(index)}
  Olive.makeStage = (item, context) => {
    const kind =
      item.sources.length && Object.hasOwn(Olive.stages, item.category) ? Olive.stages[item.category] : emptyStage;
    return kind(item, context);
  };
})(window.Olive);
