// Set-lists as rows, text and CSV.

import assert from "node:assert/strict";
import { test } from "node:test";

import { entriesOf, merged, toCsv, toText } from "../../../../web/app/set_list.js";

const track = (title, clip_begin, clip_end) => ({
  track: 1,
  title,
  artist: "Band",
  source: "a/b.ogg",
  sure: "certain",
  score: 12,
  threshold: 7,
  offset: 10 - clip_begin,
  tempo: 1,
  clip_begin,
  clip_end,
});

const ANSWER = {
  verdict: "match",
  matches: [track("Second", 70, 130), track("First", 0, 60)],
  gaps: [{ clip_begin: 60, clip_end: 70 }],
};

test("entries stand in the order of the recording", () => {
  const entries = entriesOf(ANSWER);
  assert.deepEqual(entries.map((entry) => entry.begin), [0, 60, 70]);
  assert.deepEqual(
    entries.map((entry) => entry.match?.title ?? null),
    ["First", null, "Second"],
  );
  assert.deepEqual(entriesOf({}), []);
});

const passage = (title, clip_begin, clip_end, score, number = 1) => ({
  ...track(title, clip_begin, clip_end),
  track: number,
  offset: number * (title === "B" ? 100 : 10),
  score,
});
const timesOf = (answer) =>
  answer.matches.map(({ title, clip_begin, clip_end }) => [title, clip_begin, clip_end]);
const matching = (...matches) => ({ verdict: "match", matches });

test("of several answers the surest passages stay", () => {
  const answer = merged(
    [
      matching(passage("wrong track", 0, 60, 8, 2), passage("B", 70, 130, 9)),
      matching(passage("A", 1, 59, 12)),
      matching(passage("B", 71, 129, 8)),
    ],
    140,
  );
  assert.deepEqual(timesOf(answer), [["A", 1, 59], ["B", 71, 129]]);
  assert.deepEqual(answer.gaps, [
    { clip_begin: 59, clip_end: 71 },
    { clip_begin: 129, clip_end: 140 },
  ]);
});

test("a passage ends where two answers say", () => {
  const ends = [[0, 42, 15], [1, 35, 9], [1, 35, 10]];
  const answers = ends.map(([begin, end, score]) => matching(passage("A", begin, end, score)));
  const { matches } = merged(answers, 100);
  assert.deepEqual([matches[0].score, matches[0].clip_begin, matches[0].clip_end], [15, 1, 35]);
});

test("what one answer cuts in two stays whole", () => {
  const whole = passage("A", 0, 90, 9);
  const parts = [passage("A", 0, 30, 20), passage("A", 60, 90, 20)];
  const answer = merged([matching(...parts), matching(whole), matching(whole)], 90);
  assert.deepEqual(timesOf(answer), [["A", 0, 90]]);
});

test("a track that runs twice has two passages", () => {
  const again = { ...passage("A", 60, 120, 9), offset: -60 };
  const answers = [1, 2].map(() => matching({ ...passage("A", 0, 60, 9), offset: 0 }, again));
  assert.deepEqual(timesOf(merged(answers, 120)), [["A", 0, 60], ["A", 60, 120]]);
});

test("a passage ends where the next one begins", () => {
  const answers = [matching(passage("A", 0, 62, 9)), matching(passage("B", 60, 90, 8, 2))];
  const answer = merged(answers, 91);
  assert.deepEqual(answer.matches.map((match) => match.clip_end), [60, 90]);
  assert.deepEqual(answer.gaps, []);
});

test("a passage goes on after one within it", () => {
  const outer = passage("A", 0, 120, 8);
  const inner = [passage("B", 40, 60, 20, 2), passage("C", 58, 70, 30, 3)];
  const answer = merged([matching(outer, ...inner)], 120);
  assert.deepEqual(timesOf(answer), [
    ["A", 0, 40],
    ["B", 40, 58],
    ["C", 58, 70],
    ["A", 70, 120],
  ]);
  assert.deepEqual(answer.gaps, []);
  const late = merged([matching(passage("A", 0, 61, 8), inner[0])], 61);
  assert.deepEqual(timesOf(late), [["A", 0, 40], ["B", 40, 60]], "a second more is no passage");
});

test("a set-list says what its answers lack", () => {
  const shards = { answered: 1, of: 2 };
  const answers = [matching(passage("A", 0, 60, 9)), { verdict: "no match", shards, left_out: 1 }];
  const { shards: kept, left_out: leftOut } = merged(answers, 60);
  assert.deepEqual([kept, leftOut], [shards, 1]);
});

test("answers without passages give none", () => {
  const answer = merged([{ verdict: "no match", matches: [] }, { verdict: "not sure" }], 90);
  assert.equal(answer.verdict, "not sure");
});

test("text has a line for each entry and gap", () => {
  assert.equal(
    toText(entriesOf(ANSWER)),
    "0:00 – 1:00  First by Band\n1:00 – 1:10  not recognised\n1:10 – 2:10  Second by Band\n",
  );
});

test("a title with a line end stays on one line", () => {
  const [line, rest] = toText(entriesOf({ matches: [track("A\nB", 0, 5)] })).split("\n");
  assert.equal(line, "0:00 – 0:05  A B by Band");
  assert.equal(rest, "");
});

test("CSV has a header, times and places in seconds", () => {
  const lines = toCsv(entriesOf(ANSWER)).split("\r\n");
  assert.equal(lines[0], "begin,end,title,artist,source,place,sure");
  assert.equal(lines[1], "0.0,60.0,First,Band,a/b.ogg,10.0,certain");
  assert.equal(lines[2], "60.0,70.0,,,,,");
  assert.equal(lines.length, 5);
});

test("CSV quotes commas, quotes and line ends", () => {
  const csv = toCsv(entriesOf({ matches: [track('He said "no",\nthen', 0, 5)] }));
  assert.ok(csv.includes('"He said ""no"",\nthen"'), csv);
});

test("a title cannot become a spreadsheet formula", () => {
  const titleOf = (title) =>
    toCsv(entriesOf({ matches: [track(title, 0, 5)] })).split("\r\n")[1].split(",")[2];
  assert.equal(titleOf("=1+1"), "'=1+1");
  assert.equal(titleOf("@home"), "'@home");
  for (const sign of ["\uff1d", "\uff0b", "\uff0d", "\uff20"]) {
    assert.equal(titleOf(`${sign}1`), `'${sign}1`);
  }
  assert.equal(titleOf("-5"), "-5", "a number is one");
  assert.equal(titleOf("C=64"), "C=64");
});
