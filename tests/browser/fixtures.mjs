// SPDX-License-Identifier: Apache-2.0
// The packages that the tests open.
import {rmSync} from 'node:fs';
import {join} from 'node:path';
import {makePackage, Media, openPackage} from './packages.mjs';

const kPageTexts = [
  'Fields in spring\n\nThe olive grows slowly. A young tree needs four years before it carries its first fruit, and forty before it carries well.',
  'Pruning\n\nCut on a dry day in late winter. Leave the crown open so that light and wind reach every branch.',
  'Éclairage and water\n\nA mature tree wants little water. Irrigation in July doubles the harvest, but thins the oil.',
  'Harvest\n\nPick by hand while the fruit is turning from green to violet. Press it within a day.',
  'The mill\n\nStone crushes, steel cleans. The paste is kneaded at twenty-seven degrees for half an hour.',
  'Tasting\n\nBitter, fruity, pungent: the three good attributes. A good oil stings at the back of the throat.',
];

/// One item of every category, with chapters, grades, extras, a commentary, cues.
function course(media) {
  const posters = [
    media.picture('valley.png', {}),
    media.picture('dusk.png', {from: '0xf2c9a0', to: '0x5b3a3a', sun: '0xfff0d0', seed: 5}),
    media.picture('sea.png', {from: '0xc9e0e4', to: '0x2c5563', sun: '0xffffff', seed: 2}),
    media.picture('grove.png', {from: '0xe9edc9', to: '0x3c4a12', sun: '0xfdf6c8', seed: 7}),
    media.picture('stone.png', {from: '0xe6e2d8', to: '0x6b6454', sun: '0xfffdf2', seed: 4}),
  ];
  const jpegs = posters.map((path, i) => media.made(`still-${i}.jpg`, ['-i', path, '-q:v', '4']));
  const desktop = media.movie('grove-desktop.mp4', {seconds: 12, size: '1280x720'});
  const small = media.movie('grove-480p.mp4', {seconds: 12, size: '640x360'});
  const speaker = media.movie('speaker.mp4', {seconds: 20, colour: '0x39454d', size: '640x360'});
  const slides = media.movie('slides.mp4', {seconds: 20, colour: '0x5b4a2a', silent: true, size: '640x360'});
  const voice = media.sound('voice.m4a', {seconds: 20});
  const song = media.sound('song.m4a', {seconds: 30, tone: 262});
  const pages = kPageTexts.map((text, i) => ({
    path: media.page(`page-${i}.jpg`, i),
    title: text.split('\n')[0],
    text,
    width: 900,
    height: 1164,
  }));
  const sheet = media.text(
    'worksheet.pdf',
    '%PDF-1.4\n1 0 obj<</Type/Catalog/Pages 2 0 R>>endobj\n2 0 obj<</Type/Pages/Kids[]/Count 0>>endobj\ntrailer<</Root 1 0 R>>\n',
  );
  const film = (path, width, height, tags) => ({path, tags, width, height, duration: 12});
  return {
    title: 'From Tree to Table',
    author: 'Mara Lindqvist',
    collection: 'Slow food, autumn school',
    poster: posters[0],
    description:
      'Six short lessons about olives: how the tree grows, how the fruit is picked and pressed, and how to taste what comes out.\n\nMore at https://example.org/olives.',
    media: [
      {
        category: 'Movie',
        title: 'The grove in four seasons',
        poster: jpegs[0],
        description:
          'A walk through the same rows of trees in March, June, September and December.\n\nThe full notes are at https://example.org/grove (in English).',
        sources: [
          {
            category: 'Movie',
            hasSound: true,
            files: [film(desktop, 1280, 720, ['Desktop', '720p']), film(small, 640, 360, ['480p'])],
            previews: [
              {path: jpegs[0], title: 'Winter', timecode: 0},
              {path: jpegs[1], title: 'Spring, the first blossoms', timecode: 3},
              {path: jpegs[2], title: 'Summer', timecode: 6},
              {path: jpegs[3], title: 'Harvest', timecode: 9},
            ],
          },
        ],
        extras: [
          {category: 'Document', title: 'Worksheet', files: [{path: sheet}]},
          {category: 'Web', title: 'Map of the valley', files: [{url: 'https://example.org/map'}]},
        ],
      },
      {
        category: 'DualSource',
        title: 'Lecture: what pressing does',
        poster: jpegs[4],
        description: 'Speaker and slides, side by side.',
        sources: [
          {
            category: 'Movie',
            title: 'Speaker',
            hasSound: true,
            files: [{path: speaker, width: 640, height: 360, duration: 20}],
            previews: [{path: jpegs[4], timecode: undefined}],
          },
          {
            category: 'Movie',
            title: 'Slides',
            files: [{path: slides, width: 640, height: 360, duration: 20}],
            previews: [
              {path: jpegs[2], title: 'Why olives are bitter', timecode: 0},
              {path: jpegs[3], title: 'Crushing', timecode: 7},
              {path: jpegs[0], title: 'Kneading and rest', timecode: 13},
            ],
          },
        ],
      },
      {
        category: 'Audio',
        title: 'A song from the harvest',
        poster: jpegs[1],
        sources: [
          {category: 'Audio', hasSound: true, files: [{path: song, duration: 30}], previews: [{path: jpegs[1]}]},
        ],
      },
      {
        category: 'Montage',
        title: 'Walk to the mill',
        poster: jpegs[3],
        commentary: {category: 'Audio', hasSound: true, files: [{path: voice, duration: 20}]},
        sources: [0, 1, 2, 3].map((i) => ({
          category: 'Image',
          timecode: [0, 4.5, 9, 14][i],
          title: ['', 'The gate', 'Down to the water', 'The mill'][i],
          files: [{path: jpegs[i], width: 1280, height: 720}],
          previews: [{path: jpegs[i]}],
        })),
      },
      {
        category: 'Document',
        title: 'The grower’s handbook',
        poster: pages[0].path,
        sources: [{category: 'Document', files: [{path: sheet}], previews: pages}],
        description: 'Everything on six pages.',
      },
      {
        category: 'Image',
        title: 'The valley at noon',
        poster: jpegs[0],
        sources: [
          {category: 'Image', files: [{path: posters[0], width: 1280, height: 720}], previews: [{path: jpegs[0]}]},
        ],
      },
      {
        category: 'Web',
        title: 'Read on',
        poster: undefined,
        sources: [{category: 'Web', files: [{url: 'https://example.org/olives?from=quilt'}]}],
        description: 'A page with recipes.',
      },
      {
        category: 'Movie',
        title: 'With the film maker’s voice',
        poster: jpegs[2],
        commentary: {category: 'Audio', hasSound: true, files: [{path: voice, duration: 20}]},
        sources: [
          {
            category: 'Movie',
            hasSound: true,
            files: [{path: small, tags: ['Desktop', '480p'], width: 640, height: 360, duration: 12}],
            previews: [{path: jpegs[2]}],
          },
        ],
      },
      {
        category: 'Image',
        title: 'Explained: the press',
        poster: jpegs[4],
        commentary: {category: 'Audio', hasSound: true, files: [{path: voice, duration: 20}]},
        sources: [
          {category: 'Image', files: [{path: posters[4], width: 1280, height: 720}], previews: [{path: jpegs[4]}]},
        ],
      },
    ],
  };
}

