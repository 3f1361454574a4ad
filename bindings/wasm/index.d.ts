/**
 * Fingerprints and trails from samples, in browsers, workers and Node.
 *
 *     import { load } from "kzsdk";
 *     const kz = await load();
 *     const { document } = kz.fingerprint(samples, 44100, { channels: 2 });
 *     const trail = kz.trail(samples, 44100, { channels: 2 });
 *
 * Samples are floats with full scale at 1; channels are interleaved. Results are the same to the
 * bit as those of the C libraries. Everything that fails throws a KzError.
 *
 * A call returns when its work is done: a minute of stereo sound takes some milliseconds as a
 * fingerprint and some more as a trail. For longer sound in a page, "kzsdk/client" does the same in
 * a worker.
 */

/**
 * What went wrong:
 * - `invalid-argument`: an argument of another type or range than this file states
 * - `format`: a rate or number of channels that cannot be used
 * - `nothing-fed`, `silent`, `too-short`: the sound does not suffice for a fingerprint; `state` of
 *   the error says what is missing
 * - `not-readable`: bytes that are no trail, or damaged ones
 * - `other-profile`: trails that another version made, which cannot be compared with these
 * - `order`: something was finished or freed before
 * - `memory`: there is none left
 * - `load`: the module could not be fetched or started
 * - `failed`: anything else
 *
 * Of "kzsdk/microphone" and "kzsdk/client" too:
 * - `no-microphone`, `refused`, `busy`, `unsupported`, `closed`
 */
export type KzErrorCode =
  | "invalid-argument"
  | "format"
  | "nothing-fed"
  | "silent"
  | "too-short"
  | "not-readable"
  | "other-profile"
  | "order"
  | "memory"
  | "load"
  | "failed"
  | "no-microphone"
  | "refused"
  | "busy"
  | "unsupported"
  | "closed";

/** What went wrong, in a sentence that says what cures it, and as a word. */
export class KzError extends Error {
  constructor(code: KzErrorCode, message: string, details?: object);
  readonly code: KzErrorCode;
  /** The number that the C library returned, where it was it that failed. */
  readonly status?: number;
  /** Of `nothing-fed`, `silent` and `too-short`. */
  readonly state?: StreamState;
}

export interface FingerprintOptions {
  /**
   * "fixed" (at first) takes 8000, 11025, 16000, 22050, 24000, 32000, 44100 and 48000 Hz, and two,
   * four, eight and sixteen times these; "float" takes every rate of 1 to 4000000 Hz. Their values
   * lie a little apart.
   */
  algorithm?: "fixed" | "float";
  /** 1 at first. */
  channels?: number;
}

export interface TrailOptions {
  /** 1 at first. */
  channels?: number;
  /**
   * How many times too fast the sound runs, 0.25 to 4, 1 at first: it is read as that much slower
   * and deeper, at the next whole rate, which has to be one of 1 to 4000000 Hz too.
   */
  speed?: number;
}

/** A fingerprint of 14.2 s of sound. */
export interface Fingerprint {
  /** 30 values. */
  values: Int16Array;
  /** The query document that carries them: XML. */
  document: string;
  /** Where in the sound it begins. */
  startSeconds: number;
  /** How much sound it stands for. */
  seconds: number;
}

/** How far a fingerprint is. */
export interface StreamState {
  phase: "complete" | "nothing-fed" | "silent" | "too-short" | "failed";
  complete: boolean;
  /** Samples of one channel that were taken. */
  frames: number;
  /** Of the fingerprint, 0 to 100. */
  percent: number;
  /** At the beginning, which was skipped. */
  silenceSeconds: number;
  soundSeconds: number;
  /** Still needed; 0 when it is complete. */
  missingSeconds: number;
}

/** Sound that arrives bit by bit, until its fingerprint is complete. */
export interface FingerprintStream {
  /**
   * Takes samples, cut anywhere: the result is the same to the bit.
   * @returns whether the fingerprint is complete; what is fed from then on is not taken
   */
  feed(samples: Float32Array): boolean;
  /**
   * Ends the sound, and returns whether the fingerprint is complete. May be repeated. A frame that
   * is not whole yet is left out.
   */
  finish(): boolean;
  state(): StreamState;
  /** Throws a KzError of `nothing-fed`, `silent` or `too-short` when it is not complete. */
  result(): Fingerprint;
  /** Gives its memory back, which JavaScript does not collect. May be repeated. */
  free(): void;
}

/** Sound that arrives bit by bit, and its trail at any time. */
export interface TrailBuilder {
  /** Takes samples, cut anywhere: the trail is the same to the bit. */
  feed(samples: Float32Array): void;
  /** The bytes of the trail so far, which is the beginning of the whole one; more may be fed. */
  trail(): Uint8Array;
  /**
   * Ends the sound and returns the bytes of the whole trail. A frame that is not whole yet is left
   * out.
   */
  finish(): Uint8Array;
  /** Gives its memory back, which JavaScript does not collect. May be repeated. */
  free(): void;
}

/** What the bytes of a trail say. */
export interface Trail {
  seconds: number;
  /** Of the sound, at `rate`. */
  samples: number;
  /** 11025. */
  rate: number;
  /** Names the features: only equal profiles can be compared. */
  profile: number;
  /** One of 64 bits for every 2048 samples; 0 is silence. */
  codes: BigUint64Array;
}

/** How a second trail lies to a first one; times in seconds. */
export interface Alignment {
  /** Whether they agree anywhere; without it only `bitErrors` is there. */
  found: boolean;
  /** Of the first trail, where the second one begins; negative when that is before it. */
  offset?: number;
  /** Code i of the second trail lies on code i + lag of the first. */
  lag?: number;
  /** Of the second trail, where the first stretch that agrees begins ... */
  begin?: number;
  /** ... and where the last one ends. */
  end?: number;
  /** That lies on each other, silence not counted. */
  compared?: number;
  /** Of that, in stretches that agree. */
  agreeing?: number;
  /** Share of the compared bits that differ: 0 for equal trails, about 0.5 by chance. */
  errorRate?: number;
  /** The same of the stretches that agree. */
  agreeingRate?: number;
  /** For each code of the second trail how many of its 64 bits differ, or NOT_COMPARED. */
  bitErrors: Uint8Array;
}

/** Stands for the bit errors of a code that is silence or lies on nothing. */
export const NOT_COMPARED: 255;

export interface Library {
  /** Of the C library. */
  readonly version: string;
  /** The fingerprint of the beginning of the samples, which are whole frames. */
  fingerprint(samples: Float32Array, rate: number, options?: FingerprintOptions): Fingerprint;
  fingerprintStream(rate: number, options?: FingerprintOptions): FingerprintStream;
  /**
   * The trail of all samples, which are whole frames, as the bytes of a .kzt file.
   * @param rate  hertz, a whole number of 1 to 4000000
   */
  trail(samples: Float32Array, rate: number, options?: TrailOptions): Uint8Array;
  trailBuilder(rate: number, options?: TrailOptions): TrailBuilder;
  /** Bytes of any content are safe to pass. */
  readTrail(bytes: Uint8Array): Trail;
  /** Lays the second trail over the first one. Both are bytes of .kzt files. */
  align(first: Uint8Array, second: Uint8Array): Alignment;
}

export interface LoadOptions {
  /** Where kzsdk.wasm lies, or what it is; at first the file beside this package's scripts. */
  module?: string | URL | BufferSource | WebAssembly.Module;
}

/** Loads the module, with a memory of its own for each call. */
export function load(options?: LoadOptions): Promise<Library>;
