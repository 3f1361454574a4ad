// What passes between JavaScript and the module's memory.

import { KzError } from "./error.js";

// Samples go in by blocks: the module's memory does not grow with the sound.
const BLOCK_SAMPLES = 65536;

const CATALOGUE_CODES = {
  1: "memory",
  2: "invalid-argument",
  5: "other-profile",
  11: "not-readable",
  12: "format",
  13: "order",
};

// In the place of the library's own sentences, which name what C programs can do.
const SENTENCES = {
  0x90090012:
    "the fixed-point algorithm does not take this rate: resample the sound to 44100 or 48000 Hz, " +
    'or take the algorithm "float"',
  0x90090013: "the number of channels must be 1 to 65535: pass that of the sound",
};

/** The word for a status: those of the library have its number above 0x90000000. */
function codeOf(status) {
  if (status < 0x90000000) return CATALOGUE_CODES[status] ?? "failed";
  const number = status & 0xffff;
  if (status >>> 16 === 0x9009 && number >= 0x10 && number <= 0x13) return "format";
  if (number === 0x0014) return "order";
  if (number === 0x0001 || number === 0x0015) return "memory";
  return number === 0x0004 ? "invalid-argument" : "failed";
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
    const message = SENTENCES[status] ?? this.text(this.functions.status_text());
    return new KzError(codeOf(status), message, { status });
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
