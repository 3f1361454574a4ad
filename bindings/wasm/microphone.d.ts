/**
 * A microphone as a row of blocks of samples, in browsers, in pages that were loaded by https or
 * from the same machine.
 *
 *     import { openMicrophone } from "kzsdk/microphone";
 *     const microphone = await openMicrophone({ onSamples: (samples) => builder.feed(samples) });
 *     const builder = kz.trailBuilder(microphone.rate);
 *     ...
 *     await microphone.stop();
 *
 * The browser is asked for sound as it is: without echo cancellation, noise suppression and gain
 * control, which are made for speech. Call it in answer to a click or a key, or the browser may let
 * nothing sound.
 */

import { KzError } from "./index.js";

export { KzError };

export interface MicrophoneOptions {
  /**
   * Called with one channel of samples, full scale at 1, about twelve times a second. Never before
   * openMicrophone() has given the microphone.
   */
  onSamples: (samples: Float32Array) => void;
  /** Called when the microphone was disconnected; it is stopped then. */
  onEnded?: (error: KzError) => void;
  /** Of navigator.mediaDevices.enumerateDevices(); the browser's choice without it. */
  deviceId?: string;
  /** Where worklet.js lies; at first beside this file. */
  workletUrl?: string | URL;
}

export interface Microphone {
  /** Of the samples, hertz: mostly 44100 or 48000. */
  readonly rate: number;
  /** Of the last block: the root of its mean square, 0 to 1. */
  readonly level: number;
  /** What the system calls it. */
  readonly label: string;
  /** Hands over what is left, and lets the microphone go. May be repeated. */
  stop(): Promise<void>;
}

/**
 * Opens a microphone. Throws a KzError of `refused`, `no-microphone`, `busy`, `unsupported`, `load`
 * (of the worklet), `invalid-argument` or `failed`.
 */
export function openMicrophone(options: MicrophoneOptions): Promise<Microphone>;
