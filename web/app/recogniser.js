// From samples to an answer: the trail is made on this device by the worker, the service is asked,
// and what it says is told in the clip's own seconds.

import { atOwnSpeed, bestOf, fromTheStart, isMatch, withMargin } from "./answers.js";
import { gridStart, lay } from "./codes.js";
import { isQuiet } from "./level.js";
import { CODE_SECONDS, OWN_SPEED } from "./schedule.js";
import { anyOf } from "./service.js";
import { merged } from "./set_list.js";

/** Samples that go to the worker at once. */
const PIECE = 1 << 20;

/** The longest stretch that is asked about at once, in seconds, unless the service takes less. */
const LONGEST_ASKED = 540;

/** So much of a stretch is in the next one too: what is cut there is whole in one of the two. */
const OVERLAP = 20;

/** A trail does not say how loud the sound was, so the service cannot. */
const TOO_QUIET = { verdict: "too quiet", matches: [] };

/** No more than this much of a clip is drawn, in seconds. */
const LONGEST_DRAWN = 30;

/**
 * @typedef {object} Clip
 * @property {Float32Array} samples  mono
 * @property {number} rate
 */

/**
 * The stretches that a long recording is asked about in, each overlapping the next.
 *
 * @param {number} seconds  of the recording
 * @param {number} longest  of a stretch
 * @returns {{begin: number, end: number}[]}
 */
export function stretchesOf(seconds, longest) {
  const stretches = [];
  let begin = 0;
  do {
    stretches.push({ begin, end: Math.min(begin + longest, seconds) });
    begin += longest - OVERLAP;
  } while (begin + OVERLAP < seconds);
  return stretches;
}

export class Recogniser {
  #makers;
  #service;
  #longest = LONGEST_ASKED;

  /**
   * @param {{trailBuilder: Function, readTrail: Function}} makers  Make and read trails; promises.
   * @param {import("./service.js").Service} service
   */
  constructor(makers, service) {
    this.#makers = makers;
    this.#service = service;
  }

  /** @param {number} seconds  of the longest clip that the service takes */
  set longestClip(seconds) {
    this.#longest = Math.max(2 * OVERLAP, Math.min(LONGEST_ASKED, seconds));
  }

  /**
   * Asks about a clip, round after round, until it is recognised.
   *
   * @param {Clip} clip
   * @param {import("./schedule.js").Reading[][]} rounds  At least one.
   * @param {{signal: AbortSignal, onBusy?: Function}} options
   * @returns {Promise<object>} the best answer of the last round that was needed
   */
  async ask(clip, rounds, options) {
    if (isQuiet(clip.samples, clip.rate)) {
      return TOO_QUIET;
    }
    let best;
    for (const readings of rounds) {
      const answers = await this.#readAll(clip, readings, options);
      best = bestOf(best ? [best, ...answers] : answers);
      if (isMatch(best)) {
        break;
      }
    }
    return best;
  }

  /**
   * Asks for all that a long recording holds.
   *
   * @param {Clip} clip
   * @param {{signal: AbortSignal, onBusy?: Function}} options
   * @returns {Promise<object>} with `matches` in the recording's order, and `gaps`
   */
  async askPassages(clip, options) {
    if (isQuiet(clip.samples, clip.rate)) {
      return TOO_QUIET;
    }
    const answers = [];
    for (const reading of OWN_SPEED) {
      answers.push(await this.#readLong(clip, reading, { ...options, passages: true }));
    }
    return merged(answers, clip.samples.length / clip.rate);
  }

  /** Stretch by stretch: what one asking costs the service has a limit. */
  async #readLong(clip, reading, options) {
    const answers = [];
    for (const { begin, end } of stretchesOf(clip.samples.length / clip.rate, this.#longest)) {
      const [first, last] = [begin, end].map((seconds) => Math.round(seconds * clip.rate));
      const stretch = { samples: clip.samples.subarray(first, last), rate: clip.rate };
      answers.push(fromTheStart(await this.#read(stretch, reading, options), first / clip.rate));
    }
    return { ...bestOf(answers), matches: answers.filter(isMatch).flatMap((one) => one.matches) };
  }

  /** When one asking of a round fails, nobody waits for the others: they end with it. */
  async #readAll(clip, readings, options) {
    const round = new AbortController();
    const ending = { ...options, signal: anyOf(options.signal, round.signal) };
    try {
      return await Promise.all(readings.map((reading) => this.#read(clip, reading, ending)));
    } catch (error) {
      round.abort(error);
      throw error;
    }
  }

  async #read(clip, { speed, skipped }, options) {
    // Sound that is said to have a lower rate is slower by as much.
    const samples = clip.samples.subarray(Math.round(skipped * clip.rate));
    const trail = await this.#trail(samples, Math.round(clip.rate / speed), options.signal);
    const answer = await this.#service.match(trail, options);
    return fromTheStart(atOwnSpeed(withMargin(answer, speed), speed), skipped);
  }

  /** Made piece by piece: hours of sound are not copied at once, and a stop is soon noticed. */
  async #trail(samples, rate, signal) {
    const builder = await this.#makers.trailBuilder(rate);
    try {
      for (let at = 0; at < samples.length; at += PIECE) {
        signal.throwIfAborted();
        await builder.feed(samples.slice(at, at + PIECE), { transfer: true });
      }
      return await builder.finish();
    } finally {
      // What ended badly has ended all the same.
      builder.free().catch(() => {});
    }
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
      this.#trail(samples, Math.round(clip.rate / pitch), signal),
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
