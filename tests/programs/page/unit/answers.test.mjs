// How answers are put into words.

import assert from "node:assert/strict";
import { test } from "node:test";

import * as answers from "../../../../web/app/answers.js";
import { clockText, lengthText } from "../../../../web/app/times.js";

const MATCH = {
  track: 7,
  source: "music/boats/trip.ogg",
  title: "Trip",
  artist: "JDruid",
  sure: "certain",
  score: 12.94,
  threshold: 7.3,
  offset: 100.2,
  speed: 1,
  tempo: 1,
  pitch: 1,
  clip_begin: 0,
  clip_end: 11,
};

test("a place is minutes and seconds", () => {
  assert.equal(clockText(100.2), "1:40");
  assert.equal(clockText(59.99), "1:00");
  assert.equal(clockText(0), "0:00");
  assert.equal(clockText(3725), "1:02:05");
  assert.equal(clockText(-2.5), "−0:02");
  assert.equal(clockText(-0.4), "0:00");
  assert.equal(clockText(NaN), "?");
});

test("a length is read as words", () => {
  assert.equal(lengthText(100), "1 minute 40 seconds");
  assert.equal(lengthText(3601), "1 hour 1 second");
  assert.equal(lengthText(0.2), "0 seconds");
});

test("a track without a title has its file's name", () => {
  assert.equal(answers.nameOf(MATCH), "Trip");
  assert.equal(answers.nameOf({ ...MATCH, title: " " }), "trip.ogg");
  assert.equal(answers.nameOf({ ...MATCH, title: null, source: "C:\\a\\b.mp3" }), "b.mp3");
  assert.equal(answers.nameOf({ track: 7, source: "" }), "Track 7");
});

test("the announcement names title, artist, place", () => {
  assert.equal(answers.announcement(MATCH), "Recognised: Trip by JDruid, at 1:40.");
  assert.equal(answers.announcement({ ...MATCH, artist: null }), "Recognised: Trip, at 1:40.");
});

test("the place is where the heard part begins", () => {
  assert.equal(answers.placeOf({ ...MATCH, clip_begin: 10, tempo: 1.05 }), 100.2 + 10.5);
  assert.equal(answers.placeOf({ offset: 3 }), 3);
});

test("changes of speed are told, small ones not", () => {
  assert.equal(answers.changesOf(MATCH), "");
  assert.equal(answers.changesOf({ ...MATCH, speed: 1.0391 }), "about 4 % faster");
  assert.equal(answers.changesOf({ ...MATCH, speed: 0.96 }), "about 4 % slower");
  assert.equal(
    answers.changesOf({ ...MATCH, tempo: 1.03, pitch: 0.98 }),
    "about 3 % quicker in tempo, about 2 % lower in pitch",
  );
  assert.equal(answers.changesOf({ ...MATCH, speed: 1.004 }), "");
});

test("certainty comes with its numbers", () => {
  assert.equal(answers.sureText(MATCH), "certain (score 12.9, 7.3 needed)");
});

test("a reading at another speed is undone", () => {
  const answer = { verdict: "match", matches: [{ ...MATCH, tempo: 1.01, clip_end: 10.4 }] };
  const [own] = answers.atOwnSpeed(answer, 1.04).matches;
  assert.equal(own.tempo, 1.01 * 1.04);
  assert.equal(own.speed, 1.04);
  assert.equal(own.clip_end, 10);
  assert.equal(own.offset, MATCH.offset);
  assert.equal(answer.matches[0].clip_end, 10.4, "the answer itself is left as it is");
});

test("what was skipped counts as part of the clip", () => {
  const answer = { verdict: "match", matches: [{ ...MATCH, tempo: 1.1 }] };
  const [own] = answers.fromTheStart(answer, 0.5).matches;
  assert.equal(own.offset, MATCH.offset - 0.55);
  assert.equal(own.clip_begin, 0.5);
  assert.equal(own.clip_end, 11.5);
});

test("of answers without track the nearest is told", () => {
  const verdicts = (...list) => answers.bestOf(list.map((verdict) => ({ verdict, matches: [] })));
  assert.equal(verdicts("no match", "not sure", "too quiet").verdict, "not sure");
  assert.equal(verdicts("too quiet", "no match").verdict, "no match");
  const match = { verdict: "match", matches: [MATCH] };
  assert.deepEqual(answers.bestOf([{ verdict: "not sure" }, match]), match);
  assert.deepEqual(answers.bestOf([match, { verdict: "no match" }]), match);
});

test("what an answer lacks is kept and told", () => {
  const given = [
    { verdict: "not sure", left_out: 2 },
    { verdict: "no match", shards: { answered: 2, of: 3 } },
    { verdict: "no match", shards: { answered: 1, of: 3 }, left_out: 1, warning: "It is cut." },
  ];
  const best = answers.bestOf(given);
  assert.deepEqual(best, {
    verdict: "not sure",
    left_out: 2,
    shards: { answered: 1, of: 3 },
    warning: "It is cut.",
  });
  const text = answers.lacksText(best);
  assert.match(text, /^Part of the catalogue was not searched: 1 of its 3 servers answered/);
  assert.match(text, /was not searched: 2 tracks are damaged\..*The server says: It is cut\.$/);
  assert.equal(answers.lacksText({ verdict: "match" }), "");
});
