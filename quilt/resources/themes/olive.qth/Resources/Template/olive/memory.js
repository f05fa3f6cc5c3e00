// SPDX-License-Identifier: Apache-2.0
// What the reader did, kept by the browser under the package's identity: some browsers have one store for all local
// pages. Without a store (or a full one) everything works but is forgotten.
'use strict';

((Olive) => {
  Olive.openMemory = (packageId) => {
    const prefix = 'quilt.olive.' + packageId + '.';

    function read(name) {
      try {
        const value = JSON.parse(localStorage.getItem(prefix + name));
        return value && typeof value === 'object' ? value : {};
      } catch {
        return {};
      }
    }

    const choices = read('choices');
    const places = read('places');

    function write(name, value) {
      try {
        localStorage.setItem(prefix + name, JSON.stringify(value));
      } catch {
        // forgotten when the page closes
      }
    }

    return {
      choice: (name, otherwise) => (name in choices ? choices[name] : otherwise),
      choose(name, value) {
        choices[name] = value;
        write('choices', choices);
      },
      // {time, share, page, done, at} of an item: seconds, part seen from 0 to 1, page index, whether it was seen to its end, when.
      place: (item) => places[item.id] || {},
      keep(item, place) {
        places[item.id] = {...places[item.id], ...place, at: Date.now()};
        write('places', places);
      },
      forget() {
        for (const id of Object.keys(places)) delete places[id];
        write('places', places);
      },
      hasPlaces: () => Object.keys(places).length > 0,
    };
  };
})(window.Olive);