export class Fixtures {
  constructor(folder) {
    this.folder = folder;
    this.media = new Media(join(folder, 'media'));
  }

  path(name) {
    return join(this.folder, 'packages', name);
  }

  /// Makes the package, or opens the one that the first step of the run has made: test files run side by side.
  made(name, contents) {
    return process.env.QUILT_BROWSER_READY ? openPackage(this.path(name)) : makePackage(this.path(name), contents());
  }

  all() {
    for (const name of [
      'course',
      'single',
      'portrait',
      'lecture',
      'voiceAndSlides',
      'shortVoice',
      'many',
      'broken',
      'hostile',
    ])
      this[name]();
  }

  course() {
    return this.made('course', () => course(this.media));
  }

  /// A movie alone.
  single() {
    return this.made('single', () => {
      const film = this.media.movie('grove-480p.mp4', {seconds: 12, size: '640x360'});
      return {
        title: 'One film',
        media: [
          {
            category: 'Movie',
            title: 'The only one',
            sources: [
              {category: 'Movie', hasSound: true, files: [{path: film, width: 640, height: 360, duration: 12}]},
            ],
          },
        ],
      };
    });
  }

  /// A film that stands upright.
  portrait() {
    return this.made('portrait', () => {
      const film = this.media.movie('upright.mp4', {seconds: 4, size: '360x640'});
      return {
        title: 'Upright',
        media: [
          {
            category: 'Movie',
            title: 'Upright',
            sources: [{category: 'Movie', hasSound: true, files: [{path: film, width: 360, height: 640, duration: 4}]}],
          },
        ],
      };
    });
  }

  /// A lecture of a voice and slides.
  voiceAndSlides() {
    return this.made('voice-and-slides', () => {
      const voice = this.media.sound('voice.m4a', {seconds: 20});
      const slides = this.media.movie('slides.mp4', {seconds: 20, colour: '0x5b4a2a', silent: true, size: '640x360'});
      const sources = [
        {category: 'Audio', hasSound: true, files: [{path: voice, duration: 20}]},
        {category: 'Movie', files: [{path: slides, width: 640, height: 360, duration: 20}]},
      ];
      return {title: 'Spoken', media: [{category: 'DualSource', title: 'Spoken', sources}]};
    });
  }

