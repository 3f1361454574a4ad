// Listening from the microphone to the answer, without a browser.

import assert from "node:assert/strict";
import { test } from "node:test";

import { levelOf, Level } from "../../../../web/app/level.js";
import { listen } from "../../../../web/app/listening.js";
import { Recogniser } from "../../../../web/app/recogniser.js";
import { MOMENTS } from "../../../../web/app/schedule.js";
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
    return {
      rate: RATE,
      stop: () => {
        clearInterval(timer);
        log.push("stopped");
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
    onHeard: () => {},
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
  assert.deepEqual([...sound.samples()], [1, 2, 3]);
  assert.equal(sound.seconds, 1.5);
});

test("readings are tried until one is recognised", async () => {
  const rates = [];
  const makers = {
    trail: async (samples, rate) => {
      rates.push([samples.length, rate]);
      return Uint8Array.of(rates.length);
    },
  };
  const service = { match: async ([number]) => (number === 3 ? MATCH : NONE) };
  const readings = [
    { speed: 1, skipped: 0 },
    { speed: 1, skipped: 1 },
    { speed: 1.25, skipped: 0 },
    { speed: 2, skipped: 0 },
  ];
  const { signal } = new AbortController();
  const clip = { samples: new Float32Array(1000), rate: 100 };
  const answer = await new Recogniser(makers, service).ask(clip, readings, { signal });
  assert.deepEqual(rates, [[1000, 100], [900, 100], [1000, 80]]);
  assert.equal(answer.matches[0].tempo, 1.25);
});

test("a clip that is too quiet is asked about once", async () => {
  let count = 0;
  const makers = { trail: async () => Uint8Array.of(0) };
  const service = { match: async () => (++count, { verdict: "too quiet", matches: [] }) };
  const { signal } = new AbortController();
  const clip = { samples: new Float32Array(1000), rate: 100 };
  const readings = [{ speed: 1, skipped: 0 }, { speed: 1, skipped: 1 }];
  await new Recogniser(makers, service).ask(clip, readings, { signal });
  assert.equal(count, 1);
});

test("the meter is empty in silence, full at the top", () => {
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
