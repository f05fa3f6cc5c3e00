// SPDX-License-Identifier: Apache-2.0
// What the scripts of the theme "Olive" offer each other through the namespace `Olive`, and what they hand around. Each
// script is checked against this: names, arguments and what is answered.

export {};

/** A file that can be shown. */
interface MediaFile {
  /** Inside the package, encoded; '' when there is none. */
  address: string;
  /** An address that may be followed outside, or null. */
  link: string | null;
  name: string;
  mime: string;
  grades: string[];
  /** Pixels; 0 when it is not told. */
  width: number;
  height: number;
  /** Seconds; 0 when it is not told. */
  duration: number;
  megaBytes: number;
}

/** A still: of a chapter or a page. */
interface Preview {
  title: string;
  text: string;
  /** Seconds, or null. */
  start: number | null;
  picture: string;
  width: number;
  height: number;
  index: number;
}

type Raw = Record<string, any>;

interface Source {
  record: Raw;
  id: string;
  category: string;
  title: string;
  description: string;
  start: number | null;
  files: MediaFile[];
  previews: Preview[];
  hasSound: boolean;
}

interface Chapter {
  title: string;
  start: number;
  picture: string;
  /** The still that it is, of a montage. */
  source?: Source;
}

interface Item {
  record: Raw;
  id: string;
  index: number;
  category: string;
  title: string;
  description: string;
  poster: string;
  sources: Source[];
  extras: Source[];
  commentary: Source | null;
  link: string | null;
  pages: Preview[];
  chapters: Chapter[];
  duration: number;
}

interface Pack {
  record: Raw;
  id: string;
  title: string;
  description: string;
  author: string;
  keywords: string;
  category: string;
  advisory: string;
  modified: Date | null;
  collection: string;
  poster: string;
  items: Item[];
}

/** Where somebody was in an item. */
interface Place {
  time?: number;
  share?: number;
  page?: number;
  done?: boolean;
  /** When, in milliseconds since 1970. */
  at?: number;
}

interface Memory {
  choice<T>(name: string, otherwise: T): T;
  choose(name: string, value: unknown): void;
  place(item: Item): Place;
  keep(item: Item, place: Place): void;
  forget(): void;
  hasPlaces(): boolean;
}

/** A place in the package, as the address tells it. */
interface Start {
  t: number | null;
  page: number | null;
  view: string;
  play?: boolean;
}

interface Grades {
  files: MediaFile[];
  wanted: string;
  current: MediaFile | null;
  isPlayable(): boolean;
  choices(): {grade: string; file: MediaFile}[];
  pick(width: number): MediaFile | null;
  fail(): void;
}

type MediaElement = HTMLMediaElement & {videoWidth?: number; videoHeight?: number};

interface Part {
  source: Source;
  /** 'video' or 'audio'. */
  kind: string;
  offset?: number;
  leads?: boolean;
  speaksAgain?: boolean;
  poster?: string;
}

interface Stream {
  element: MediaElement;
  grades: Grades;
  offset: number;
  hasFailed: boolean;
  isEnabled: boolean;
  readonly duration: number;
  readonly end: number;
  readonly position: number;
}

interface Player extends EventTarget {
  streams: Stream[];
  leader: Stream | null;
  speed: number;
  loudness: number;
  isMuted: boolean;
  hasEnded: boolean;
  readonly isPlaying: boolean;
  readonly isWaiting: boolean;
  readonly isFree: boolean;
  readonly live: Stream[];
  readonly duration: number;
  readonly time: number;
  open(width: number): void;
  choose(grade: string, width: number): void;
  play(): void;
  pause(): void;
  toggle(): void;
  seek(seconds: number): void;
  setSpeed(speed: number): void;
  setSound(loudness: number, isMuted: boolean): void;
  lead(stream: Stream): void;
  enable(stream: Stream, isEnabled: boolean): void;
  close(): void;
}

interface Actions {
  setVolume(value: number): void;
  louder(step: number): void;
  mute(): void;
  setSpeed(value: number): void;
  faster(step: number): void;
  skip(seconds: number): void;
  chapter(step: number): boolean;
}

interface Transport {
  element: HTMLElement;
  actions: Actions;
  playButton: HTMLElement;
  disable(): void;
}

