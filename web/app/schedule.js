// When a listening page asks, and how it reads what it has heard.

/** Seconds of sound after which the service is asked; after the last the page gives up. */
export const MOMENTS = [5, 8, 11, 15, 20, 25, 30];

/** Of what the microphone has heard, no more than the last so many seconds are asked about: while
 *  a slow answer is awaited, much more may be heard. */
export const LONGEST_HEARD = MOMENTS.at(-1);

/** From this many seconds on a recording may hold several tracks. */
const LONG = 60;

/**
 * Whether all passages are asked for; of the microphone it is one track.
 *
 * @param {string|null} name  of the file; null for the microphone
 * @param {number} seconds    that it lasts
 */
export function asksPassages(name, seconds) {
  return name !== null && seconds > LONG;
}

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

/** The same reading from so many places of a code on, evenly apart. */
function phases(speed, count) {
  return Array.from({ length: count }, (_, i) => ({ speed, skipped: (i * CODE_SECONDS) / count }));
}

/**
 * The readings of a clip at its own speed. A trail has codes at fixed distances from its beginning,
 * and those of a track lie somewhere between them: the nearer, the more bits agree. In music that
 * repeats itself another place of the same track may otherwise lie nearer than the right one.
 */
export const OWN_SPEED = phases(1, 4);

const OTHER_SPEEDS = [...phases(1.04, 2), ...phases(0.96, 2)];

/**
 * The rounds of readings to try until one is recognised; of a round all are asked about.
 *
 * @param {number} seconds  of sound that were heard
 * @returns {Reading[][]}
 */
export function roundsAt(seconds) {
  return seconds >= SPEEDS_FROM ? [OWN_SPEED, OTHER_SPEEDS] : [OWN_SPEED];
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
