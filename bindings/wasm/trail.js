// Trails: what is kept of sound of any length, 43 bytes for a second of it.

import { checkBytes, checkFrames, checkSamples, checkWhole } from "./arguments.js";
import { KzError } from "./error.js";

/** Calls `use` with a trail's address and frees the trail. */
function withTrail(memory, address, use) {
  const trail = memory.require(address);
  try {
    return use(trail);
  } finally {
    memory.functions.trail_free(trail);
  }
}

function bytesOf(memory, trail) {
  const { functions } = memory;
  const size = memory.require(functions.trail_write(trail, 0, 0));
  return memory.withRoom(size, (address) => {
    memory.require(functions.trail_write(trail, address, size));
    return memory.bytes(address, size).slice();
  });
}

const HIGHEST_RATE = 4000000;

/** The rate at which sound that runs `speed` times too fast is read at its own speed. */
function rateAt(rate, speed) {
  if (!(typeof speed === "number" && speed >= 0.25 && speed <= 4)) {
    throw new KzError("invalid-argument", `the speed is ${speed}: pass a number of 0.25 to 4`);
  }
  const read = Math.round(checkWhole("rate", rate) / speed);
  if (read < 1 || read > HIGHEST_RATE) {
    throw new KzError(
      "format",
      `sound of ${rate} Hz at the speed ${speed} would be read at ${read} Hz: pass a rate of 1 ` +
        `to ${HIGHEST_RATE} Hz that stays in this range when it is divided by the speed`,
    );
  }
  return read;
}

/** Sound that arrives bit by bit, and its trail at any time. */
export class TrailBuilder {
  #memory;
  #builder;

  constructor(memory, rate, { channels = 1, speed = 1 } = {}) {
    this.#memory = memory;
    this.#builder = memory.require(
      memory.functions.builder_create(
        rateAt(rate, speed),
        checkWhole("number of channels", channels),
      ),
    );
  }

  feed(samples) {
    const builder = this.#open();
    this.#memory.feed(checkSamples(samples), (address, count) => {
      this.#memory.require(this.#memory.functions.builder_feed(builder, address, count));
    });
  }

  trail() {
    const trail = this.#memory.functions.builder_trail(this.#open());
    return withTrail(this.#memory, trail, (address) => bytesOf(this.#memory, address));
  }

  finish() {
    const trail = this.#memory.functions.builder_finish(this.#open());
    return withTrail(this.#memory, trail, (address) => bytesOf(this.#memory, address));
  }

  free() {
    if (this.#builder) this.#memory.functions.builder_free(this.#builder);
    this.#builder = 0;
  }

  #open() {
    if (!this.#builder) throw new KzError("order", "the builder was freed: create another one");
    return this.#builder;
  }
}

/** The trail of all samples. */
export function trailOf(memory, samples, rate, options) {
  checkSamples(samples);
  const builder = new TrailBuilder(memory, rate, options);
  try {
    checkFrames(samples, options?.channels ?? 1);
    builder.feed(samples);
    return builder.finish();
  } finally {
    builder.free();
  }
}

/** Calls `use` with the address of the trail that the bytes describe. */
function withReadTrail(memory, bytes, use) {
  const trail = memory.withBytes(checkBytes(bytes), memory.functions.trail_read);
  return withTrail(memory, trail, use);
}

function factsOf(memory, trail) {
  memory.require(memory.functions.trail_facts(trail));
  const [samples, codes, rate, profile] = memory.numbers(4);
  return { samples, codes, rate, profile };
}

/** What the bytes of a .kzt file say. */
export function readTrail(memory, bytes) {
  return withReadTrail(memory, bytes, (trail) => {
    const { samples, codes: count, rate, profile } = factsOf(memory, trail);
    return memory.withRoom(count * 8, (address) => {
      memory.require(memory.functions.trail_codes(trail, address, count));
      const codes = new BigUint64Array(memory.functions.memory.buffer, address, count).slice();
      return { seconds: samples / rate, samples, rate, profile, codes };
    });
  });
}

function alignmentOf(memory, first, second) {
  memory.require(memory.functions.trail_align(first, second));
  const [found, lag, offset, begin, end, compared, agreeing, errorRate, agreeingRate] =
    memory.numbers(9);
  return found === 0
    ? { found: false }
    : { found: true, lag, offset, begin, end, compared, agreeing, errorRate, agreeingRate };
}

function bitErrorsOf(memory, first, second) {
  const count = factsOf(memory, second).codes;
  return memory.withRoom(count, (address) => {
    memory.require(memory.functions.trail_bit_errors(first, second, address, count));
    return memory.bytes(address, count).slice();
  });
}

/** Lays the second trail over the first one. */
export function alignTrails(memory, firstBytes, secondBytes) {
  checkBytes(secondBytes);
  return withReadTrail(memory, firstBytes, (first) =>
    withReadTrail(memory, secondBytes, (second) => ({
      ...alignmentOf(memory, first, second),
      bitErrors: bitErrorsOf(memory, first, second),
    })),
  );
}
