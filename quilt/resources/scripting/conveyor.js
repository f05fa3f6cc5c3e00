// SPDX-License-Identifier: Apache-2.0
// Conveyor: a Quilt document as scripts see it. In a page that "quilt serve" serves it is there as `conveyor`; in
// Node 18 or later, `require('./conveyor.js').connect(address)` makes one from the address that "quilt serve" prints.
//
//   const document = await conveyor.document();
//   const item = await document.cvMediaAtIndex(0);
//   await item.cvSetTitle('Opening');
//   conveyor.addEventListener('change', ({ object, accessors }) => { … });
//
// conveyor.d.ts declares what is here, docs/bridge.md describes what travels.
(() => {
  'use strict';

  /** Why a call was not done; `code` is for programs ("no-object", "wrong-arguments", "busy", …). */
  class ConveyorError extends Error {
    constructor(code, message) {
      super(message);
      this.name = 'ConveyorError';
      this.code = code;
    }
  }

  /**
   * One object of the model. Its class's accessors are its methods; two answers for one object are the same. Beside
   * them, stored(accessor) answers what the object stores: null where the accessor answers something that stands in.
   */
  class ConveyorObject {
    #call;
    constructor(className, call) {
      this.#call = call;
      this.className = className;
    }
    async stored(accessor) {
      const {value, standsIn} = await this.#call(accessor, []);
      return standsIn ? null : value;
    }
    static define(name, accessors) {
      const Class = class extends ConveyorObject {};
      for (const accessor of accessors) {
        Class.prototype[accessor.replace(':', '')] = async function (...given) {
          return (await this.#call(accessor, given)).value;
        };
      }
      Object.defineProperty(Class, 'name', {value: name});
      return Class;
    }
  }

  /** One session of the bridge: objects, their handles, and the news of their changes. */
  class Session {
    #base;
    #headers;
    #identity;
    #classes = new Map();
    #objects = new Map();
    #roots;
    #stream = null;
    #onLost;

    /** `onLost` is called when the bridge no longer knows the session. */
    constructor(base, token, onLost) {
      this.#base = base;
      this.#onLost = onLost;
      this.#headers = {'Content-Type': 'application/json', 'X-Conveyor-Token': token};
    }

    async open() {
      const opened = await this.#post('open', {});
      this.#identity = opened.session;
      for (const [name, accessors] of Object.entries(opened.classes)) {
        this.#classes.set(name, ConveyorObject.define(name, accessors));
      }
      this.#roots = opened.roots;
      return this;
    }

    root(name) {
      return this.#valueOf(this.#roots[name]);
    }

    /** Tells of every change until the session ends, then of the end. */
    async listen(onChange, onEnd) {
      this.#stream = new AbortController();
      try {
        const response = await fetch(`${this.#base}events?session=${this.#identity}`, {
          headers: this.#headers,
          signal: this.#stream.signal,
        });
        if (!response.ok) throw await failureOf(response);
        const reader = response.body.pipeThrough(new TextDecoderStream()).getReader();
        let text = '';
        for (let piece = await reader.read(); !piece.done; piece = await reader.read()) {
          text += piece.value;
          const events = text.split('\n\n');
          text = events.pop();
          for (const event of events) this.#tell(event, onChange);
        }
        onEnd(null);
      } catch (error) {
        onEnd(error.name === 'AbortError' ? null : error);
      }
    }

    // `keepalive`: also when the page is on its way out.
    async close() {
      await this.#post('close', {session: this.#identity}, {keepalive: true}).catch(() => {});
      if (this.#stream) this.#stream.abort();
    }

    #tell(event, onChange) {
      const match = /^event: change\ndata: (.*)$/.exec(event);
      if (!match) return;
      const {object, accessors} = JSON.parse(match[1]);
      const changed = this.#objects.get(object);
      if (changed) onChange({type: 'change', object: changed, accessors});
    }

    async #post(name, body, options = {}) {
      const response = await fetch(this.#base + name, {
        method: 'POST',
        headers: this.#headers,
        body: JSON.stringify(body),
        ...options,
      });
      if (response.ok) return response.json();
      const failure = await failureOf(response);
      if (failure.code === 'no-session') this.#onLost();
      throw failure;
    }

    // An answer as the caller gets it: a reference becomes the object that stands for it.
    #valueOf(value) {
      if (value === null || typeof value !== 'object' || Array.isArray(value)) return value;
      const handle = value.object;
      let object = this.#objects.get(handle);
      if (!object) {
        const Class = this.#classes.get(value.class);
        object = new Class(value.class, async (method, given) => {
          const call = {session: this.#identity, object: handle, method, arguments: given};
          const answer = await this.#post('call', call);
          return {value: this.#valueOf(answer.value), standsIn: answer.standsIn === true};
        });
        this.#objects.set(handle, object);
      }
      return object;
    }
  }

  async function failureOf(response) {
    const text = await response.text();
    try {
      const {code, message} = JSON.parse(text).error;
      return new ConveyorError(code, message);
    } catch {
      return new ConveyorError('refused', text.trim() || `The bridge answers ${response.status}`);
    }
  }

  class Conveyor {
    #open;
    #session = null;
    #listeners = {change: new Set(), close: new Set()};

    constructor(address) {
      const found = /^(https?:\/\/[^/]+\/([^/]+)\/)package\//.exec(address);
      if (!found) throw new ConveyorError('bad-address', 'This is no address that "quilt serve" prints');
      const [, base, token] = found;
      this.#open = (onLost) => new Session(`${base}conveyor/`, token, onLost).open();
    }

    /** The document that is served. */
    async document() {
      return (await this.#current()).root('document');
    }

    /** The collection that the document is in, or null. */
    async collection() {
      return (await this.#current()).root('collection');
    }

    /**
     * 'change': accessors of an object that this client has been given answer otherwise now. 'close': the bridge has
     * ended, or dropped this client; objects had from it are of no more use. While it listens, Node does not end.
     */
    addEventListener(type, listener) {
      this.#listeners[type].add(listener);
      this.#current().catch((error) => this.#tell({type: 'close', error}));
    }

    removeEventListener(type, listener) {
      this.#listeners[type].delete(listener);
    }

    /** Lets go of every object. */
    async close() {
      const session = this.#session;
      this.#session = null;
      if (session)
        await session.then(
          (opened) => opened.close(),
          () => {},
        );
    }

    #current() {
      if (!this.#session) {
        const session = this.#open(() => this.#forget(session));
        this.#session = session;
        session.catch(() => this.#forget(session));
      }
      this.#listenOnce();
      return this.#session;
    }

    #listenOnce() {
      const session = this.#session;
      if (session.isListening || this.#listeners.change.size + this.#listeners.close.size === 0) return;
      session.isListening = true;
      session
        .then((opened) =>
          opened.listen(
            (event) => this.#tell(event),
            (error) => {
              this.#forget(session);
              this.#tell({type: 'close', error});
            },
          ),
        )
        .catch(() => {});
    }

    #forget(session) {
      if (this.#session === session) this.#session = null;
    }

    #tell(event) {
      for (const listener of [...this.#listeners[event.type]]) listener(event);
    }
  }

  const connect = (address) => new Conveyor(address);

  if (typeof module === 'object' && module.exports) {
    module.exports = {connect, Conveyor, ConveyorError};
  } else {
    const conveyor = connect(location.href);
    Object.assign(globalThis, {Conveyor, ConveyorError, conveyor});
    // A page that may come back keeps its objects.
    addEventListener('pagehide', ({persisted}) => persisted || conveyor.close());
  }
})();
