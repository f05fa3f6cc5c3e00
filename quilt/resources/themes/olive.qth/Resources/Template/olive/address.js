// SPDX-License-Identifier: Apache-2.0
// Deep links: "#item=…&t=…&page=…&view=…". Only the hash may change on a local page.
'use strict';

((Olive) => {
  const kKeys = ['item', 't', 'page', 'view'];

  function toHash(place) {
    const parts = kKeys
      .filter((key) => place[key] !== undefined && place[key] !== '')
      .map((key) => key + '=' + encodeURIComponent(place[key]));
    return '#' + parts.join('&');
  }

  Olive.address = {
    // {item, t, page, view}: item is an identity or ''; t in seconds or null; page counts from 1, or null.
    read() {
      const values = new URLSearchParams(location.hash.slice(1));
      const value = (key) => {
        const amount = values.has(key) ? Number(values.get(key)) : Number.NaN;
        return Number.isFinite(amount) && amount >= 0 ? amount : null;
      };
      return {item: values.get('item') || '', t: value('t'), page: value('page'), view: values.get('view') || ''};
    },
    to: toHash,
    // Notes the place in the address without a new entry in the history.
    note(place) {
      const hash = toHash(place);
      if (hash === location.hash) return;
      try {
        history.replaceState(null, '', hash);
      } catch {
        // browsers limit how often; the next note comes soon
      }
    },
    link: (place) => location.href.split('#')[0] + toHash(place),
  };
})(window.Olive);
