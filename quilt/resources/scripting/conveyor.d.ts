// SPDX-License-Identifier: Apache-2.0
// What conveyor.js offers: as globals in a page that "quilt serve" serves, as exports in Node 18 or later.

/** Makes a client from the address that "quilt serve" prints. Nothing is sent before it is first asked for something. */
export function connect(address: string): Conveyor;

/** Why a call was not done. */
export class ConveyorError extends Error {
  /**
   * 'no-accessor', 'wrong-arguments': the call is not as the class offers it.
   * 'no-object', 'no-session': the object, or this client's session, is no more.
   * 'busy': nothing was done; 'too-slow': it was begun and may still be done.
   * 'not-saved': it was done, but the document's record cannot be written.
   * 'too-many-objects', 'too-many-sessions': a limit of the bridge.
   * 'bad-address', 'refused', 'bad-request', 'failed': everything else.
   */
  readonly code: string;
}

export interface ChangeEvent {
  type: 'change';
  /** An object that this client was given before. */
  object: ConveyorObject;
  /** Its accessors that answer otherwise now, with their colons: 'cvTitle', 'cvMediaAtIndex:'. */
  accessors: string[];
}

export interface CloseEvent {
  type: 'close';
  /** What went wrong, or null when the bridge has ended. */
  error: Error | null;
}

export class Conveyor {
  constructor(address: string);
  /** The document that is served. */
  document(): Promise<QuiltDocument>;
  /** The collection that the document is in. */
  collection(): Promise<QuiltCollection | null>;
  /** While there are listeners, the client keeps a connection open, and Node does not end. */
  addEventListener(type: 'change', listener: (event: ChangeEvent) => void): void;
  addEventListener(type: 'close', listener: (event: CloseEvent) => void): void;
  removeEventListener(type: 'change', listener: (event: ChangeEvent) => void): void;
  removeEventListener(type: 'close', listener: (event: CloseEvent) => void): void;
  /** Lets go of every object. */
  close(): Promise<void>;
}

declare global {
  /** In a page that "quilt serve" serves; undefined in a package opened from disk or hosted elsewhere. */
  var conveyor: Conveyor | undefined;
}

/** What every object has beside its accessors. */
export interface Stored {
  /**
   * What the object stores where this accessor of it, one without an argument, answers: null also where the accessor
   * answers something that stands in, as the title and the description of a document without them.
   */
  stored(accessor: string): Promise<string | number | string[] | ConveyorObject | null>;
}
export interface QuiltCollection extends Stored {}
export interface QuiltDocument extends Stored {}
export interface QuiltMedia extends Stored {}
export interface QuiltMediaSource extends Stored {}
export interface QuiltMediaDerivative extends Stored {}
export interface QuiltMediaPreview extends Stored {}

export type ConveyorObject =
  | QuiltCollection
  | QuiltDocument
  | QuiltMedia
  | QuiltMediaSource
  | QuiltMediaDerivative
  | QuiltMediaPreview;

// ---- The accessors, made from the table of the library

export interface QuiltCollection {
  readonly className: 'QuiltCollection';
  /** Its identity. */
  cvUUID(): Promise<string | null>;
  /** Its title. */
  cvTitle(): Promise<string | null>;
  /** Its description. */
  cvDescription(): Promise<string | null>;
  /** Its author. */
  cvAuthor(): Promise<string | null>;
  /** Its copyright notice. */
  cvCopyright(): Promise<string | null>;
  /** Its keywords, as one text. */
  cvKeywords(): Promise<string | null>;
  /** The day on which it was made, in the user's language: "March 5, 2024". */
  cvCreationDate(): Promise<string | null>;
}

export interface QuiltDocument {
  readonly className: 'QuiltDocument';
  /** Its identity. */
  cvUUID(): Promise<string | null>;
  /** Its title; a localised "Untitled Episode" when it has none. */
  cvTitle(): Promise<string | null>;
  /** Changes the title. */
  cvSetTitle(text: string | null): Promise<null>;
  /** Its description; a placeholder text when it has none. */
  cvDescription(): Promise<string | null>;
  /** Changes the description. */
  cvSetDescription(text: string | null): Promise<null>;
  /** Its author. */
  cvAuthor(): Promise<string | null>;
  /** Changes the author. */
  cvSetAuthor(text: string | null): Promise<null>;
  /** The day on which it was made, in the user's language: "March 5, 2024". */
  cvCreationDate(): Promise<string | null>;
  /** How many items it has. */
  cvMediaCount(): Promise<number>;
  /** The item at an index, or none. */
  cvMediaAtIndex(index: number): Promise<QuiltMedia | null>;
}

