// SPDX-License-Identifier: Apache-2.0
// Making elements. Text of the package is only ever set as text.
'use strict';

((Olive) => {
  // make('a', {class, href, text, onclick, 'aria-label', …}, child, …): null and false properties and children are left
  // out, true is an attribute without value (but aria-… says "true" or "false"), functions are listeners.
  Olive.make = (tag, properties, ...children) => {
    const node = document.createElement(tag);
    for (const [name, value] of Object.entries(properties || {})) {
      if (value === null || value === undefined) continue;
      if (name.startsWith('aria-')) node.setAttribute(name, value);
      else if (value === false) continue;
      else if (typeof value === 'function') node.addEventListener(name.slice(2), value);
      else if (name === 'text') node.textContent = value;
      else node.setAttribute(name, value === true ? '' : value);
    }
    node.append(...children.flat().filter((child) => child || child === 0));
    return node;
  };

  Olive.icon = (name) => {
    const space = 'http://www.w3.org/2000/svg';
    const svg = document.createElementNS(space, 'svg');
    svg.setAttribute('viewBox', '0 0 24 24');
    svg.setAttribute('class', 'icon');
    svg.setAttribute('aria-hidden', 'true');
    const path = document.createElementNS(space, 'path');
    path.setAttribute('d', Olive.icons[name]);
    svg.append(path);
    return svg;
  };

  Olive.setIcon = (button, name) => button.querySelector('.icon').replaceWith(Olive.icon(name));

  // A button that shows an icon; its label is its accessible name and its tool tip.
  Olive.iconButton = (icon, label, onclick, properties) =>
    Olive.make(
      'button',
      {type: 'button', class: 'icon-button', 'aria-label': label, title: label, onclick, ...properties},
      Olive.icon(icon),
    );

  Olive.relabel = (button, label) => {
    button.setAttribute('aria-label', label);
    button.title = label;
  };

  Olive.show = (node, shown) => {
    node.hidden = !shown;
  };

  // Plain text with its web and mail addresses as links, paragraph by paragraph.
  Olive.paragraphs = (text) =>
    text
      .split(/\n\s*\n/)
      .filter((part) => part.trim())
      .map((part) => {
        const pieces = part.split(/((?:https?:\/\/|mailto:)[^\s<>"]*[^\s<>".,;:!?)\]}'’”])/i);
        return Olive.make(
          'p',
          {dir: 'auto'},
          pieces.map((piece, i) => {
            const address = i % 2 ? Olive.safeAddress(piece) : null;
            return address ? Olive.outsideLink(address, piece) : piece;
          }),
        );
      });

  // The address if a click on it may leave the package, else null.
  Olive.safeAddress = (text) => {
    try {
      const address = new URL(text);
      return ['http:', 'https:', 'mailto:'].includes(address.protocol) ? address.href : null;
    } catch {
      return null;
    }
  };

  Olive.outsideLink = (address, ...content) =>
    Olive.make('a', {href: address, target: '_blank', rel: 'noopener noreferrer'}, content);

  // A local picture that gives way to its stand-in when it cannot be shown.
  Olive.picture = (path, properties, standIn) => {
    const image = Olive.make('img', {
      alt: '',
      decoding: 'async',
      loading: 'lazy',
      draggable: 'false',
      ...properties,
      src: path,
    });
    image.addEventListener('error', () => (standIn ? image.replaceWith(standIn()) : image.remove()), {once: true});
    return image;
  };

  let live;
  // Tells those who listen what a key or a control changed.
  Olive.announce = (text) => {
    if (!live) {
      live = Olive.make('div', {class: 'unseen', role: 'status', id: 'announcements'});
      document.body.append(live);
    }
    // The same words again are told again, because something about them differs.
    live.textContent = live.textContent === text ? text + '\u00a0' : text;
  };

  const pad = (number) => String(number).padStart(2, '0');
  // "4:05", "1:04:05"
  Olive.clock = (seconds) => {
    const whole = Number.isFinite(seconds) ? Math.max(0, Math.floor(seconds)) : 0;
    const hours = Math.floor(whole / 3600),
      minutes = Math.floor(whole / 60) % 60;
    return hours ? `${hours}:${pad(minutes)}:${pad(whole % 60)}` : `${minutes}:${pad(whole % 60)}`;
  };

  Olive.clamp = (value, low, high) => Math.min(Math.max(value, low), Math.max(low, high));
})(window.Olive);
