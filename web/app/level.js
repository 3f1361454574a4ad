// How loud what is heard is: for the meter, and to know silence.

/** Decibels below full scale at which the meter is empty. */
const FLOOR = -60;

/**
 * The level of samples.
 *
 * @param {Float32Array} samples  At least one; full scale is 1.
 * @returns {number} from 0, at 60 dB below full scale, to 1
 */
export function levelOf(samples) {
  let sum = 0;
  for (const sample of samples) {
    sum += sample * sample;
  }
  const decibels = 10 * Math.log10(sum / samples.length);
  return Math.min(1, Math.max(0, 1 - decibels / FLOOR));
}

/**
 * Whether no second of a clip is as loud as 60 dB below full scale, which is silence to a
 * microphone.
 *
 * @param {Float32Array} samples
 * @param {number} rate
 */
export function isQuiet(samples, rate) {
  for (let at = 0; at < samples.length; at += rate) {
    if (levelOf(samples.subarray(at, at + rate)) > 0) {
      return false;
    }
  }
  return true;
}

/** Falls slowly, so that the eye can follow it; rises at once. */
export class Level {
  #value = 0;

  /**
   * @param {Float32Array} samples
   * @param {number} seconds  that they last
   * @returns {number} what to show, 0 to 1
   */
  after(samples, seconds) {
    if (samples.length > 0) {
      this.#value = Math.max(levelOf(samples), this.#value - seconds);
    }
    return this.#value;
  }
}
