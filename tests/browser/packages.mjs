// SPDX-License-Identifier: Apache-2.0
// Makes finished packages as finalizing leaves them: the theme's template, "controllers/data.js" and the media in their
// folders. Media are drawn by the ffmpeg program, once per build folder.
import {execFileSync} from 'node:child_process';
import {createHash} from 'node:crypto';
import {
  copyFileSync,
  cpSync,
  existsSync,
  mkdirSync,
  readFileSync,
  renameSync,
  rmSync,
  statSync,
  writeFileSync,
} from 'node:fs';
import {basename, dirname, extname, join, relative} from 'node:path';
import {fileURLToPath} from 'node:url';

const kNoTimecode = 3.4028234663852886e38;
export const kTemplate = join(
  dirname(fileURLToPath(import.meta.url)),
  '../../quilt/resources/themes/olive.qth/Resources/Template',
);

/// A UUID that is the same in every run for the same name.
export function uuid(name) {
  const digits = createHash('sha256').update(name).digest('hex').toUpperCase();
  return [
    digits.slice(0, 8),
    digits.slice(8, 12),
    '4' + digits.slice(13, 16),
    'A' + digits.slice(17, 20),
    digits.slice(20, 32),
  ].join('-');
}

/// Media files by name, made on first use in the folder.
export class Media {
  constructor(folder) {
    this.folder = folder;
    mkdirSync(folder, {recursive: true});
  }

  made(name, options) {
    const path = join(this.folder, name);
    if (!existsSync(path)) {
      const part = join(this.folder, 'part-' + name);
      execFileSync('ffmpeg', ['-v', 'error', '-y', ...options, part], {stdio: ['ignore', 'inherit', 'inherit']});
      renameSync(part, path);
    }
    return path;
  }

  /// A film whose picture tells its time by a growing bar; sound unless silent.
  movie(name, {seconds = 12, size = '640x360', colour = '0x4a5a1c', rate = 25, silent = false, tone = 330} = {}) {
    const width = Number(size.split('x')[0]);
    const picture = `color=c=${colour}:s=${size}:r=${rate}:d=${seconds}`;
    const bar =
      'drawgrid=w=iw/8:h=ih/6:t=1:c=white@0.14,drawbox=x=0:y=ih*0.86:w=iw:h=ih*0.05:c=black@0.35:t=fill,' +
      'drawbox=x=iw*0.06:y=ih*0.2:w=iw*0.3:h=ih*0.42:c=white@0.16:t=fill';
    return this.made(name, [
      '-f',
      'lavfi',
      '-i',
      picture,
      ...(silent ? [] : ['-f', 'lavfi', '-i', `sine=f=${tone}:d=${seconds}`]),
      '-f',
      'lavfi',
      '-i',
      `color=c=0xd3e07c:s=${width}x8:r=${rate}:d=${seconds}`,
      '-filter_complex',
      `[0]${bar}[a];[a][${silent ? 1 : 2}]overlay=x='-w+w*t/${seconds}':y=H*0.88[v]`,
      '-map',
      '[v]',
      ...(silent ? [] : ['-map', '1:a']),
      '-c:v',
      'libx264',
      '-preset',
      'ultrafast',
      '-crf',
      '30',
      '-pix_fmt',
      'yuv420p',
      '-g',
      String(rate),
      '-c:a',
      'aac',
      '-b:a',
      '64k',
      '-movflags',
      '+faststart',
      '-shortest',
    ]);
  }

  sound(name, {seconds = 20, tone = 220} = {}) {
    return this.made(name, [
      '-f',
      'lavfi',
      '-i',
      `sine=f=${tone}:d=${seconds}`,
      '-c:a',
      'aac',
      '-b:a',
      '48k',
      '-movflags',
      '+faststart',
    ]);
  }

