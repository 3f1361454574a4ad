// The calls of index.js in Node: sound cut anywhere, trails so far, alignments, and refusals.

import assert from "node:assert/strict";
import { readFileSync } from "node:fs";
import { join } from "node:path";
import { test } from "node:test";
import { pathToFileURL } from "node:url";

import { melody, noise, toFloats } from "./sounds.mjs";
import { importOf, packageFolder } from "./support.mjs";

const { KzError, NOT_COMPARED, load } = await importOf("index.js");
const kz = await load();
const RATE = 22050;
const music = toFloats(melody(RATE, 2, 20));
const stereo = { channels: 2 };

/** Cuts samples into parts of lengths that have nothing to do with frames. */
function* parts(samples) {
  for (let begin = 0, size = 1; begin < samples.length; begin += size, size = (size * 3) % 10007) {
    yield samples.subarray(begin, begin + size);
  }
}

function codeOf(work) {
  try {
    work();
  } catch (error) {
    assert.ok(error instanceof KzError, `${error}`);
    assert.ok(error.message.length > 15, error.message);
    return error.code;
  }
  return "none";
}

test("streams give the same however sound is cut", () => {
  const stream = kz.fingerprintStream(RATE, stereo);
  let complete = false;
  for (const part of parts(music)) complete = stream.feed(part);
  assert.equal(complete, true);
  assert.deepEqual(stream.result(), kz.fingerprint(music, RATE, stereo));
  stream.free();
});

test("streams report how far they are", () => {
  const stream = kz.fingerprintStream(RATE, stereo);
  assert.equal(stream.state().phase, "nothing-fed");
  assert.equal(stream.feed(music.subarray(0, RATE * 2 * 7)), false);
  const state = stream.state();
  assert.equal(state.phase, "too-short");
  assert.equal(state.complete, false);
  assert.equal(state.frames, RATE * 7);
  assert.ok(state.percent > 20 && state.percent < 80, `${state.percent}`);
  assert.ok(state.missingSeconds > 6 && state.missingSeconds < 8, `${state.missingSeconds}`);
  assert.equal(codeOf(() => stream.result()), "too-short");
  assert.equal(stream.feed(music.subarray(RATE * 2 * 7)), true);
  assert.equal(stream.state().missingSeconds, 0);
  stream.free();
});

test("a fingerprint has its values and times", () => {
  const { values, document, startSeconds, seconds } = kz.fingerprint(music, RATE, stereo);
  assert.ok(values instanceof Int16Array);
  assert.equal(values.length, 30);
  assert.ok(document.startsWith("<") && document.trimEnd().endsWith(">"), document);
  assert.equal(startSeconds, 0);
  assert.ok(Math.abs(seconds - 14.21) < 0.01, `${seconds}`);
});

test("leading silence is skipped", () => {
  const late = new Float32Array(RATE * 4 + RATE * 20);
  late.set(toFloats(melody(RATE, 1, 20)), RATE * 4);
  assert.ok(kz.fingerprint(late, RATE).startSeconds > 3.5);
});

test("sound that does not suffice is named", () => {
  assert.equal(codeOf(() => kz.fingerprint(new Float32Array(0), RATE)), "nothing-fed");
  assert.equal(codeOf(() => kz.fingerprint(music.subarray(0, 2000), RATE)), "too-short");
  assert.equal(codeOf(() => kz.fingerprint(new Float32Array(RATE * 20), RATE)), "silent");
});

test("trails are the same however sound is cut", () => {
  const builder = kz.trailBuilder(RATE, stereo);
  for (const part of parts(music)) builder.feed(part);
  assert.deepEqual(builder.finish(), kz.trail(music, RATE, stereo));
  builder.free();
});

test("a trail so far is the beginning of the whole", () => {
  const whole = kz.readTrail(kz.trail(music, RATE, stereo)).codes;
  const builder = kz.trailBuilder(RATE, stereo);
  assert.equal(kz.readTrail(builder.trail()).codes.length, 0);
  for (let begin = 0; begin < music.length; begin += RATE * 2) {
    builder.feed(music.subarray(begin, begin + RATE * 2));
    const { codes, seconds } = kz.readTrail(builder.trail());
    assert.deepEqual(codes, whole.subarray(0, codes.length));
    assert.ok(Math.abs(seconds - (begin / RATE / 2 + 1)) < 0.6, `${seconds}`);
  }
  assert.deepEqual(kz.readTrail(builder.finish()).codes, whole);
  builder.free();
});

