// Fingerprints and trails from samples, in browsers, workers and Node. index.d.ts describes all of
// it.

import { FingerprintStream, fingerprintOf } from "./fingerprint.js";
import { Memory } from "./memory.js";
import { instantiate } from "./module.js";
import { TrailBuilder, alignTrails, readTrail, trailOf } from "./trail.js";

export { KzError } from "./error.js";

/** Stands for the bit errors of a code that is silence or lies on nothing. */
export const NOT_COMPARED = 255;

/** Loads the module, once for each call. */
export async function load({ module } = {}) {
  const memory = new Memory(await instantiate(module));
  return Object.freeze({
    version: memory.text(memory.functions.version()),
    fingerprint: (samples, rate, options) => fingerprintOf(memory, samples, rate, options),
    fingerprintStream: (rate, options) => new FingerprintStream(memory, rate, options),
    trail: (samples, rate, options) => trailOf(memory, samples, rate, options),
    trailBuilder: (rate, options) => new TrailBuilder(memory, rate, options),
    readTrail: (bytes) => readTrail(memory, bytes),
    align: (first, second) => alignTrails(memory, first, second),
  });
}
