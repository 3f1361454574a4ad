/**
 * The library in a worker: a page goes on drawing while sound is worked on. The calls are those of
 * "kzsdk", and each gives a promise.
 *
 *     import { createClient } from "kzsdk/client";
 *     const kz = await createClient();
 *     const trail = await kz.trail(samples, 44100, { channels: 2 });
 *     kz.close();
 *
 * Calls are answered in the order in which they were made. Samples are copied to the worker, unless
 * `transfer` hands their memory over: the array that was passed is empty then.
 */

import type {
  Alignment,
  Fingerprint,
  FingerprintOptions,
  StreamState,
  Trail,
  TrailOptions,
} from "./index.js";

export { KzError } from "./error.js";

export interface TransferOption {
  /** Whether the samples' memory goes to the worker instead of a copy; false at first. */
  transfer?: boolean;
}

/** As FingerprintStream of "kzsdk". */
export interface RemoteStream {
  feed(samples: Float32Array, options?: TransferOption): Promise<boolean>;
  finish(): Promise<boolean>;
  state(): Promise<StreamState>;
  result(): Promise<Fingerprint>;
  free(): Promise<void>;
}

/** As TrailBuilder of "kzsdk". */
export interface RemoteBuilder {
  feed(samples: Float32Array, options?: TransferOption): Promise<void>;
  trail(): Promise<Uint8Array>;
  finish(): Promise<Uint8Array>;
  free(): Promise<void>;
}

export interface Client {
  /** Of the C library. */
  readonly version: string;
  fingerprint(
    samples: Float32Array,
    rate: number,
    options?: FingerprintOptions & TransferOption,
  ): Promise<Fingerprint>;
  trail(
    samples: Float32Array,
    rate: number,
    options?: TrailOptions & TransferOption,
  ): Promise<Uint8Array>;
  readTrail(bytes: Uint8Array): Promise<Trail>;
  align(first: Uint8Array, second: Uint8Array): Promise<Alignment>;
  fingerprintStream(rate: number, options?: FingerprintOptions): Promise<RemoteStream>;
  trailBuilder(rate: number, options?: TrailOptions): Promise<RemoteBuilder>;
  /** Ends the worker; calls that are not answered yet fail with `closed`. */
  close(): void;
}

export interface ClientOptions {
  /** Where worker.js lies; at first beside this file. */
  workerUrl?: string | URL;
  /** Where kzsdk.wasm lies, from the page; at first beside worker.js. */
  moduleUrl?: string | URL;
}

/** Starts a worker and loads the module there; throws a KzError of `load` when that fails. */
export function createClient(options?: ClientOptions): Promise<Client>;