  /// A film with a voice over it that ends after four seconds.
  shortVoice() {
    return this.made('short-voice', () => {
      const film = this.media.movie('grove-480p.mp4', {seconds: 12, size: '640x360'});
      const voice = this.media.sound('short-voice.m4a', {seconds: 4});
      const sources = [
        {category: 'Movie', hasSound: true, files: [{path: film, width: 640, height: 360, duration: 12}]},
      ];
      const commentary = {category: 'Audio', hasSound: true, files: [{path: voice, duration: 4}]};
      return {title: 'Commented', media: [{category: 'Movie', title: 'Commented', sources, commentary}]};
    });
  }

  /// Two long sources for the measurement of their distance.
  lecture() {
    return this.made('lecture', () => {
      const speaker = this.media.movie('speaker-long.mp4', {seconds: 90, colour: '0x39454d', size: '320x180'});
      const slides = this.media.movie('slides-long.mp4', {
        seconds: 80,
        colour: '0x5b4a2a',
        size: '320x180',
        silent: true,
      });
      return {
        title: 'Lecture',
        media: [
          {
            category: 'DualSource',
            title: 'Lecture',
            sources: [
              {category: 'Movie', hasSound: true, files: [{path: speaker, width: 320, height: 180, duration: 90}]},
              {category: 'Movie', timecode: 2, files: [{path: slides, width: 320, height: 180, duration: 80}]},
            ],
          },
        ],
      };
    });
  }

  many() {
    return this.made('many', () => {
      const still = this.media.made('still-0.jpg', ['-i', this.media.picture('valley.png'), '-q:v', '4']);
      const film = this.media.movie('short.mp4', {seconds: 2, size: '320x180'});
      const media = [];
      for (let i = 0; i < 500; ++i) {
        media.push({
          category: 'Movie',
          title: `Lesson ${i + 1}: ${['pruning', 'grafting', 'watering', 'harvest', 'pressing'][i % 5]}`,
          poster: still,
          description: i === 321 ? 'Hier steht das Wort Überraschung.' : 'A short description of this lesson.',
          sources: [{category: 'Movie', hasSound: true, files: [{path: film, width: 320, height: 180, duration: 2}]}],
        });
      }
      return {title: 'Five hundred lessons', media};
    });
  }

  /// Ten movies of which the fourth is damaged, and one whose best grade is.
  broken() {
    return this.made('broken', () => {
      const film = this.media.movie('short.mp4', {seconds: 2, size: '320x180'});
      const damaged = this.media.text('damaged.mp4', 'This is no film.');
      const still = this.media.made('still-1.jpg', [
        '-i',
        this.media.picture('dusk.png', {from: '0xf2c9a0', to: '0x5b3a3a', sun: '0xfff0d0', seed: 5}),
        '-q:v',
        '4',
      ]);
      const file = (path, tags) => ({path, tags, width: 320, height: 180, duration: 2});
      return {
        title: 'One is broken',
        media: Array.from({length: 10}, (_, i) => ({
          category: 'Movie',
          title: `Film ${i + 1}`,
          poster: still,
          sources: [
            {
              category: 'Movie',
              hasSound: true,
              files:
                i === 3 ? [file(damaged)] : i === 6 ? [file(damaged, ['Desktop']), file(film, ['480p'])] : [file(film)],
            },
          ],
        })),
      };
    });
  }

  /// Titles, texts and names as an attacker would choose them.
  hostile() {
    return this.made('hostile', () => {
      const film = this.media.movie('short.mp4', {seconds: 2, size: '320x180'});
      const still = this.media.made('still-0.jpg', ['-i', this.media.picture('valley.png'), '-q:v', '4']);
      const evil =
        '<img src=x onerror="window.hacked=1"></script><script>window.hacked=2</script>\u2028"\'`${window.hacked=3}';
      return {
        title: evil,
        description: evil + ' javascript:window.hacked=4 https://example.org/"onclick="window.hacked=5',
        author: evil,
        media: [
          {
            category: 'Movie',
            id: 'a b&c=<d>',
            title: evil,
            description: evil,
            sources: [
              {
                category: 'Movie',
                title: evil,
                hasSound: true,
                files: [{path: film, name: 'é 媒体 #1 100%.mp4', width: 320, height: 180, duration: 2}],
                previews: [
                  {path: still, title: evil, timecode: 0},
                  {path: still, title: 'x'.repeat(5000), timecode: 1},
                ],
              },
            ],
          },
          {
            category: 'Web',
            title: 'Script link',
            sources: [{category: 'Web', files: [{url: 'javascript:window.hacked=6'}]}],
          },
          {
            category: 'Document',
            title: 'W'.repeat(400),
            sources: [
              {category: 'Document', files: [{path: still}], previews: [{path: still, title: evil, text: evil}]},
            ],
          },
          {category: '__proto__', title: 'Unknown', sources: [{files: []}]},
          {title: 'Nothing'},
          {category: 'Movie', title: 'No sources at all', sources: []},
        ],
      };
    });
  }

  /// The course without some of its files; a package for one test.
  incomplete(name, ...missing) {
    const made = makePackage(this.path(name), course(this.media));
    for (const file of missing) rmSync(join(made.folder, file), {recursive: true});
    return made;
  }
}
