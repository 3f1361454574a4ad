// When a listening page asks, and how it reads what it has heard.

/** Seconds of sound after which the service is asked; after the last the page gives up. */
export const MOMENTS = [5, 8, 11, 15, 20, 25, 30];

/** From this many seconds on the sound is also read as if it were played too fast or too slowly. */
const SPEEDS_FROM = 11;

/** Codes begin every 2048 samples of 11025 Hz. */
export const CODE_SECONDS = 2048 / 11025;

/**
 * A way to read a clip.
 *
 * @typedef {object} Reading
 * @property {number} speed    how much faster than the track the clip is taken to be; 1 is not
 * @property {number} skipped  seconds left out at the clip's beginning
 */

/**
 * The readings to try, in this order, until one is recognised. A trail has codes at fixed distances
 * from its beginning, and those of a track lie somewhere between them; the second reading begins
 * half a code later, so that one of the two lies near.
 *
 * @param {number} seconds  of sound that were heard
 * @returns {Reading[]}
 */
export function readingsAt(seconds) {
  const readings = [
    { speed: 1, skipped: 0 },
    { speed: 1, skipped: CODE_SECONDS / 2 },
  ];
  if (seconds >= SPEEDS_FROM) {
    readings.push({ speed: 1.04, skipped: 0 }, { speed: 0.96, skipped: 0 });
  }
  return readings;
}

/**
 * The next moment to ask at.
 *
 * @param {number} seconds  of sound that were heard
 * @returns {number|undefined} seconds; undefined after the last
 */
export function nextMoment(seconds) {
  return MOMENTS.find((moment) => moment > seconds);
}
