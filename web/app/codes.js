// Trails as arrays of 64-bit codes: laying a clip's against a track's and counting the bits that
// differ.

import { CODE_SECONDS } from "./schedule.js";

const BITS = 64;

/**
 * A clip's codes beside the track's.
 *
 * @typedef {object} Laid
 * @property {BigUint64Array} clip   codes of the clip that lie within the track
 * @property {BigUint64Array} track  the track's at the same moments
 * @property {number} from           seconds of the track at which they begin
 * @property {number} different      bits that differ
 * @property {number} bits           bits compared: 64 for each code
 */

/**
 * How much of a clip's beginning to leave out so that its codes begin where codes of the track do.
 *
 * @param {{offset: number, tempo?: number}} match
 * @param {number} begin  seconds of the clip from which on it is drawn
 * @returns {number} seconds of the clip, from `begin` to less than a code more
 */
export function gridStart(match, begin) {
  const tempo = match.tempo ?? 1;
  const place = match.offset + begin * tempo;
  const next = Math.ceil(place / CODE_SECONDS - 1e-9) * CODE_SECONDS;
  return Math.max(begin, (next - match.offset) / tempo);
}

/**
 * Lays the codes of a clip at a place of a track.
 *
 * @param {BigUint64Array} clip   Its codes; the first begins at `begin`.
 * @param {BigUint64Array} track  All codes of the track.
 * @param {number} from           Seconds of the track at which the clip's first code lies.
 * @param {number} stretch        Seconds of the track for one of `clip`: 1 unless tempo and pitch
 *                                differ.
 * @returns {Laid}
 */
export function lay(clip, track, from, stretch = 1) {
  const first = from / CODE_SECONDS;
  const pairs = [];
  for (let i = 0; i < clip.length; ++i) {
    const at = Math.round(first + i * stretch);
    if (at >= 0 && at < track.length) {
      pairs.push([clip[i], track[at], at]);
    }
  }
  const laid = {
    clip: BigUint64Array.from(pairs, ([code]) => code),
    track: BigUint64Array.from(pairs, ([, code]) => code),
    from: pairs.length > 0 ? pairs[0][2] * CODE_SECONDS : from,
    bits: pairs.length * BITS,
  };
  return { ...laid, different: countDifferent(laid.clip, laid.track) };
}

/**
 * Bits in which two runs of codes of the same length differ.
 *
 * @param {BigUint64Array} one
 * @param {BigUint64Array} other
 * @returns {number}
 */
export function countDifferent(one, other) {
  const a = new Uint32Array(one.buffer, one.byteOffset, one.length * 2);
  const b = new Uint32Array(other.buffer, other.byteOffset, other.length * 2);
  let count = 0;
  for (let i = 0; i < a.length; ++i) {
    count += ones((a[i] ^ b[i]) >>> 0);
  }
  return count;
}

/** The bits of a 32-bit word that are 1, added up in ever wider fields. */
function ones(word) {
  const pairs = word - ((word >>> 1) & 0x55555555);
  const fours = (pairs & 0x33333333) + ((pairs >>> 2) & 0x33333333);
  return Math.imul((fours + (fours >>> 4)) & 0x0f0f0f0f, 0x01010101) >>> 24;
}

/**
 * Whether a bit of a code is 1.
 *
 * @param {BigUint64Array} codes
 * @param {number} index
 * @param {number} bit    0, the lowest band, to 63
 */
export function bitOf(codes, index, bit) {
  return ((codes[index] >> BigInt(bit)) & 1n) === 1n;
}