  /// A quiet landscape: a gradient, a sun and hills.
  picture(name, {size = '1280x720', from = '0xdfe3b4', to = '0x55641a', sun = '0xf7f3d0', seed = 3} = {}) {
    const curve = `lt(Y\\,H*(0.62+0.1*sin(X/W*${2 + seed}+${seed})))`;
    const near = `lt(Y\\,H*(0.8+0.07*sin(X/W*${4 + seed}+${seed * 2})))`;
    const [r1, g1, b1] = channels(from),
      [r2, g2, b2] = channels(to),
      [r3, g3, b3] = channels(sun);
    const plane = (a, b, c) =>
      `if(${curve}\\,if(lt(hypot(X-W*0.7\\,Y-H*0.3)\\,H*0.12)\\,${c}\\,${a}-(${a}-${b})*Y/H*0.5)\\,if(${near}\\,${b}*0.9\\,${b}*0.55))`;
    return this.made(name, [
      '-f',
      'lavfi',
      '-i',
      `nullsrc=s=${size}:d=1:r=1`,
      '-frames:v',
      '1',
      '-vf',
      `format=gbrp,geq=r='${plane(r1, r2, r3)}':g='${plane(g1, g2, g3)}':b='${plane(b1, b2, b3)}'`,
    ]);
  }

  /// A page of a document: lines of ink on paper.
  page(name, number) {
    const lines = [];
    for (let row = 0; row < 18; ++row)
      lines.push(
        `drawbox=x=110:y=${250 + row * 42}:w=${520 + ((row * 37 + number * 53) % 160)}:h=12:c=0x8a8c7b:t=fill`,
      );
    return this.made(name, [
      '-f',
      'lavfi',
      '-i',
      'color=c=white:s=900x1164:d=1:r=1',
      '-frames:v',
      '1',
      '-vf',
      `drawbox=x=110:y=110:w=${300 + ((number * 71) % 300)}:h=44:c=0x55641a:t=fill,drawbox=x=110:y=180:w=240:h=16:c=0xb9bba8:t=fill,${lines.join(',')}`,
    ]);
  }

  text(name, content) {
    const path = join(this.folder, name);
    writeFileSync(path, content);
    return path;
  }
}

function channels(colour) {
  return [2, 4, 6].map((at) => Number.parseInt(colour.slice(at, at + 2), 16));
}

const kMimes = {
  '.mp4': 'video/mp4',
  '.m4v': 'video/x-m4v',
  '.m4a': 'audio/mp4',
  '.jpg': 'image/jpeg',
  '.png': 'image/png',
  '.pdf': 'application/pdf',
};