interface MenuAction {
  icon: string;
  label: string;
  act(): void;
}

interface Pager {
  count: number;
  index: number;
  go(index: number): void;
}

interface Sheet {
  element: HTMLElement;
  tools: HTMLElement;
  onFail(): void;
  onSize(width: number, height: number): void;
  show(path: string, look: {label: string; width?: number; height?: number; larger?: string}): void;
  zoomBy(step: number): void;
  fit(): void;
  isZoomed(): boolean;
  close(): void;
}

interface View {
  readonly value: string;
  set(name: string): void;
  swap(): void;
  next(): void;
}

interface Stage {
  element: HTMLElement;
  controls: HTMLElement | null;
  player: Player | null;
  transport?: Transport;
  elements?: MediaElement[];
  pager?: Pager | null;
  sheet?: Sheet;
  view?: View;
  toggleText?(): void;
  cancelNext?(): void;
  close(): void;
}

interface StageContext {
  memory: Memory;
  start: Start;
  frameButtons(): HTMLElement[];
  frameActions(elements: MediaElement[]): MenuAction[];
  frameMenu(actions?: MenuAction[]): HTMLElement[];
  listenToGestures(element: HTMLElement, stage: Pick<Stage, 'player' | 'transport' | 'pager'>): void;
  note(): void;
  focus(): void;
  again(): void;
  terms(): string[];
  onPage(index: number): void;
}

interface TimedOptions {
  content(elements: MediaElement[], player: Player): any;
  extras?(player: Player, elements: MediaElement[]): HTMLElement[];
  choosers?(): HTMLElement[];
  chapters?: Chapter[];
  cover?: boolean;
  host?: HTMLElement;
  ratio?: number;
  keepsShape?: boolean;
  runsAlone?: boolean;
}

interface Hit {
  item: Item;
  kind: string;
  text: string;
  t?: number;
  page?: number;
}

type Find = (query: string) => {hits: Hit[]; terms: string[]; total: number};

interface Frame {
  readonly isPresenting: boolean;
  readonly isOver: boolean;
  readonly isAsleep: boolean;
  fit(): void;
  toggleFullscreen(): void;
  togglePresenting(): void;
  toggleBlank(): void;
  togglePictureInPicture(): void;
  toggleTheatre(): void;
  toggleSide(): void;
  showChoices(): void;
  leave(): boolean;
  wake(): void;
  buttons(): HTMLElement[];
  actions(elements: MediaElement[]): MenuAction[];
  menu(more?: MenuAction[]): HTMLElement[];
}

interface Panel {
  name: string;
  label: string;
  content: HTMLElement;
}

interface Lists {
  panels: Panel[];
  chapters: {element: HTMLElement; follow(time: number): void} | null;
  pages: {element: HTMLElement; follow(index: number): void} | null;
}

interface App {
  data: Raw;
  memory: Memory;
  screen: Frame;
  places: {note(isAtOnce: boolean): void; keep(): void};
  pack: Pack | null;
  find: Find | null;
  view: HTMLElement | null;
  item: Item | null;
  stage: Stage | null;
  frame: HTMLElement | null;
  terms: string[];
  readonly isLonely: boolean;
  neighbour(step: number): Item | null;
  apply(): void;
  rebuild(before?: () => void): Promise<void>;
  wordsChanged(): void;
  route(): void;
  showItem(item: Item, start: Start): void;
  open(item: Item, play?: boolean): void;
  step(by: number): void;
  goHome(): void;
  leave(): void;
  copyLink(): void;
  openSearch(): void;
  openSettings(): void;
  openHelp(): void;
  print(): void;
}

interface Keyed {
  screen: Frame;
  stage(): Stage | null;
  frame(): HTMLElement | null;
  isOn(): boolean;
  step(by: number): void;
  copyLink(): void;
  openSearch(): void;
  goHome(): void;
  leave(): void;
  openHelp(): void;
}

interface LiveText extends EventTarget {
  object: any;
  value: string;
  refresh(): Promise<void>;
  write(value: string): Promise<void>;
}

type Properties = Record<string, any> | null;
type Make = (tag: string, properties?: Properties, ...children: any[]) => any;

