// The set-list of a long recording: what ran from when to when, as entries, as text and as CSV.

import { bestOf, isMatch, lacksOf, nameAndArtist, nameOf, placeOf } from "./answers.js";
import { clockText } from "./times.js";

/**
 * @typedef {object} Entry
 * @property {number} begin       seconds of the recording
 * @property {number} end
 * @property {object|null} match  null where nothing was recognised
 */

/**
 * The entries of an answer with passages, in the order of the recording.
 *
 * @param {{matches?: object[], gaps?: object[]}} answer
 * @returns {Entry[]}
 */
export function entriesOf(answer) {
  const found = (answer.matches ?? []).map((match) => ({
    begin: match.clip_begin ?? 0,
    end: match.clip_end ?? 0,
    match,
  }));
  const gaps = (answer.gaps ?? []).map((gap) => ({
    begin: gap.clip_begin,
    end: gap.clip_end,
    match: null,
  }));
  return [...found, ...gaps].sort((one, other) => one.begin - other.begin || one.end - other.end);
}

/** Shorter stretches between two passages are no gap, in seconds: ends are found to a second. */
const SHORTEST_GAP = 2;

/** A passage that lies in others by more than this share of it is what they are. */
const MOST_OVERLAP = 0.5;

/** Answers that place a track within so many seconds of each other mean the same playing of it. */
const SAME_PLACE = 2;

/**
 * One answer out of several about one recording. Where they disagree, the passage stays that is
 * above its threshold by most, for longest and in most answers.
 *
 * @param {object[]} answers  With passages, in seconds of the recording.
 * @param {number} seconds    that the recording lasts
 * @returns {object} an answer with `matches`, in the recording's order, and `gaps`
 */
export function merged(answers, seconds) {
  const playings = playingsOf(answers.filter(isMatch));
  const kept = [];
  for (const playing of playings.sort((one, other) => other.weight - one.weight)) {
    const match = { ...playing.best, ...endsOf(playing) };
    if (sharedWith(kept, match) <= MOST_OVERLAP * (match.clip_end - match.clip_begin)) {
      kept.push(match);
    }
  }
  if (kept.length === 0) {
    return bestOf(answers);
  }
  const matches = withoutOverlap(kept.sort(byBegin));
  return { verdict: "match", matches, gaps: gapsBetween(matches, seconds), ...lacksOf(answers) };
}

/**
 * A track that was played once, as several answers have it. `offset` is the place of the
 * recording's beginning in it, so that no two playings of a track have the same.
 *
 * @typedef {object} Playing
 * @property {object} best                         the match that scores highest
 * @property {number} weight                       what speaks for it
 * @property {Map<object, [number, number]>} ends  by answer, in seconds of the recording
 */

/** @returns {Playing[]} */
function playingsOf(answers) {
  const playings = [];
  const isOf = (match) => (playing) =>
    playing.best.track === match.track &&
    Math.abs(playing.best.offset - match.offset) <= SAME_PLACE;
  for (const answer of answers) {
    for (const match of answer.matches) {
      let playing = playings.find(isOf(match));
      if (!playing) {
        playing = { best: match, weight: 0, ends: new Map() };
        playings.push(playing);
      }
      addTo(playing, answer, match);
    }
  }
  return playings;
}

function addTo(playing, answer, match) {
  const { clip_begin: begin, clip_end: end, score, threshold } = match;
  const [first, last] = playing.ends.get(answer) ?? [Infinity, -Infinity];
  playing.ends.set(answer, [Math.min(first, begin), Math.max(last, end)]);
  playing.weight += (score - threshold) * (end - begin);
  if (score > playing.best.score) {
    playing.best = match;
  }
}

/** Its ends as two answers have them: one alone may take what comes before or after for more. */
function endsOf({ ends }) {
  const second = (values) => values[Math.min(1, values.length - 1)];
  const begins = [...ends.values()].map(([begin]) => begin);
  const lasts = [...ends.values()].map(([, end]) => end);
  return {
    clip_begin: second(begins.sort((one, other) => one - other)),
    clip_end: second(lasts.sort((one, other) => other - one)),
  };
}