/// Writes a package to the folder. media: items of
///   {category, title, description, poster, sources: [source], extras: [source], commentary: source}
/// with a source {category, title, timecode, hasSound, files: [{path, tags, width, height, duration, missing, name, url}],
/// previews: [{path, title, text, timecode}]}.
export function makePackage(folder, {title, description, author, media, poster, collection, id = title}) {
  rmSync(folder, {recursive: true, force: true});
  mkdirSync(folder, {recursive: true});
  cpSync(kTemplate, folder, {recursive: true});

  const place = (path, target, missing) => {
    if (missing) return;
    mkdirSync(dirname(target), {recursive: true});
    copyFileSync(path, target);
  };
  const relativePath = (target) => relative(folder, target);

  function sourceRecord(source, base, name) {
    const identity = uuid(name);
    const home = join(base, identity);
    const record = {UUID: identity};
    if (source.category) record.ContentCategory = source.category;
    record.Derivatives = (source.files || []).map((file, i) => {
      if (file.url)
        return {
          UUID: uuid(name + i),
          URL: file.url,
          ContentType: 'public.url',
          CompatibilityTags: ['Desktop'],
          IsFlattened: true,
          TotalSizeInMegaBytes: 0,
          Height: 0,
          Width: 0,
          Duration: 0,
        };
      const target = join(home, 'derivatives', file.name || uuid(name + i) + extname(file.path));
      place(file.path, target, file.missing);
      return {
        UUID: uuid(name + i),
        Filename: basename(target),
        ContentType: 'public.data',
        CompatibilityTags: file.tags || ['Desktop', '720p', '480p'],
        MimeType: file.mime || kMimes[extname(file.path)] || 'application/octet-stream',
        IsFlattened: true,
        TotalSizeInMegaBytes: existsSync(file.path) ? statSync(file.path).size / 1048576 : 0,
        Height: file.height || 0,
        Width: file.width || 0,
        Duration: file.duration || 0,
        RelativePath: relativePath(target),
      };
    });
    if (source.previews) {
      record.Previews = source.previews.map((preview, i) => {
        const target = join(home, 'previews', `${i}.jpg`);
        place(preview.path, target);
        return {
          UUID: uuid(name + 'preview' + i),
          ...(preview.title ? {Title: preview.title} : {}),
          ...(preview.text ? {Content: preview.text} : {}),
          Index: i,
          Timecode: preview.timecode === undefined ? kNoTimecode : preview.timecode,
          Width: preview.width || 1280,
          Height: preview.height || 720,
          IsFlattened: true,
          Filename: `${i}.jpg`,
          RelativePath: relativePath(target),
        };
      });
    }
    if (source.hasSound)
      record.AudioSamples = {
        UUID: uuid(name + 'samples'),
        SampleFilename: uuid(name) + '.asc',
        IsFlattened: true,
        TotalSizeInMegaBytes: 0,
      };
    if (source.title) record.Title = source.title;
    if (source.timecode !== undefined) record.Timecode = source.timecode;
    return {...record, IsFlattened: true, TotalSizeInMegaBytes: 0, Dirty: false};
  }

  const items = media.map((item, i) => {
    const name = `${id}/${i}`,
      identity = item.id || uuid(name);
    const home = join(folder, 'media', identity);
    const record = {UUID: identity};
    if (item.title !== undefined) record.Title = item.title;
    if (item.description) record.Description = item.description;
    if (item.sources)
      record.Sources = item.sources.map((source, j) => sourceRecord(source, join(home, 'sources'), `${name}/${j}`));
    if (item.extras)
      record.Extras = item.extras.map((extra, j) => sourceRecord(extra, join(home, 'extras'), `${name}/extra${j}`));
    if (item.commentary)
      record.AudioCommentarySource = sourceRecord(item.commentary, join(home, 'sources'), `${name}/commentary`);
    Object.assign(record, {IsFlattened: true, TotalSizeInMegaBytes: 1.5});
    if (item.category) record.ContentCategory = item.category;
    record.PosterImagePath = `media/${identity}/poster.jpg`;
    if (item.poster) place(item.poster, join(home, 'poster.jpg'));
    return {...record, PosterImageWidth: item.poster ? 640 : 0, PosterImageHeight: item.poster ? 360 : 0};
  });
  if (poster) {
    copyFileSync(poster, join(folder, 'poster.png'));
    copyFileSync(poster, join(folder, 'JukeboxArtwork'));
  }
  const data = {
    Version: '1.0',
    UUID: uuid(id),
    Title: title,
    ...(description ? {Description: description} : {}),
    ...(author ? {Author: author} : {}),
    jukeboxOrder: 0,
    CreationDate: '2026-03-02T09:00:00Z',
    ModifiedDate: '2026-05-14T16:30:00Z',
    Type: 'Interactive',
    ...(items.length ? {Media: items} : {}),
    DocumentDuration: 0,
    IsFlattened: true,
    ...(poster ? {PosterImagePath: 'poster.png'} : {}),
    CollectionOwner: collection ? {UUID: uuid(collection), Title: collection} : {},
  };
  mkdirSync(join(folder, 'controllers'), {recursive: true});
  writeFileSync(join(folder, 'controllers/data.js'), `var appData = ${scriptJson(data)};`);
  return openPackage(folder);
}

/// A package that was made before.
export function openPackage(folder) {
  const script = readFileSync(join(folder, 'controllers/data.js'), 'utf8');
  const data = JSON.parse(script.slice('var appData = '.length, -1));
  return {folder, data, items: (data.Media || []).map((item) => item.UUID)};
}

/// JSON that may stand inside a script, as the data script has it.
function scriptJson(value) {
  return JSON.stringify(value).replace(
    /[<\u2028\u2029\x7f]/g,
    (character) => '\\u' + character.charCodeAt(0).toString(16).padStart(4, '0'),
  );
}
