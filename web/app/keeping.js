// Small things that the browser keeps for the page. A browser may refuse to keep anything (private
// windows, settings, full storage), and what it kept may have been changed; neither stops the page.

/** The most entries of the history; the oldest go first. */
export const MOST_ENTRIES = 100;

const HISTORY = "kzfp.history";
const TOKEN = "kzfp.token";

/**
 * What a storage holds under a name.
 *
 * @param {() => Storage} storage  Called each time: the access itself may throw.
 */
function read(storage, name) {
  try {
    return storage().getItem(name);
  } catch {
    return null;
  }
}

/** Whether it was kept. */
function write(storage, name, text) {
  try {
    if (text === null) {
      storage().removeItem(name);
    } else {
      storage().setItem(name, text);
    }
    return true;
  } catch {
    return false;
  }
}

/** A text, cut where no real title ends. */
function textOrNull(value) {
  return typeof value === "string" ? value.slice(0, 1000) : null;
}

function numberOr(value, otherwise) {
  return Number.isFinite(value) ? value : otherwise;
}

/** The latest time that a Date can hold, either side of 1970. */
const LATEST = 8.64e15;

/** An entry that is safe to show, whatever was stored; null when it is none. */
function validEntry(entry) {
  if (entry === null || typeof entry !== "object") {
    return null;
  }
  if (!Number.isFinite(entry.when) || Math.abs(entry.when) > LATEST) {
    return null;
  }
  return {
    when: entry.when,
    track: numberOr(entry.track, 0),
    title: textOrNull(entry.title),
    artist: textOrNull(entry.artist),
    source: textOrNull(entry.source) ?? "",
    place: numberOr(entry.place, 0),
    from: textOrNull(entry.from),
  };
}

/**
 * @typedef {object} HistoryEntry
 * @property {number} when         milliseconds since 1970
 * @property {number} track        its number in the catalogue
 * @property {string|null} title
 * @property {string|null} artist
 * @property {string} source
 * @property {number} place        seconds of the track
 * @property {string|null} from    the file's name; null for the microphone
 */

/** What was recognised before, newest first. Without a working storage it ends with the tab. */
export class History {
  #storage;
  #entries;
  #lasting = true;

  /** @param {() => Storage} storage  For example `() => localStorage`. */
  constructor(storage) {
    this.#storage = storage;
    this.#entries = this.#load();
  }

  /** @returns {HistoryEntry[]} */
  get entries() {
    return this.#entries;
  }

  /** Whether the last change was kept by the browser. */
  get lasting() {
    return this.#lasting;
  }

  /** @param {HistoryEntry} entry */
  add(entry) {
    // Another tab may have added entries since.
    const stored = this.#lasting ? this.#load() : this.#entries;
    this.#entries = [validEntry(entry), ...stored].slice(0, MOST_ENTRIES);
    this.#lasting = write(this.#storage, HISTORY, JSON.stringify(this.#entries));
  }

  clear() {
    this.#entries = [];
    this.#lasting = write(this.#storage, HISTORY, null);
  }

  #load() {
    try {
      const stored = JSON.parse(read(this.#storage, HISTORY) ?? "[]");
      return Array.isArray(stored)
        ? stored.map(validEntry).filter(Boolean).slice(0, MOST_ENTRIES)
        : [];
    } catch {
      return [];
    }
  }
}

/** The server takes no others for a token, and most of the others no header of HTTP can carry. */
const TOKEN_TEXT = /^[!-~]+$/;

/**
 * Whether a text can be a token: visible characters of ASCII.
 *
 * @param {string} text
 */
export function isToken(text) {
  return TOKEN_TEXT.test(text);
}

/** The token for the server, for as long as the tab is open. */
export class Token {
  #storage;
  #value;

  /** @param {() => Storage} storage  For example `() => sessionStorage`. */
  constructor(storage) {
    this.#storage = storage;
    const stored = read(storage, TOKEN);
    this.#value = stored !== null && isToken(stored) ? stored : null;
  }

  /** @returns {string|null} */
  get value() {
    return this.#value;
  }

  /** @param {string|null} value  Null forgets it. */
  set value(value) {
    this.#value = value;
    write(this.#storage, TOKEN, value);
  }
}
