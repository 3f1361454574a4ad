// From samples to an answer: the trail is made on this device by the worker, the service is asked,
// and what it says is told in the clip's own seconds.

import { atOwnSpeed, fromTheStart } from "./answers.js";
import { gridStart, lay } from "./codes.js";
import { CODE_SECONDS } from "./schedule.js";

/** No more than this much of a clip is drawn, in seconds. */
const LONGEST_DRAWN = 30;

/**
 * @typedef {object} Clip
 * @property {Float32Array} samples  mono
 * @property {number} rate
 */

export class Recogniser {
  #makers;
  #service;

  /**
   * @param {{trail: Function, readTrail: Function}} makers  Make and read trails; promises.
   * @param {import("./service.js").Service} service
   */
  constructor(makers, service) {
    this.#makers = makers;
    this.#service = service;
  }

  /**
   * Asks about a clip by each reading in turn until one is recognised.
   *
   * @param {Clip} clip
   * @param {import("./schedule.js").Reading[]} readings  At least one.
   * @param {{signal: AbortSignal, onBusy?: Function}} options
   * @returns {Promise<object>} the answer that has matches; else that of the first reading
   */
  async ask(clip, readings, options) {
    let first;
    for (const reading of readings) {
      const answer = await this.#read(clip, reading, options);
      if (answer.verdict === "match" && answer.matches.length > 0) {
        return answer;
      }
      first ??= answer;
      if (answer.verdict === "too quiet") {
        break;
      }
    }
    return first;
  }

  /** Asks for all that a long recording holds. */
  async askPassages(clip, { signal, onBusy }) {
    const trail = await this.#makers.trail(clip.samples, clip.rate);
    signal.throwIfAborted();
    return this.#service.match(trail, { passages: true, signal, onBusy });
  }

  async #read(clip, { speed, skipped }, { signal, onBusy }) {
    // Sound that is said to have a lower rate is slower by as much.
    const samples = clip.samples.subarray(Math.round(skipped * clip.rate));
    const trail = await this.#makers.trail(samples, Math.round(clip.rate / speed));
    signal.throwIfAborted();
    const answer = await this.#service.match(trail, { signal, onBusy });
    return fromTheStart(atOwnSpeed(answer, speed), skipped);
  }

  /**
   * The codes of a clip beside those of the track it was found in. The clip is read from where a
   * code of the track begins, with its change of pitch undone, so that the bits show what the two
   * have in common and not how the grids lie.
   *
   * @param {Clip} clip
   * @param {object} match
   * @param {AbortSignal} signal
   * @returns {Promise<import("./codes.js").Laid>}
   */
  async layTrails(clip, match, signal) {
    const pitch = match.pitch ?? 1;
    const tempo = match.tempo ?? 1;
    const begin = gridStart(match, match.clip_begin ?? 0);
    const end = Math.min(match.clip_end ?? Infinity, begin + LONGEST_DRAWN) + 2 * CODE_SECONDS;
    const samples = clip.samples.subarray(
      Math.round(begin * clip.rate),
      Math.round(end * clip.rate),
    );
    const [own, track] = await Promise.all([
      this.#makers.trail(samples, Math.round(clip.rate / pitch)),
      this.#service.trail(match.track, signal),
    ]);
    const [ownCodes, trackCodes] = await Promise.all(
      [own, track].map(async (bytes) => (await this.#makers.readTrail(bytes)).codes),
    );
    const from = match.offset + begin * tempo;
    // A code of the clip stands for this many of the track where its tempo differs from its pitch.
    return lay(ownCodes, trackCodes, from, tempo / pitch);
  }
}