interface OliveNamespace {
  // dom
  make: Make;
  icon(name: string): SVGElement;
  setIcon(button: Element, name: string): void;
  iconButton(icon: string, label: string, onclick: (event: Event) => void, properties?: Properties): HTMLButtonElement;
  relabel(button: HTMLElement, label: string): void;
  show(node: HTMLElement, shown: boolean): void;
  paragraphs(text: string): HTMLElement[];
  safeAddress(text: string): string | null;
  outsideLink(address: string, ...content: any[]): HTMLAnchorElement;
  picture(path: string, properties?: Properties, standIn?: () => Element): HTMLImageElement;
  announce(text: string): void;
  clock(seconds: number): string;
  clamp(value: number, low: number, high: number): number;
  icons: Record<string, string>;
  // words
  languages: Record<string, {direction: string; words: Record<string, string | Record<string, string>>}>;
  languageNames: Record<string, string>;
  languageFor(tag: string): string;
  speak(tag: string): void;
  language(): string;
  say(key: string, values?: Record<string, any>): string;
  number(value: number, digits?: number): string;
  day(date: Date): string;
  fileSize(megaBytes: number): string;
  spokenTime(seconds: number): string;
  // load
  groups: Record<string, string[]>;
  load(...groups: string[]): Promise<unknown>;
  isLoaded(...groups: string[]): boolean;
  groupsOf(item: Item): string[];
  loadWords(tag: string): Promise<unknown>;
  // what is read, kept and found
  readPackage(data: Raw): Pack;
  rereadWords(pack: Pack): void;
  partsOf(item: Item): Source[];
  isPicture(file: MediaFile): boolean;
  openMemory(packageId: string): Memory;
  address: {
    read(): Start & {item: string};
    to(place: {item: string; t?: number; page?: number; view?: string}): string;
    note(place: {item: string; t?: number; page?: number; view?: string}): void;
    link(place: {item: string; t?: number; page?: number; view?: string}): string;
  };
  makeFinder(items: Item[]): Find;
  highlighted(text: string, terms: string[], whole?: boolean): (string | HTMLElement)[];
  termsOf(query: string): string[];
  Grades: new (source: {files: MediaFile[]}, wanted: string) => Grades;
  gradeLabel(choice: {grade: string; file: MediaFile}): string;
  pixelsAcross(node: Element): number;
  pictureFile(source: Source, width: number): MediaFile | null;
  stillAddress(source: Source, width: number): string;
  // the stage
  ratioOf(source: Source): number;
  shownRatio(element: any, told: number): number;
  setShape(stage: HTMLElement, ratio: number): void;
  Player: new (
    parts: (Part & {element: MediaElement; grades: Grades})[],
    duration: number,
    runsAlone?: boolean,
  ) => Player;
  SeekBar: new (player: Player, chapters: Chapter[]) => {bar: HTMLElement; range: HTMLInputElement; update(): void};
  makeTransport(
    player: Player,
    options: {
      chapters: Chapter[];
      choices: {grade: string; file: MediaFile}[];
      grade: string;
      onGrade(grade: string): void;
      extras: HTMLElement[];
      choosers: HTMLElement[];
      more: MenuAction[];
      last: HTMLElement;
      memory: Memory;
    },
  ): Transport;
  menuChoice(
    label: string,
    options: any[][],
    value: any,
    onChoose: (value: any) => void,
  ): {element: HTMLElement; set(value: any): void};
  menuAction(action: MenuAction): HTMLElement;
  makeMenu(icon: string, label: string, content: any[]): {element: HTMLElement; button: HTMLElement; close(): void};
  listenToGestures(
    stage: HTMLElement,
    acts: {
      toggle: (() => void) | null;
      skip: ((seconds: number) => void) | null;
      turn(step: number): void;
      toggleFullscreen(): void;
      isAsleep(): boolean;
    },
  ): void;
  makeMessage(text: string, file: MediaFile | null, retry: (() => void) | null): HTMLElement;
  makeCover(poster: string, resumeAt: number, startHere: (seconds: number | null) => void): HTMLElement;
  makeBlockedCover(start: () => void): HTMLElement;
  timedStage(item: Item, context: StageContext, parts: Part[], options: TimedOptions): Stage;
  stages: Record<string, (item: Item, context: StageContext) => Stage>;
  bestFile(item: Item): MediaFile | null;
  posterOf(item: Item): string;
  makeStage(item: Item, context: StageContext): Stage;
  makeDivider(acts: {value(): number; set(percent: number): void; usual(): number[]}): HTMLElement;
  Arrangement: new (options: {
    panes: HTMLElement[];
    ratioOf(index: number): number;
    share: number;
    memory: Memory;
    onHide(index: number, isHidden: boolean): void;
    onChange(): void;
  }) => View & {
    element: HTMLElement;
    readonly controls: HTMLElement;
    chooser: {element: HTMLElement};
    fit(): void;
    close(): void;
  };
  makeSheet(): Sheet;
  voiceOver(item: Item, context: StageContext, stage: Stage, onTime: (player: Player) => void): Stage;
  // pages of the theme
  kindOf(item: {category: string}): string;
  titleOfPart(part: Source): string;
  makeCards(items: Item[], memory: Memory): HTMLElement;
  makeContents(items: Item[], current: Item, memory: Memory): HTMLElement;
  makeChapters(chapters: Chapter[], onChoice: (start: number) => void): NonNullable<Lists['chapters']>;
  makePages(pages: Preview[], onChoice: (index: number) => void): NonNullable<Lists['pages']>;
  makeExtras(extras: Source[]): HTMLElement;
  reveal(entry: Element | null): void;
  makeHome(app: App): {show(): HTMLElement[]; leave(item: Item): void; restore(): void};
  makeHead(app: App): HTMLElement;
  listsOf(app: App, item: Item, stage: Stage): Lists;
  makeSide(panels: Panel[], app: App): HTMLElement;
  makeItemPage(
    app: App,
    item: Item,
    start: Start,
  ): {stage: Stage | null; frame: HTMLElement | null; lists: Lists | null; content: HTMLElement[]};
  makePlaces(app: App): App['places'];
  tellSystem(app: App): void;
  tellSystemState(isPlaying: boolean): void;
  offerNext(app: App, next: Item): void;
  Frame: new (app: App) => Frame;
  openDialog(name: string, title: string, content: any): HTMLDialogElement;
  openSearch(find: Find, query: string, onChoice: (hit: Hit, terms: string[], asked: string) => void): void;
  openSettings(app: App): void;
  openHelp(keys: [string[], string][]): void;
  openLink(link: string): void;
  print(): void;
  keyHelp: [string[], string][];
  listenToKeys(app: Keyed): void;
  start(data: Raw): Promise<void>;
  app: App;
  // editing
  whyNotSaved(error: {code?: unknown; message: string}): string;
  EditField: new (options: {
    text: LiveText;
    isLong: boolean;
    name: string;
    edit: string;
    onShut(field: any, isSaved: boolean): void;
    onLost(field: any, value: string, why: string): void;
  }) => any;
  makeEditable(options: {
    node: HTMLElement;
    text: LiveText;
    kind: string;
    of: string;
    render(value: string): void;
  }): {element: HTMLElement; close(): void};
  settleEdits(): void;
  ask(question: {
    title: string;
    text: string;
    yes: string;
    act(close: () => void): Promise<void>;
    why(error: any): string;
  }): void;
  openUnsaved(name: string, value: string, why: string): void;
  LiveText: new (name: string, value: string, again: () => Promise<void>) => LiveText;
  LiveModel: new (app: App, told: Record<string, (...given: any[]) => void>) => any;
  LivePage: new (app: App, model: any) => any;
  dressExtras(view: HTMLElement, model: any, item: Item): void;
  dropExtras(item: Item): void;
  goLive(app: App): void;
}

declare global {
  // What selectors find in this page are elements of HTML.
  interface ParentNode {
    querySelector<E extends Element = HTMLElement>(selectors: string): E | null;
    querySelectorAll<E extends Element = HTMLElement>(selectors: string): NodeListOf<E>;
  }
  interface Window {
    Olive: OliveNamespace;
    appData?: Raw;
  }
  interface Navigator {
    connection?: {saveData?: boolean};
  }
}
