// Listening from the microphone to the answer, without a browser.

import assert from "node:assert/strict";
import { test } from "node:test";

import { levelOf, Level } from "../../../../web/app/level.js";
import { listen } from "../../../../web/app/listening.js";
import { Recogniser, stretchesOf } from "../../../../web/app/recogniser.js";
import { asksPassages, MOMENTS } from "../../../../web/app/schedule.js";
import { ServiceAway } from "../../../../web/app/service.js";
import { HeardSound, SilentDevice } from "../../../../web/app/sound.js";
import { isTrail, mixed, secondsOfTrail } from "../../../../web/app/sound_files.js";

const RATE = 100;
const MATCH = { verdict: "match", matches: [{ track: 1, offset: 2 }] };
const NONE = { verdict: "no match", matches: [] };

/** A microphone that gives a second whenever the page has nothing else to do. */
function microphone(log) {
  return async ({ onSamples }) => {
    onSamples(new Float32Array(RATE).fill(0.1)); // before the rate is known
    const timer = setInterval(() => onSamples(new Float32Array(RATE).fill(0.1)), 1);
    timer.unref(); // one that is not stopped is to be noticed, not to run for ever
    return {
      rate: RATE,
      stop: async () => {
        clearInterval(timer);
        log.push("stopped");
        onSamples(new Float32Array(RATE).fill(0.1)); // the last piece comes late
        throw new Error("the device has gone meanwhile");
      },
    };
  };
}

/** Listens with a service that answers each asking by `answerTo(seconds)`. */
async function listenWith(answerTo, signal = new AbortController().signal) {
  const log = [];
  const moments = [];
  const recogniser = { ask: async (clip) => answerTo(clip.samples.length / clip.rate) };
  const answer = listen({
    openMicrophone: microphone(log),
    recogniser,
    signal,
    onHeard: () => log.length > 0 && log.push("heard after the end"),
    onClip: (clip) => moments.push(Math.floor(clip.samples.length / clip.rate)),
  });
  return { answer: await answer.catch((error) => error), moments, log };
}

test("asking ends with the first match", async () => {
  const { answer, moments, log } = await listenWith((seconds) => (seconds >= 8 ? MATCH : NONE));
  assert.equal(answer, MATCH);
  assert.equal(moments.length, 2);
  assert.ok(moments[0] >= 5 && moments[1] >= 8);
  assert.deepEqual(log, ["stopped"]);
});

test("after the last moment there is an answer too", async () => {
  const { answer, moments, log } = await listenWith(() => NONE);
  assert.equal(answer, NONE);
  assert.equal(moments.length, MOMENTS.length);
  assert.deepEqual(log, ["stopped"]);
});

test("a short absence of the server is outlived", async () => {
  const { answer } = await listenWith((seconds) => {
    if (seconds < 8) {
      throw new ServiceAway("away");
    }
    return MATCH;
  });
  assert.equal(answer, MATCH);
});

test("a server that stays away ends the listening", async () => {
  const { answer, moments, log } = await listenWith(() => {
    throw new ServiceAway("away");
  });
  assert.ok(answer instanceof ServiceAway);
  assert.ok(moments.at(-1) >= 11, "enough was heard to ask about later");
  assert.deepEqual(log, ["stopped"]);
});

test("stopping gives the microphone back", async () => {
  const controller = new AbortController();
  const reason = new Error("enough");
  const { answer, log } = await listenWith(() => {
    controller.abort(reason);
    return NONE;
  }, controller.signal);
  assert.equal(answer, reason);
  assert.deepEqual(log, ["stopped"]);
});

test("a device that gives nothing is an error", async () => {
  const sound = new HeardSound(RATE);
  const { signal } = new AbortController();
  await assert.rejects(sound.until(5, signal, 20), SilentDevice);
});

test("samples come out as they went in", () => {
  const sound = new HeardSound(2);
  sound.add(Float32Array.of(1, 2));
  sound.add(Float32Array.of(3));
  assert.deepEqual([...sound.last(30)], [1, 2, 3]);
  assert.equal(sound.seconds, 1.5);
  assert.deepEqual([...sound.last(1)], [2, 3]);
  assert.deepEqual([...sound.last(0.5)], [3]);
});

test("of what is heard meanwhile the end is asked about", async () => {
  const lengths = [];
  const { answer } = await listenWith(async (seconds) => {
    lengths.push(seconds);
    await new Promise((resolve) => setTimeout(resolve, 100));
    return lengths.length < 3 ? NONE : MATCH;
  });
  assert.equal(answer, MATCH);
  assert.equal(Math.max(...lengths), 30);
});

test("only of long files all passages are asked for", () => {
  assert.equal(asksPassages("evening.mp3", 61), true);
  assert.equal(asksPassages("evening.mp3", 60), false);
  assert.equal(asksPassages(null, 300), false);
});

/** A recogniser over trails that are numbered as they are made. */
function numbered(answerTo) {
  const made = [];
  const freed = [];
  const makers = {
    trailBuilder: async (rate) => {
      const trail = [0, rate];
      made.push(trail);
      const number = made.length;
      return {
        feed: async (samples) => (trail[0] += samples.length),
        finish: async () => Uint8Array.of(number),
        free: async () => freed.push(number),
      };
    },
  };
  const service = { match: async ([number], options) => answerTo(number, options) };
  return { made, freed, recogniser: new Recogniser(makers, service) };
}

const CLIP = { samples: new Float32Array(1000).fill(0.1), rate: 100 };
const OPTIONS = { signal: new AbortController().signal };
const scored = (score, more = {}) => ({
  verdict: "match",
  matches: [{ track: 1, offset: 2, score, threshold: 7, ...more }],
});

