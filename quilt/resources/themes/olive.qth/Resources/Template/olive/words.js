// SPDX-License-Identifier: Apache-2.0
// The words of the interface. A language is Olive.languages[tag] = {name, direction, words}; a word that depends on a
// number holds its plural forms by their CLDR names.
'use strict';

((Olive) => {
  Olive.languages = {};
  // Those that can be had, by their own names; their words are fetched when they are chosen.
  Olive.languageNames = {
    ar: 'العربية',
    de: 'Deutsch',
    en: 'English',
    es: 'Español',
    fr: 'Français',
    ja: '日本語',
  };
  let current = 'en';

  // The language for a choice of the reader: that one, else the first that the browser prefers, else English.
  Olive.languageFor = (tag) => {
    const known = (each) => Object.hasOwn(Olive.languageNames, each);
    if (known(tag)) return tag;
    return (navigator.languages || []).map((each) => each.toLowerCase().split('-')[0]).find(known) || 'en';
  };

  Olive.speak = (tag) => {
    const wanted = Olive.languageFor(tag);
    current = Olive.languages[wanted] ? wanted : 'en';
    document.documentElement.lang = current;
    document.documentElement.dir = Olive.languages[current].direction;
  };

  Olive.language = () => current;

  // say('continueAt', {time: '4:05'}); `n` among the values chooses the plural form.
  Olive.say = (key, values) => {
    let word = Olive.languages[current].words[key] || Olive.languages.en.words[key];
    if (typeof word === 'object') word = word[new Intl.PluralRules(current).select(values.n)] || word.other;
    return word.replace(/\{(\w+)\}/g, (whole, name) => (values && name in values ? values[name] : whole));
  };

  // The reader's own region of the language, for dates and numbers; digits as on the clock.
  const region = () =>
    ((navigator.languages || []).find((tag) => tag.toLowerCase().split('-')[0] === current) || current) + '-u-nu-latn';

  Olive.number = (value, digits) => new Intl.NumberFormat(region(), {maximumFractionDigits: digits || 0}).format(value);
  Olive.day = (date) => new Intl.DateTimeFormat(region(), {dateStyle: 'long'}).format(date);
  Olive.fileSize = (megaBytes) => {
    const [value, unit] = megaBytes < 1 ? [Math.ceil(megaBytes * 1024), 'kilobyte'] : [megaBytes, 'megabyte'];
    return new Intl.NumberFormat(region(), {style: 'unit', unit, maximumFractionDigits: value < 10 ? 1 : 0}).format(
      value,
    );
  };
  // "1 hour 12 minutes" for those who listen; the clock form is for the eye.
  Olive.spokenTime = (seconds) => {
    const whole = Math.floor(seconds),
      parts = [];
    const unit = (value, name) =>
      new Intl.NumberFormat(region(), {style: 'unit', unit: name, unitDisplay: 'long'}).format(value);
    if (whole >= 3600) parts.push(unit(Math.floor(whole / 3600), 'hour'));
    if (whole >= 60) parts.push(unit(Math.floor(whole / 60) % 60, 'minute'));
    parts.push(unit(whole % 60, 'second'));
    return parts.join(' ');
  };
})(window.Olive);