test("a trail says how long its sound is", () => {
  const { seconds, rate, samples, codes } = kz.readTrail(kz.trail(music, RATE, stereo));
  assert.ok(Math.abs(seconds - 20) < 0.002, `${seconds}`);
  assert.equal(rate, 11025);
  assert.equal(codes.length, Math.floor((samples - 4096) / 2048) + 1);
});

test("sound that runs too fast can be read slower", () => {
  const sound = toFloats(melody(RATE, 1, 20));
  const slower = kz.trail(sound, RATE, { speed: 1.05 });
  assert.deepEqual(slower, kz.trail(sound, Math.round(RATE / 1.05)));
  assert.ok(Math.abs(kz.readTrail(slower).seconds - 21) < 0.01);
});

test("a part of a trail lies where it was cut", () => {
  const part = music.subarray(RATE * 2 * 5, RATE * 2 * 15);
  const found = kz.align(kz.trail(music, RATE, stereo), kz.trail(part, RATE, stereo));
  assert.equal(found.found, true);
  assert.ok(Math.abs(found.offset - 5) < 0.2, `${found.offset}`);
  assert.ok(found.errorRate < 0.3, `${found.errorRate}`);
  assert.equal(found.bitErrors.length, 52);
  assert.ok(found.bitErrors.every((errors) => errors <= 64));
});

test("trails of other sound agree nowhere", () => {
  const other = kz.trail(toFloats(noise(RATE * 15, 1, 5)), RATE);
  const found = kz.align(kz.trail(music, RATE, stereo), other);
  assert.equal(found.found, false);
  assert.equal(found.offset, undefined);
  assert.ok(found.bitErrors.every((errors) => errors === NOT_COMPARED));
});

test("an equal trail has no errors", () => {
  const trail = kz.trail(music, RATE, stereo);
  const { errorRate, offset, bitErrors } = kz.align(trail, trail);
  assert.deepEqual([errorRate, Math.max(...bitErrors)], [0, 0]);
  assert.ok(Math.abs(offset) < 0.001, `${offset}`);
});

test("rates and channels that cannot be are refused", () => {
  assert.equal(codeOf(() => kz.fingerprint(music, 44056)), "format");
  assert.equal(codeOf(() => kz.fingerprint(music, RATE, { channels: 0 })), "format");
  assert.equal(codeOf(() => kz.fingerprintStream(RATE, { channels: 65536 })), "format");
  assert.equal(codeOf(() => kz.trail(music, 0)), "format");
  assert.equal(codeOf(() => kz.trail(music, 4000001)), "format");
  assert.equal(codeOf(() => kz.trailBuilder(RATE, { channels: 65536 })), "format");
});

test("a rate that the speed makes too high is refused", () => {
  const wrapping = Math.ceil((2 ** 32 + RATE) / 4);
  assert.equal(codeOf(() => kz.trail(music, wrapping, { speed: 0.25 })), "format");
  assert.equal(codeOf(() => kz.trailBuilder(4000000, { speed: 0.9 })), "format");
  assert.equal(codeOf(() => kz.trailBuilder(1, { speed: 4 })), "format");
  assert.equal(codeOf(() => kz.trailBuilder(4000000, { speed: 1.1 }).free()), "none");
});

test("sound that ends within a frame is refused", () => {
  const odd = music.subarray(0, 1001);
  assert.equal(codeOf(() => kz.trail(odd, RATE, stereo)), "invalid-argument");
  assert.equal(codeOf(() => kz.fingerprint(odd, RATE, stereo)), "invalid-argument");
  assert.equal(codeOf(() => kz.trail(odd, RATE)), "none");
});

test("a builder takes the rest of a frame later", () => {
  const builder = kz.trailBuilder(RATE, stereo);
  builder.feed(music.subarray(0, 1001));
  builder.feed(music.subarray(1001));
  assert.deepEqual(builder.finish(), kz.trail(music, RATE, stereo));
  builder.free();
});

