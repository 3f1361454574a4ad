// What passes between JavaScript and the module's memory.

import { KzError } from "./error.js";

// Samples go in by blocks: the module's memory does not grow with the sound.
const BLOCK_SAMPLES = 65536;

// Of catalogue/kzcat.h.
const CATALOGUE_CODES = {
  1: "memory",
  2: "invalid-argument",
  5: "other-profile",
  11: "not-readable",
  12: "format",
  13: "order",
};

// Of kzsdk/abs/status.h: the number of the family of streams, and those of its statuses that have
// sentences of their own here, since the library's name what C programs can do.
const STREAMS = 9;
const RATE = 0x12;
const CHANNELS = 0x13;
const SENTENCES = {
  [RATE]:
    "the fixed-point algorithm does not take this rate: resample the sound to 44100 or 48000 Hz, " +
    'or take the algorithm "float"',
  [CHANNELS]: "the number of channels must be 1 to 65535: pass that of the sound",
};
const LIBRARY_CODES = { 1: "memory", 4: "invalid-argument" };
const STREAM_CODES = {
  0x10: "format",
  0x11: "format",
  [RATE]: "format",
  [CHANNELS]: "format",
  0x14: "order",
  0x15: "memory",
};

/** Word and, where it is not the library's, sentence for a status. Those of libkzsdk have the
 *  highest bit, then the number of a family, then their own. */
function explain(status) {
  if (status >>> 31 === 0) return { code: CATALOGUE_CODES[status] ?? "failed" };
  const number = status & 0xffff;
  const ofStreams = ((status >>> 16) & 0xff) === STREAMS;
  const code = (ofStreams && STREAM_CODES[number]) || LIBRARY_CODES[number] || "failed";
  return { code, sentence: ofStreams ? SENTENCES[number] : undefined };
}

/** The module's functions with the views into its memory, which moves when it grows. */
export class Memory {
  constructor(exports) {
    this.functions = exports;
    this.block = 0;
  }

  bytes(address, count) {
    return new Uint8Array(this.functions.memory.buffer, address, count);
  }

  text(address) {
    const all = new Uint8Array(this.functions.memory.buffer);
    return new TextDecoder().decode(all.subarray(address, all.indexOf(0, address)));
  }

  /** The first of the numbers that the last call left. */
  numbers(count) {
    const buffer = this.functions.memory.buffer;
    return Array.from(new Float64Array(buffer, this.functions.numbers(), count));
  }

  /** The error of the call that failed last. */
  failure() {
    const status = this.functions.status() >>> 0;
    const { code, sentence } = explain(status);
    const message = sentence ?? this.text(this.functions.status_text());
    return new KzError(code, message, { status });
  }

  /** Returns what a call returned, or throws its failure. */
  require(value) {
    if (!value) throw this.failure();
    return value;
  }

  allocate(count) {
    const address = this.functions.allocate(count);
    if (!address) {
      throw new KzError("memory", `there is no memory for ${count} bytes more; free some`);
    }
    return address;
  }

  /** Calls `use` with the address of room for so many bytes, which is gone afterwards. */
  withRoom(count, use) {
    const address = this.allocate(Math.max(count, 1));
    try {
      return use(address);
    } finally {
      this.functions.release(address);
    }
  }

  withBytes(bytes, use) {
    return this.withRoom(bytes.length, (address) => {
      this.bytes(address, bytes.length).set(bytes);
      return use(address, bytes.length);
    });
  }

  /** Hands the samples over in blocks, until `take(address, count)` returns false. */
  feed(samples, take) {
    this.block ||= this.allocate(BLOCK_SAMPLES * 4);
    for (let begin = 0; begin < samples.length; begin += BLOCK_SAMPLES) {
      const part = samples.subarray(begin, begin + BLOCK_SAMPLES);
      new Float32Array(this.functions.memory.buffer, this.block, part.length).set(part);
      if (take(this.block, part.length) === false) return;
    }
  }
}
