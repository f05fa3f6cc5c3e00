// SPDX-License-Identifier: Apache-2.0
// Chromium as the tests drive it, and what they watch: console, requests, a small server that answers ranges.
import {createReadStream, existsSync, statSync} from 'node:fs';
import {createServer} from 'node:http';
import {extname, join, normalize} from 'node:path';
import {pathToFileURL} from 'node:url';
import {chromium} from 'playwright-core';

export const launch = () =>
  chromium.launch({
    executablePath: process.env.CHROMIUM || '/usr/bin/chromium',
    args: [
      '--no-sandbox',
      '--disable-gpu',
      '--disable-background-networking',
      '--disable-component-update',
      '--disable-default-apps',
      '--disable-sync',
      '--no-first-run',
      '--mute-audio',
      '--disable-background-timer-throttling',
      '--disable-renderer-backgrounding',
      '--autoplay-policy=user-gesture-required',
    ],
  });

/// A page with what it complained about and what it asked the network for.
export async function openPage(browser, options = {}) {
  const context = await browser.newContext({
    viewport: {width: 1280, height: 800},
    locale: 'en-GB',
    reducedMotion: 'reduce',
    ...options,
  });
  const page = await context.newPage();
  const complaints = [],
    requests = [];
  page.on('console', (message) => {
    if (['error', 'warning'].includes(message.type())) complaints.push(message.text());
  });
  page.on('pageerror', (error) => complaints.push(String(error)));
  page.on('request', (request) => {
    if (!/^(file|data|about|blob):/.test(request.url())) requests.push(request.url());
  });
  page.setDefaultTimeout(20000); // machines that do much else at once
  return {context, page, complaints, requests};
}

export const fileUrl = (folder, hash = '') => pathToFileURL(join(folder, 'index.html')).href + hash;

const kTypes = {
  '.html': 'text/html',
  '.js': 'text/javascript',
  '.css': 'text/css',
  '.mp4': 'video/mp4',
  '.m4a': 'audio/mp4',
  '.jpg': 'image/jpeg',
  '.png': 'image/png',
  '.pdf': 'application/pdf',
};

/// Serves the folder on the loopback address, byte ranges included; extra pages by path. slow: {file, share, gate} holds
/// back what comes after a share of that file until the gate opens.
export async function serve(folder, pages = {}, slow = null) {
  const server = createServer((request, response) => {
    const path = decodeURIComponent(new URL(request.url, 'http://x').pathname);
    if (pages[path]) {
      response.writeHead(200, {'Content-Type': 'text/html'});
      response.end(pages[path]);
      return;
    }
    const file = join(folder, normalize(path));
    if (!file.startsWith(folder) || !existsSync(file) || !statSync(file).isFile()) {
      response.writeHead(path === '/favicon.ico' ? 204 : 404);
      response.end();
      return;
    }
    const size = statSync(file).size;
    const range = /^bytes=(\d*)-(\d*)$/.exec(request.headers.range || '');
    const headers = {
      'Content-Type': kTypes[extname(file)] || 'application/octet-stream',
      'Accept-Ranges': 'bytes',
      'X-Content-Type-Options': 'nosniff',
    };
    const start = range?.[1] ? Number(range[1]) : range ? size - Number(range[2]) : 0;
    const end = range?.[1] && range[2] ? Math.min(Number(range[2]), size - 1) : size - 1;
    response.writeHead(range ? 206 : 200, {
      ...headers,
      'Content-Length': end - start + 1,
      ...(range ? {'Content-Range': `bytes ${start}-${end}/${size}`} : {}),
    });
    const limit = slow && file.endsWith(slow.file) ? Math.floor(size * slow.share) : Number.POSITIVE_INFINITY;
    if (end < limit) {
      createReadStream(file, {start, end}).pipe(response);
      return;
    }
    const rest = () =>
      slow.gate.then(() => createReadStream(file, {start: Math.max(start, limit), end}).pipe(response));
    if (start < limit)
      createReadStream(file, {start, end: limit - 1})
        .on('end', rest)
        .pipe(response, {end: false});
    else rest();
  });
  await new Promise((resolve) => server.listen(0, '127.0.0.1', resolve));
  return {origin: `http://127.0.0.1:${server.address().port}`, close: () => server.close()};
}
