// SPDX-License-Identifier: Apache-2.0
// Firefox as the tests drive it: the program of the system, spoken to in WebDriver BiDi.
import {spawn} from 'node:child_process';
import {mkdtempSync, rmSync, writeFileSync} from 'node:fs';
import {tmpdir} from 'node:os';
import {join} from 'node:path';
import WebSocket from 'ws';

const kPreferences = {
  'app.update.auto': false,
  'app.normandy.enabled': false,
  'browser.safebrowsing.malware.enabled': false,
  'browser.safebrowsing.phishing.enabled': false,
  'browser.shell.checkDefaultBrowser': false,
  'datareporting.policy.dataSubmissionEnabled': false,
  'extensions.update.enabled': false,
  'network.captive-portal-service.enabled': false,
  'network.connectivity-service.enabled': false,
  'services.settings.server': 'data:,',
  'toolkit.telemetry.enabled': false,
};

export async function launchFirefox(program = process.env.FIREFOX || '/usr/bin/firefox-esr') {
  const profile = mkdtempSync(join(tmpdir(), 'quilt-firefox-'));
  writeFileSync(
    join(profile, 'user.js'),
    Object.entries(kPreferences)
      .map(([key, value]) => `user_pref(${JSON.stringify(key)}, ${JSON.stringify(value)});\n`)
      .join(''),
  );
  const process_ = spawn(
    program,
    [
      '--headless',
      '--no-remote',
      '--profile',
      profile,
      '--remote-debugging-port',
      '0',
      '--width',
      '1280',
      '--height',
      '900',
    ],
    {stdio: ['ignore', 'ignore', 'pipe']},
  );
  const address = await new Promise((resolve, reject) => {
    let said = '';
    process_.stderr.on('data', (data) => {
      said += data;
      const found = /WebDriver BiDi listening on (ws:\S+)/.exec(said);
      if (found) resolve(found[1] + '/session');
    });
    process_.once('exit', () => reject(new Error('Firefox ended: ' + said)));
    setTimeout(() => reject(new Error('Firefox does not answer: ' + said)), 60000).unref();
  });
  const socket = new WebSocket(address);
  await new Promise((resolve, reject) => socket.once('open', resolve).once('error', reject));

  const waiting = new Map(),
    complaints = [],
    requests = [];
  let last = 0;
  socket.on('message', (data) => {
    const message = JSON.parse(data);
    if (message.type === 'event') {
      const {method, params} = message;
      if (method === 'log.entryAdded' && ['error', 'warn'].includes(params.level)) complaints.push(params.text);
      if (method === 'network.beforeRequestSent' && !/^(file|data|about|blob):/.test(params.request.url))
        requests.push(params.request.url);
      return;
    }
    if (!waiting.has(message.id)) return; // it was given up
    const {resolve, reject} = waiting.get(message.id);
    waiting.delete(message.id);
    if (message.type === 'success') resolve(message.result);
    else reject(new Error(message.message));
  });
  const send = (method, params = {}) =>
    new Promise((resolve, reject) => {
      const id = ++last;
      const timer = setTimeout(() => {
        waiting.delete(id);
        reject(new Error(`Firefox does not answer ${method}`));
      }, 60000);
      const end = (settle) => (value) => {
        clearTimeout(timer);
        settle(value);
      };
      waiting.set(id, {resolve: end(resolve), reject: end(reject)});
      socket.send(JSON.stringify({id, method, params}));
    });

  await send('session.new', {capabilities: {}});
  await send('session.subscribe', {events: ['log.entryAdded', 'network.beforeRequestSent']});
  const {
    contexts: [{context}],
  } = await send('browsingContext.getTree');
  const evaluate = async (body, ...values) => {
    const expression = `(${body})(${values.map((value) => JSON.stringify(value)).join()})`;
    const answer = await send('script.evaluate', {
      expression: `(async () => JSON.stringify(await ${expression}))()`,
      target: {context},
      awaitPromise: true,
    });
    if (answer.type === 'exception') throw new Error(answer.exceptionDetails.text);
    return answer.result.type === 'string' ? JSON.parse(answer.result.value) : undefined;
  };
  return {
    complaints,
    requests,
    evaluate,
    goto: (url) => send('browsingContext.navigate', {context, url, wait: 'complete'}),
    async until(condition, ...values) {
      for (const end = Date.now() + 20000; !(await evaluate(condition, ...values)); ) {
        if (Date.now() > end) throw new Error('never came true: ' + condition);
        await new Promise((resolve) => setTimeout(resolve, 100));
      }
    },
    async click(selector) {
      const place = await evaluate((text) => {
        const box = document.querySelector(text).getBoundingClientRect();
        return {x: Math.round(box.x + box.width / 2), y: Math.round(box.y + box.height / 2)};
      }, selector);
      await send('input.performActions', {
        context,
        actions: [
          {
            type: 'pointer',
            id: 'mouse',
            actions: [
              {type: 'pointerMove', ...place},
              {type: 'pointerDown', button: 0},
              {type: 'pointerUp', button: 0},
            ],
          },
        ],
      });
    },
    resize: (width, height) => send('browsingContext.setViewport', {context, viewport: {width, height}}),
    press: (key) =>
      send('input.performActions', {
        context,
        actions: [
          {
            type: 'key',
            id: 'keys',
            actions: [
              {type: 'keyDown', value: key},
              {type: 'keyUp', value: key},
            ],
          },
        ],
      }),
    async screenshot(path) {
      const {data} = await send('browsingContext.captureScreenshot', {context});
      writeFileSync(path, Buffer.from(data, 'base64'));
    },
    async close() {
      const ended = new Promise((resolve) => process_.once('exit', resolve));
      await send('browser.close').catch(() => process_.kill());
      await ended;
      rmSync(profile, {recursive: true, force: true, maxRetries: 5});
    },
  };
}
