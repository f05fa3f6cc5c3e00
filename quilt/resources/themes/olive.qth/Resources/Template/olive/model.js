// SPDX-License-Identifier: Apache-2.0
// Reads appData into what the views need. Values of the wrong kind count as missing, unknown keys are passed over, and
// only files inside the package and addresses that may be followed come out.
'use strict';

((Olive) => {
  const kNoTimecode = 3.4028234663852886e38;
  const kStillSeconds = 5;
  const kGrades = ['Desktop', '720p', '480p'];
  const kCategories = ['Movie', 'Audio', 'Image', 'Document', 'Web', 'Montage', 'DualSource'];

  const text = (value) => (typeof value === 'string' ? value : '');
  const named = (value) => (text(value).trim() ? text(value) : ''); // blanks are no title
  const number = (value) => (typeof value === 'number' && Number.isFinite(value) ? value : 0);
  const list = (value) => (Array.isArray(value) ? value.filter((entry) => entry && typeof entry === 'object') : []);
  const time = (value) => (typeof value === 'number' && value >= 0 && value < kNoTimecode ? value : null);
  const date = (value) => (text(value) && !Number.isNaN(Date.parse(value)) ? new Date(value) : null);

  // The address of a file of the package, each path component encoded; '' for a path that leaves it.
  function packageAddress(path) {
    const parts = text(path).split('/');
    if (!parts[0] || parts.some((part) => part === '..')) return '';
    return parts.map(encodeURIComponent).join('/');
  }

  function readFile(record) {
    return {
      address: packageAddress(record.RelativePath),
      link: record.RelativePath ? null : Olive.safeAddress(text(record.URL)),
      name: text(record.Filename),
      mime: text(record.MimeType),
      grades: kGrades.filter(
        (grade) => Array.isArray(record.CompatibilityTags) && record.CompatibilityTags.includes(grade),
      ),
      width: number(record.Width),
      height: number(record.Height),
      duration: number(record.Duration),
      megaBytes: number(record.TotalSizeInMegaBytes),
    };
  }

  function readPreview(record) {
    return {
      title: named(record.Title),
      text: text(record.Content),
      start: time(record.Timecode),
      picture: packageAddress(record.RelativePath),
      width: number(record.Width),
      height: number(record.Height),
      index: number(record.Index),
    };
  }

  function readSource(record) {
    return {
      record,
      id: text(record.UUID),
      category: text(record.ContentCategory),
      ...wordsOfSource(record),
      start: time(record.Timecode),
      files: list(record.Derivatives).map(readFile),
      previews: list(record.Previews)
        .map(readPreview)
        .sort((a, b) => a.index - b.index),
      hasSound: !!record.AudioSamples,
    };
  }

  function wordsOfSource(record) {
    const title = named(record.Title),
      description = text(record.Description);
    return {title, description: description === title ? '' : description};
  }

  const longest = (source) => Math.max(0, ...source.files.map((file) => file.duration));

  const titleOfStill = (source, index) => source.title || Olive.say('still', {n: index + 1});

  // The stills of a montage on its time line; those without a timecode share what time there is.
  function stillsOf(item) {
    const told = item.commentary ? longest(item.commentary) : 0;
    const each =
      told && !item.sources.some((source) => source.start !== null) ? told / item.sources.length : kStillSeconds;
    let next = 0;
    return item.sources
      .map((source, i) => {
        const start = source.start === null ? next : source.start;
        next = start + each;
        return {
          title: titleOfStill(source, i),
          start,
          picture: source.previews.length ? source.previews[0].picture : '',
          source,
        };
      })
      .sort((a, b) => a.start - b.start);
  }

  // Where the item can be entered: chapters of its first source that has some, or the stills of a montage.
  function chaptersOf(item) {
    if (item.category === 'Montage') return stillsOf(item);
    if (item.category !== 'Movie' && item.category !== 'DualSource') return [];
    const source = item.sources.find(
      (each) => each.category === 'Movie' && each.previews.some((preview) => preview.start !== null),
    );
    if (!source) return [];
    return source.previews
      .filter((preview) => preview.start !== null)
      .map((preview, i) => ({
        title: preview.title || Olive.say('chapter', {n: i + 1}),
        start: preview.start + (item.category === 'DualSource' ? source.start || 0 : 0),
        picture: preview.picture,
      }))
      .sort((a, b) => a.start - b.start);
  }

  const wordsOfItem = (record, index, sources) => ({
    title: named(record.Title) || sources[0]?.title || Olive.say('untitled', {n: index + 1}),
    description: text(record.Description),
  });
  const wordsOfPackage = (data) => ({
    title: named(data.Title),
    description: text(data.Description),
    author: text(data.Author),
  });

  function readItem(record, index) {
    const sources = list(record.Sources).map(readSource);
    const category = kCategories.includes(record.ContentCategory)
      ? record.ContentCategory
      : sources.length
        ? sources[0].category
        : '';
    const first = sources[0]?.files[0];
    const item = {
      record,
      id: text(record.UUID) || 'item-' + index,
      index,
      category,
      ...wordsOfItem(record, index, sources),
      poster: number(record.PosterImageWidth) > 0 ? packageAddress(record.PosterImagePath) : '',
      sources,
      extras: list(record.Extras).map(readSource),
      commentary:
        record.AudioCommentarySource && typeof record.AudioCommentarySource === 'object'
          ? readSource(record.AudioCommentarySource)
          : null,
      link: category === 'Web' && first ? first.link : null,
      pages: category === 'Document' && sources[0] ? sources[0].previews : [],
      chapters: [],
      duration: 0,
    };
    item.chapters = chaptersOf(item);
    item.duration = durationOf(item);
    return item;
  }

  function durationOf(item) {
    if (item.category === 'DualSource')
      return Math.max(0, ...item.sources.map((source) => longest(source) + (source.start || 0)));
    if (item.category === 'Montage') {
      const last = item.chapters[item.chapters.length - 1];
      return (item.commentary && longest(item.commentary)) || (last ? last.start + kStillSeconds : 0);
    }
    return item.sources[0] && ['Movie', 'Audio'].includes(item.category) ? longest(item.sources[0]) : 0;
  }

  Olive.readPackage = (data) => {
    const owner = data.CollectionOwner && typeof data.CollectionOwner === 'object' ? data.CollectionOwner : {};
    return {
      record: data,
      id: text(data.UUID) || 'package',
      ...wordsOfPackage(data),
      keywords: text(data.Keywords),
      category: text(data.Category),
      advisory: text(data.AdvisoryLabel),
      modified: date(data.ModifiedDate),
      collection: text(owner.Title),
      // The artwork is written whenever the package has a poster, also when that is a placeholder without a file.
      poster: text(data.PosterImagePath) ? 'JukeboxArtwork' : '',
      items: list(data.Media).map(readItem),
    };
  };

  // Everything of an item that has files of its own.
  Olive.partsOf = (item) => [...item.sources, item.commentary, ...item.extras].filter(Boolean);

  // Reads titles, descriptions and the author again, after they changed in the records.
  Olive.rereadWords = (pack) => {
    Object.assign(pack, wordsOfPackage(pack.record));
    for (const item of pack.items) {
      for (const part of Olive.partsOf(item)) Object.assign(part, wordsOfSource(part.record));
      Object.assign(item, wordsOfItem(item.record, item.index, item.sources));
      if (item.category === 'Montage')
        for (const still of item.chapters) still.title = titleOfStill(still.source, item.sources.indexOf(still.source));
    }
  };

  // What a browser can draw in an <img>.
  Olive.isPicture = (file) =>
    /^image\/(jpeg|png|gif|bmp|x-ms-bmp|webp|avif|svg\+xml)$/.test(file.mime) ||
    /\.(jpe?g|png|gif|bmp|webp|avif)$/i.test(file.name);
})(window.Olive);
