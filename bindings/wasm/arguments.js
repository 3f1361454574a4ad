// What callers pass, checked before it reaches the module: a wrong type would become a wrong number
// there.

import { KzError } from "./error.js";

export function checkSamples(samples) {
  if (!(samples instanceof Float32Array)) {
    throw new KzError(
      "invalid-argument",
      "the samples are no Float32Array: pass one, with full scale at 1 and channels interleaved",
    );
  }
  return samples;
}

/** Sound that is passed at once ends with a frame; of a stream the rest may still come. */
export function checkFrames(samples, channels) {
  if (samples.length % channels !== 0) {
    throw new KzError(
      "invalid-argument",
      `${samples.length} samples are no whole number of frames of ${channels} channels: pass the ` +
        "number of channels that the sound has, and all samples of its last frame",
    );
  }
}

/** A whole number that the module takes; it says itself which of these it can use. */
export function checkWhole(name, value) {
  if (!Number.isInteger(value) || value < 0 || value > 0xffffffff) {
    throw new KzError("invalid-argument", `the ${name} is ${value}: pass a whole number above 0`);
  }
  return value;
}

export function checkBytes(bytes) {
  if (!(bytes instanceof Uint8Array)) {
    throw new KzError(
      "invalid-argument",
      "the trail is no Uint8Array: pass the bytes of a .kzt file",
    );
  }
  return bytes;
}
