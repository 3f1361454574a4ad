// The calls of client.js through a worker of Node.

import assert from "node:assert/strict";
import { after, test } from "node:test";

import { melody, toFloats } from "./sounds.mjs";
import { importOf } from "./support.mjs";

const { load } = await importOf("index.js");
const { KzError, createClient } = await importOf("client.js");
const kz = await load();
const client = await createClient();
after(() => client.close());

const RATE = 16000;
const music = toFloats(melody(RATE, 1, 16));

test("a worker gives what the library gives", async () => {
  assert.equal(client.version, kz.version);
  const trail = kz.trail(music, RATE);
  assert.deepEqual(await client.trail(music, RATE), trail);
  const part = music.subarray(1000, 50000);
  assert.deepEqual(await client.trail(part, RATE), kz.trail(part, RATE));
  assert.deepEqual(await client.fingerprint(music, RATE), kz.fingerprint(music, RATE));
  assert.deepEqual(await client.readTrail(trail), kz.readTrail(trail));
  assert.deepEqual(await client.align(trail, trail), kz.align(trail, trail));
});

test("a worker's streams and builders go on", async () => {
  const stream = await client.fingerprintStream(RATE, { algorithm: "float" });
  const builder = await client.trailBuilder(RATE, { speed: 1.02 });
  for (let begin = 0; begin < music.length; begin += 5000) {
    const part = music.slice(begin, begin + 5000);
    await Promise.all([stream.feed(part), builder.feed(part)]);
  }
  assert.equal((await stream.state()).complete, true);
  assert.equal(await stream.finish(), true);
  const fingerprint = kz.fingerprint(music, RATE, { algorithm: "float" });
  assert.deepEqual(await stream.result(), fingerprint);
  const whole = kz.trail(music, RATE, { speed: 1.02 });
  const soFar = kz.readTrail(await builder.trail()).codes;
  assert.deepEqual(soFar, kz.readTrail(whole).codes.subarray(0, soFar.length));
  assert.deepEqual(await builder.finish(), whole);
  await Promise.all([stream.free(), builder.free()]);
});

test("calls are answered in their order", async () => {
  const builder = await client.trailBuilder(RATE);
  const answers = [];
  await Promise.all([
    builder.feed(music).then(() => answers.push("feed")),
    builder.trail().then(() => answers.push("trail")),
    builder.free().then(() => answers.push("free")),
  ]);
  assert.deepEqual(answers, ["feed", "trail", "free"]);
});

test("a worker's errors are the library's", async () => {
  await assert.rejects(client.trail(music, 0), { name: "KzError", code: "format" });
  await assert.rejects(client.fingerprint(music.slice(0, 2000), RATE), (error) => {
    assert.ok(error instanceof KzError);
    assert.equal(error.code, "too-short");
    assert.ok(error.state.missingSeconds > 13);
    return true;
  });
  await assert.rejects(client.trail(() => 1, RATE), { code: "invalid-argument" });
  const builder = await client.trailBuilder(RATE);
  await builder.free();
  await assert.rejects(builder.trail(), { code: "order" });
  await builder.free();
});

test("samples are handed over only if wanted", async () => {
  const kept = music.slice();
  await client.trail(kept, RATE);
  assert.equal(kept.length, music.length);
  await client.trail(kept, RATE, { transfer: true });
  assert.equal(kept.length, 0);
});

test("an array that was handed over is empty", async () => {
  const gone = music.slice();
  await client.trail(gone, RATE, { transfer: true });
  const empty = kz.trail(new Float32Array(0), RATE);
  assert.deepEqual(await client.trail(gone, RATE, { transfer: true }), empty);
  assert.deepEqual(await client.trail(gone, RATE), empty);
  const bytes = new Uint8Array(8);
  structuredClone(bytes, { transfer: [bytes.buffer] });
  await assert.rejects(client.readTrail(bytes), { code: "not-readable" });
});

test("a closed client refuses calls", async () => {
  const other = await createClient();
  const waiting = other.trail(music, RATE);
  other.close();
  await assert.rejects(waiting, { code: "closed" });
  await assert.rejects(other.trail(music, RATE), { code: "closed" });
});

test("an answer that comes after close() is dropped", async () => {
  const other = await createClient();
  const waiting = other.readTrail(kz.trail(music, RATE));
  // The worker answers while this thread is held, so that the answer waits here to be taken.
  Atomics.wait(new Int32Array(new SharedArrayBuffer(4)), 0, 0, 1000);
  other.close();
  await assert.rejects(waiting, { code: "closed" });
  await new Promise((resolve) => setTimeout(resolve, 100));
});

test("a worker that cannot start says so", async () => {
  const nowhere = new URL("file:///nowhere.js");
  await assert.rejects(createClient({ workerUrl: nowhere }), { code: "load" });
  await assert.rejects(createClient({ moduleUrl: "file:///nowhere.wasm" }), { code: "load" });
});
