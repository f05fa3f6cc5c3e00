// SPDX-License-Identifier: Apache-2.0
// Shows every item of the package, one below the other. All text goes in as text, never as HTML.
'use strict';

function element(name, text) {
  const made = document.createElement(name);
  if (text) made.textContent = text;
  return made;
}

// A path inside the package as an address: each part is encoded, so that any file name works.
function address(path) {
  return path.split('/').map(encodeURIComponent).join('/');
}

// The file to show of a source: the best grade comes first.
function fileOf(source) {
  const files = source.Derivatives || [];
  for (const grade of ['Desktop', '720p', '480p'])
    for (const file of files) if ((file.CompatibilityTags || []).includes(grade)) return file;
  return files[0];
}

function view(source, title) {
  const file = fileOf(source);
  if (!file) return element('p', 'There is nothing to show.');
  if (source.ContentCategory === 'Web') {
    // Anything but a web address is shown, and cannot be followed.
    if (!/^https?:/i.test(file.URL)) return element('p', file.URL);
    const link = element('a', file.URL);
    link.href = file.URL;
    return link;
  }
  const place = address(file.RelativePath);
  if (source.ContentCategory === 'Movie' || source.ContentCategory === 'Audio') {
    const player = element(source.ContentCategory === 'Movie' ? 'video' : 'audio');
    player.controls = true;
    player.preload = 'metadata';
    player.src = place;
    return player;
  }
  if (source.ContentCategory === 'Image') {
    const image = element('img');
    image.alt = title;
    image.src = place;
    return image;
  }
  const link = element('a', 'Open ' + file.Filename);
  link.href = place;
  return link;
}

function section(item) {
  const title = item.Title || 'Untitled';
  const made = element('section');
  made.append(element('h2', title));
  if (item.Description) made.append(element('p', item.Description));
  for (const source of item.Sources || []) made.append(view(source, source.Title || title));
  if (item.AudioCommentarySource) made.append(view(item.AudioCommentarySource, title));
  for (const extra of item.Extras || []) made.append(view(extra, extra.Title || title));
  return made;
}

document.title = appData.Title || 'Plain';
document.getElementById('title').textContent = document.title;
document.getElementById('author').textContent = appData.Author || '';
for (const item of appData.Media || []) document.getElementById('items').append(section(item));