test("arguments of other types are refused", () => {
  const refused = [
    () => kz.fingerprint([0, 1], RATE),
    () => kz.fingerprint(new Float64Array(9), RATE),
    () => kz.fingerprint(music, RATE, { algorithm: "best" }),
    () => kz.fingerprint(music, 22050.5),
    () => kz.fingerprint(music, "22050"),
    () => kz.fingerprint(music, -1),
    () => kz.fingerprint(music, NaN),
    () => kz.trail(music, 2 ** 32 + RATE),
    () => kz.trail(music, RATE, { channels: 1.5 }),
    () => kz.trail(music, RATE, { speed: 0 }),
    () => kz.trail(music, RATE, { speed: "1" }),
    () => kz.trail(null, RATE),
    () => kz.readTrail("trail"),
    () => kz.align(new ArrayBuffer(8), kz.trail(music, RATE)),
  ];
  for (const work of refused) assert.equal(codeOf(work), "invalid-argument", `${work}`);
});

test("bytes that are no trail are refused", () => {
  const whole = kz.trail(music, RATE, stereo);
  assert.equal(codeOf(() => kz.readTrail(new Uint8Array(0))), "not-readable");
  assert.equal(codeOf(() => kz.readTrail(whole.subarray(0, 100))), "not-readable");
  for (let at = 0; at < whole.length; at += 41) {
    const damaged = whole.slice();
    damaged[at] ^= 4;
    const code = codeOf(() => kz.readTrail(damaged));
    assert.ok(["not-readable", "other-profile"].includes(code), `byte ${at}: ${code}`);
  }
  assert.equal(kz.readTrail(whole).codes.length > 0, true);
});

test("what was finished or freed refuses sound", () => {
  const builder = kz.trailBuilder(RATE);
  builder.finish();
  assert.equal(codeOf(() => builder.feed(music)), "order");
  assert.equal(codeOf(() => builder.trail()), "order");
  assert.equal(codeOf(() => builder.finish()), "order");
  builder.free();
  builder.free();
  assert.equal(codeOf(() => builder.feed(music)), "order");
  const stream = kz.fingerprintStream(RATE);
  stream.feed(music.subarray(0, 1000));
  assert.equal(stream.finish(), false);
  assert.equal(codeOf(() => stream.feed(music)), "order");
  stream.free();
  assert.equal(codeOf(() => stream.state()), "order");
});

test("samples that are no numbers become silence", () => {
  const wild = Float32Array.of(NaN, Infinity, -Infinity, 1e30, -1e30, 1e-45);
  const sound = Float32Array.from({ length: RATE * 20 }, (_, i) => wild[i % wild.length]);
  assert.equal(kz.fingerprint(sound, RATE).values.length, 30);
  assert.ok(kz.readTrail(kz.trail(sound, RATE)).codes.length > 0);
});

test("memory does not grow with what was freed", async () => {
  const { Memory } = await importOf("memory.js");
  const { instantiate } = await importOf("module.js");
  const { trailOf } = await importOf("trail.js");
  const { fingerprintOf } = await importOf("fingerprint.js");
  const memory = new Memory(await instantiate());
  const once = () => {
    trailOf(memory, music, RATE, stereo);
    fingerprintOf(memory, music, RATE, stereo);
    assert.equal(codeOf(() => fingerprintOf(memory, new Float32Array(9), RATE)), "silent");
    for (let i = 0; i < 4; i += 1) memory.withRoom(1e6, () => {});
    return memory.functions.memory.buffer.byteLength;
  };
  const first = once();
  let last = first;
  for (let i = 0; i < 40; i += 1) last = once();
  assert.equal(last, first);
});

test("libraries loaded apart are independent", async () => {
  const other = await load();
  const stream = kz.fingerprintStream(RATE, stereo);
  assert.deepEqual(other.fingerprint(music, RATE, stereo), kz.fingerprint(music, RATE, stereo));
  assert.equal(stream.state().phase, "nothing-fed");
  stream.free();
});

test("the module may be given in any form", async () => {
  const file = join(packageFolder, "kzsdk.wasm");
  const bytes = readFileSync(file);
  const compiled = await WebAssembly.compile(bytes);
  const address = pathToFileURL(file);
  const forms = [bytes, Uint8Array.from(bytes).buffer, compiled, address, address.href];
  for (const module of forms) {
    assert.equal((await load({ module })).version, kz.version);
  }
});

test("what is no module is refused", async () => {
  for (const module of [new Uint8Array(8), "file:///nowhere.wasm", "http://127.0.0.1:1/x.wasm"]) {
    await assert.rejects(load({ module }), { name: "KzError", code: "load" });
  }
});