/** In the recording's order; of two that begin together the shorter one is the later. */
function byBegin(one, other) {
  return one.clip_begin - other.clip_begin || other.clip_end - one.clip_end;
}

/** Seconds of a passage that lie in others. */
function sharedWith(others, match) {
  const shared = (other) =>
    Math.min(match.clip_end, other.clip_end) - Math.max(match.clip_begin, other.clip_begin);
  return others.reduce((sum, other) => sum + Math.max(0, shared(other)), 0);
}

/** A passage ends where the next one begins, and goes on where that ends if it lasts longer. */
function withoutOverlap(matches) {
  const times = matches.flatMap(({ clip_begin: begin, clip_end: end }) => [begin, end]);
  const borders = [...new Set(times)].sort((one, other) => one - other);
  const parts = [];
  for (let i = 0; i + 1 < borders.length; ++i) {
    const [begin, end] = [borders[i], borders[i + 1]];
    const runs = (match) => match.clip_begin <= begin && end <= match.clip_end;
    addPart(parts, matches.filter(runs).at(-1), begin, end);
  }
  const isWorthTelling = ({ match, begin, end }) =>
    begin === match.clip_begin || end - begin >= SHORTEST_GAP;
  return parts
    .filter(isWorthTelling)
    .map(({ match, begin, end }) => ({ ...match, clip_begin: begin, clip_end: end }));
}

/** Adds a stretch to the part before it when both are of the same passage. */
function addPart(parts, match, begin, end) {
  const last = parts.at(-1);
  if (match && last?.match === match && last.end === begin) {
    last.end = end;
  } else if (match) {
    parts.push({ match, begin, end });
  }
}

function gapsBetween(matches, seconds) {
  const begins = [0, ...matches.map((match) => match.clip_end)];
  const ends = [...matches.map((match) => match.clip_begin), seconds];
  return begins
    .map((begin, i) => ({ clip_begin: begin, clip_end: ends[i] }))
    .filter((gap) => gap.clip_end - gap.clip_begin >= SHORTEST_GAP);
}

/**
 * One line for each entry, for a note or a message.
 *
 * @param {Entry[]} entries
 * @returns {string} "0:00 – 3:12  Title by Artist" and so on, each with a line end
 */
export function toText(entries) {
  return entries
    .map(({ begin, end, match }) => {
      const name = match ? nameAndArtist(match) : "not recognised";
      return `${clockText(begin)} – ${clockText(end)}  ${oneLine(name)}\n`;
    })
    .join("");
}

/**
 * The same for spreadsheets: comma-separated values after RFC 4180, times in seconds.
 *
 * @param {Entry[]} entries
 * @returns {string}
 */
export function toCsv(entries) {
  const rows = entries.map(({ begin, end, match }) =>
    match
      ? [
          secondsText(begin),
          secondsText(end),
          nameOf(match),
          match.artist ?? "",
          match.source ?? "",
          secondsText(placeOf(match)),
          match.sure ?? "",
        ]
      : [secondsText(begin), secondsText(end), "", "", "", "", ""],
  );
  const header = ["begin", "end", "title", "artist", "source", "place", "sure"];
  return [header, ...rows].map((row) => row.map(field).join(",") + "\r\n").join("");
}

function secondsText(number) {
  return number.toFixed(1);
}

/**
 * A spreadsheet takes what begins with one of these signs for a formula and computes it, some also
 * their full-width forms; titles come from files of anybody. An apostrophe in front makes it text.
 */
const FORMULA = /^[=+\-@\t\r\uff1d\uff0b\uff0d\uff20]/;
const NUMBER = /^-?\d+(\.\d+)?$/;

function field(text) {
  const safe = FORMULA.test(text) && !NUMBER.test(text) ? `'${text}` : text;
  return /[",\r\n]/.test(safe) ? `"${safe.replaceAll('"', '""')}"` : safe;
}

function oneLine(text) {
  return text.replace(/\s+/g, " ");
}
