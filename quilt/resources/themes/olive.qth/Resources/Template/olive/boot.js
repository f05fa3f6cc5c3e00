// SPDX-License-Identifier: Apache-2.0
// The first script: the namespace, and what the page says when a file of the package is missing or cannot be read.
'use strict';

(() => {
  const missing = [];
  let broken = '';
  const Olive = /** @type {Window['Olive']} */ ({}); // every script adds what it offers
  window.Olive = Olive;
  document.documentElement.classList.add('scripted'); // hides the notice that index.html carries

  window.addEventListener(
    'error',
    (event) => {
      const node = event.target;
      if (node instanceof HTMLScriptElement || node instanceof HTMLLinkElement) {
        missing.push(node.getAttribute('src') || node.getAttribute('href'));
      } else if (/controllers\/data\.js/.test(event.filename || '')) {
        broken = 'controllers/data.js';
      }
    },
    true,
  );

  function cause() {
    if (/\.zip([/\\%]|$)|[/\\]Temp\d*_/i.test(decodeURI(location.pathname))) {
      return 'This page was opened from inside a zip archive. Extract the archive first.';
    }
    if (missing.length) return 'Missing in this package: ' + missing.join(', ');
    if (broken) return 'The file ' + broken + ' is damaged.';
    return 'The file controllers/data.js holds no package.';
  }

  function complain(text) {
    document.documentElement.classList.remove('scripted');
    document.getElementById('notice-cause').textContent = text;
  }

  document.addEventListener('DOMContentLoaded', () => {
    const data = window.appData;
    if (missing.length || !data || typeof data !== 'object') {
      complain(cause());
      return;
    }
    Olive.start(data).then(
      () => document.getElementById('notice')?.remove(),
      (error) => {
        complain('The package cannot be shown: ' + error.message);
        throw error;
      },
    );
  });
})();
