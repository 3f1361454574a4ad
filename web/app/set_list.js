// The set-list of a long recording: what ran from when to when, as rows, as text and as CSV.

import { nameAndArtist, nameOf, placeOf } from "./answers.js";
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
          seconds(begin),
          seconds(end),
          nameOf(match),
          match.artist ?? "",
          match.source ?? "",
          seconds(placeOf(match)),
          match.sure ?? "",
        ]
      : [seconds(begin), seconds(end), "", "", "", "", ""],
  );
  const header = ["begin", "end", "title", "artist", "source", "place", "sure"];
  return [header, ...rows].map((row) => row.map(field).join(",") + "\r\n").join("");
}

function seconds(number) {
  return number.toFixed(1);
}

/**
 * A spreadsheet takes what begins with one of these signs for a formula and computes it; titles
 * come from files of anybody. An apostrophe in front makes it text.
 */
const FORMULA = /^[=+\-@\t\r]/;
const NUMBER = /^-?\d+(\.\d+)?$/;

function field(text) {
  const safe = FORMULA.test(text) && !NUMBER.test(text) ? `'${text}` : text;
  return /[",\r\n]/.test(safe) ? `"${safe.replaceAll('"', '""')}"` : safe;
}

function oneLine(text) {
  return text.replace(/\s+/g, " ");
}
