// Fingerprints: 30 values of 14.2 seconds of sound, and the document that carries them.

import { checkFrames, checkSamples, checkWhole } from "./arguments.js";
import { KzError } from "./error.js";

const ALGORITHMS = { fixed: 1, float: 2 };
const PHASES = ["complete", "nothing-fed", "silent", "too-short", "failed"];
const VALUES = 30;

function algorithmOf(name) {
  const number = ALGORITHMS[name];
  if (number === undefined) {
    throw new KzError(
      "invalid-argument",
      `there is no algorithm "${name}": pass "fixed" or "float"`,
    );
  }
  return number;
}

/** A sentence about sound that does not suffice. */
function shortage(state) {
  const missing = state.missingSeconds.toFixed(1);
  switch (state.phase) {
    case "silent":
      return "the sound is silence: check where it comes from";
    case "nothing-fed":
      return `there is no sound: give ${missing} s of it`;
    default:
      return `the sound is too short: ${missing} s more are needed`;
  }
}

/** Sound that arrives bit by bit, until its fingerprint is complete. */
export class FingerprintStream {
  #memory;
  #stream;

  constructor(memory, rate, { algorithm = "fixed", channels = 1 } = {}) {
    this.#memory = memory;
    this.#stream = memory.require(
      memory.functions.stream_create(
        algorithmOf(algorithm),
        checkWhole("rate", rate),
        checkWhole("number of channels", channels),
      ),
    );
  }

  feed(samples) {
    const stream = this.#open();
    let complete = 0;
    this.#memory.feed(checkSamples(samples), (address, count) => {
      complete = this.#memory.functions.stream_feed(stream, address, count);
      return complete === 0;
    });
    if (complete < 0) throw this.#memory.failure();
    return complete === 1 || this.state().complete;
  }

  finish() {
    const complete = this.#memory.functions.stream_finish(this.#open());
    if (complete < 0) throw this.#memory.failure();
    return complete === 1;
  }

  state() {
    this.#memory.require(this.#memory.functions.stream_state(this.#open()));
    const [frames, silence, sound, phase, percent, missing] = this.#memory.numbers(6);
    return {
      phase: PHASES[phase],
      complete: phase === 0,
      frames,
      percent,
      silenceSeconds: silence / 1000,
      soundSeconds: sound / 1000,
      missingSeconds: missing / 1000,
    };
  }

  result() {
    const state = this.state();
    if (!state.complete) throw new KzError(state.phase, shortage(state), { state });
    const [start, duration] = this.#memory.numbers(8).slice(6);
    return {
      values: this.#values(),
      document: this.#document(),
      startSeconds: start / 1000,
      seconds: duration / 1000,
    };
  }

  free() {
    if (this.#stream) this.#memory.functions.stream_free(this.#stream);
    this.#stream = 0;
  }

  #open() {
    if (!this.#stream) throw new KzError("order", "the stream was freed: create another one");
    return this.#stream;
  }

  #values() {
    const { functions } = this.#memory;
    return this.#memory.withRoom(VALUES * 2, (address) => {
      const count = this.#memory.require(functions.stream_values(this.#stream, address, VALUES));
      return new Int16Array(functions.memory.buffer, address, count).slice();
    });
  }

  #document() {
    const { functions } = this.#memory;
    return this.#memory.text(this.#memory.require(functions.stream_document(this.#stream)));
  }
}

/** The fingerprint of the beginning of the samples. */
export function fingerprintOf(memory, samples, rate, options) {
  checkSamples(samples);
  const stream = new FingerprintStream(memory, rate, options);
  try {
    checkFrames(samples, options?.channels ?? 1);
    if (!stream.feed(samples)) stream.finish();
    return stream.result();
  } finally {
    stream.free();
  }
}