test("of a round the highest score is taken", async () => {
  const { made, recogniser } = numbered((number) => [NONE, scored(8), scored(9)][number - 1]);
  const round = [0, 1, 2].map((skipped) => ({ speed: 1, skipped }));
  const { matches } = await recogniser.ask(CLIP, [round, round], OPTIONS);
  assert.deepEqual(made, [[1000, 100], [900, 100], [800, 100]], "the second round is not needed");
  assert.equal(matches[0].score, 9);
  assert.equal(matches[0].offset, 0, "of the clip's beginning, two seconds before the reading's");
});

test("of a round that failed nothing goes on", async () => {
  const ended = [];
  const { recogniser } = numbered((number, { signal }) => {
    if (number === 2) {
      throw new ServiceAway("away");
    }
    return new Promise((resolve, reject) => {
      const end = () => ended.push(number) && reject(signal.reason);
      signal.addEventListener("abort", end, { once: true });
    });
  });
  const round = [0, 1, 2].map((skipped) => ({ speed: 1, skipped }));
  await assert.rejects(recogniser.ask(CLIP, [round], OPTIONS), ServiceAway);
  assert.ok(ended.includes(1), "what was asked already is given up");
  assert.ok(!OPTIONS.signal.aborted);
});

test("another speed has to score more", async () => {
  const rounds = [[{ speed: 1, skipped: 0 }], [{ speed: 1.25, skipped: 0 }]];
  const answerWith = (score) => numbered((number) => (number === 2 ? scored(score) : NONE));
  const weak = await answerWith(7.9).recogniser.ask(CLIP, rounds, OPTIONS);
  assert.equal(weak.verdict, "not sure");
  const { made, recogniser } = answerWith(8);
  const answer = await recogniser.ask(CLIP, rounds, OPTIONS);
  assert.deepEqual(made, [[1000, 100], [1000, 80]]);
  assert.equal(answer.matches[0].tempo, 1.25);
  assert.equal(answer.matches[0].threshold, 8);
});

test("long sound goes piece by piece, all of it", async () => {
  const { made, freed, recogniser } = numbered(() => NONE);
  const long = { samples: new Float32Array(2 ** 20 + 500).fill(0.1), rate: 100 };
  await recogniser.ask(long, [[{ speed: 1, skipped: 1 }]], OPTIONS);
  assert.deepEqual(made, [[2 ** 20 + 400, 100]]);
  assert.deepEqual(freed, [1], "the worker's memory is given back");
});

test("long recordings are asked about in stretches", async () => {
  assert.deepEqual(stretchesOf(100, 540), [{ begin: 0, end: 100 }]);
  assert.deepEqual(stretchesOf(540, 540), [{ begin: 0, end: 540 }]);
  assert.deepEqual(stretchesOf(1100, 540), [
    { begin: 0, end: 540 },
    { begin: 520, end: 1060 },
    { begin: 1040, end: 1100 },
  ]);
  const at = (offset, clip_begin, clip_end) => scored(9, { offset, clip_begin, clip_end });
  const { made, recogniser } = numbered((number) =>
    // Of every reading: a track from 30 s on, in two stretches, and then nothing.
    [at(0, 30, 60), at(40, 0, 20), NONE][(number - 1) % 3],
  );
  recogniser.longestClip = 60;
  const long = { samples: new Float32Array(14000).fill(0.1), rate: 100 };
  const answer = await recogniser.askPassages(long, OPTIONS);
  assert.deepEqual(made.slice(0, 3).map(([count]) => count), [6000, 6000, 6000]);
  assert.equal(made.length, 12, "three stretches, four readings of each");
  const rounded = ({ clip_begin, clip_end }) => [clip_begin, clip_end].map(Math.round);
  assert.deepEqual(answer.matches.map(rounded), [[30, 60]]);
  assert.deepEqual(answer.gaps.map(rounded), [[0, 30], [60, 140]]);
});

test("about silence nobody is asked", async () => {
  const { made, recogniser } = numbered(() => scored(9));
  const silence = { samples: new Float32Array(1000).fill(0.0009), rate: 100 };
  const round = [{ speed: 1, skipped: 0 }];
  assert.equal((await recogniser.ask(silence, [round], OPTIONS)).verdict, "too quiet");
  assert.equal((await recogniser.askPassages(silence, OPTIONS)).verdict, "too quiet");
  assert.equal(made.length, 0);
  silence.samples.fill(0.01, 400, 500);
  assert.equal((await recogniser.ask(silence, [round], OPTIONS)).verdict, "match");
});

test("the meter is empty in silence, full when loud", () => {
  assert.equal(levelOf(new Float32Array(10)), 0);
  assert.equal(levelOf(new Float32Array(10).fill(1)), 1);
  assert.ok(Math.abs(levelOf(new Float32Array(10).fill(10 ** (-30 / 20))) - 0.5) < 1e-6);
});

test("the meter rises at once and falls slowly", () => {
  const level = new Level();
  assert.equal(level.after(new Float32Array(10).fill(1), 0.1), 1);
  assert.equal(level.after(new Float32Array(10), 0.25), 0.75);
});

test("channels are averaged", () => {
  assert.deepEqual([...mixed([Float32Array.of(1, 0), Float32Array.of(0, 0.5)])], [0.5, 0.25]);
});

test("trail files are known by their first bytes", () => {
  const trail = new Uint8Array(64 + 8 * 10);
  trail.set([0x89, 0x4b, 0x5a, 0x54, 0x0d, 0x0a, 0x1a, 0x0a]);
  assert.ok(isTrail(trail));
  assert.ok(!isTrail(Uint8Array.of(0x52, 0x49)));
  assert.ok(Math.abs(secondsOfTrail(trail) - 1.858) < 1e-3);
  assert.equal(secondsOfTrail(trail.subarray(0, 9)), 0);
});