export interface QuiltMedia {
  readonly className: 'QuiltMedia';
  /** Its identity. */
  cvUUID(): Promise<string | null>;
  /** Its title. */
  cvTitle(): Promise<string | null>;
  /** Changes the title. */
  cvSetTitle(text: string | null): Promise<null>;
  /** Its description. */
  cvDescription(): Promise<string | null>;
  /** Changes the description. */
  cvSetDescription(text: string | null): Promise<null>;
  /** "Movie", "Audio", "Image", "Document", "Web", "Montage" or "DualSource". */
  cvContentCategory(): Promise<string | null>;
  /** Where its poster lies; an empty text when it has none. */
  cvPosterImagePath(): Promise<string | null>;
  /** Pixels; 0 when it has no poster. */
  cvPosterImageWidth(): Promise<number>;
  /** Pixels; 0 when it has no poster. */
  cvPosterImageHeight(): Promise<number>;
  /** How many sources it has. */
  cvSourcesCount(): Promise<number>;
  /** The source at an index, or none. */
  cvSourceAtIndex(index: number): Promise<QuiltMediaSource | null>;
  /** Its audio commentary, or none. */
  cvAudioCommentarySource(): Promise<QuiltMediaSource | null>;
  /** How many extras it has. */
  cvExtraCount(): Promise<number>;
  /** The extra at an index, or none. */
  cvExtraAtIndex(index: number): Promise<QuiltMediaSource | null>;
  /** Removes the extra at an index, with its files. */
  cvRemoveExtraAtIndex(index: number): Promise<null>;
}

export interface QuiltMediaSource {
  readonly className: 'QuiltMediaSource';
  /** Its identity. */
  cvUUID(): Promise<string | null>;
  /** Its title. */
  cvTitle(): Promise<string | null>;
  /** Changes the title. */
  cvSetTitle(text: string | null): Promise<null>;
  /** Its description. */
  cvDescription(): Promise<string | null>;
  /** Changes the description, until the record is read again: it keeps the title instead. */
  cvSetDescription(text: string | null): Promise<null>;
  /** Seconds from the start of its item; 0 when it has no time code. */
  cvTimeCode(): Promise<number>;
  /** "Movie", "Audio", "Image", "Document" or "Web". */
  cvContentCategory(): Promise<string | null>;
  /** Its best file, or none. */
  cvMainDerivative(): Promise<QuiltMediaDerivative | null>;
  /** How many files it has. */
  cvDerivativeCount(): Promise<number>;
  /** The file at an index, or none. */
  cvDerivativeAtIndex(index: number): Promise<QuiltMediaDerivative | null>;
  /** How many stills it has: chapters, pages, or one. */
  cvPreviewCount(): Promise<number>;
  /** The still at an index, made when it is missing, or none. */
  cvPreviewAtIndex(index: number): Promise<QuiltMediaPreview | null>;
}

export interface QuiltMediaDerivative {
  readonly className: 'QuiltMediaDerivative';
  /** Its identity. */
  cvUUID(): Promise<string | null>;
  /** Its type identifier. */
  cvContentType(): Promise<string | null>;
  /** The grades that it serves: "Desktop", "720p", "480p". */
  cvCompatibilityTags(): Promise<string[] | null>;
  /** Where the file lies; the path part of the address of a web page. */
  cvPath(): Promise<string | null>;
  /** The address of the file or web page. */
  cvURL(): Promise<string | null>;
}

export interface QuiltMediaPreview {
  readonly className: 'QuiltMediaPreview';
  /** Its identity. */
  cvUUID(): Promise<string | null>;
  /** Its title: the chapter's, or the first line of the page. */
  cvTitle(): Promise<string | null>;
  /** The text of the page. */
  cvContent(): Promise<string | null>;
  /** Seconds from the start of the source. */
  cvTimeCode(): Promise<number>;
  /** Pixels; 0 when it has no image. */
  cvWidth(): Promise<number>;
  /** Pixels; 0 when it has no image. */
  cvHeight(): Promise<number>;
  /** Where its image lies. */
  cvPath(): Promise<string | null>;
}
