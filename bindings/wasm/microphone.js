// A microphone as a row of blocks of samples. microphone.d.ts describes it.

import { KzError } from "./error.js";

export { KzError };

const REFUSALS = {
  NotAllowedError: ["refused", "the microphone was refused: allow it for this page, and try again"],
  SecurityError: ["refused", "this page may not use microphones: its server has to permit it"],
  NotFoundError: ["no-microphone", "there is no microphone: connect one, and try again"],
  OverconstrainedError: ["no-microphone", "the chosen microphone is not there: choose another one"],
  NotReadableError: ["busy", "the microphone gives no sound: end other programs that use it"],
  AbortError: ["busy", "the microphone gives no sound: disconnect it, connect it and try again"],
};

// When the audio thread does not answer, nothing more is to be had from it.
const LAST_BLOCK_MS = 1000;

function refusalOf(error) {
  const [code, message] = REFUSALS[error.name] ?? ["failed", error.message];
  return new KzError(code, message, { cause: error });
}

function checkSupport() {
  if (!globalThis.isSecureContext || !navigator.mediaDevices?.getUserMedia) {
    throw new KzError(
      "unsupported",
      "this page cannot use microphones: open it by https, in a browser that has them",
    );
  }
  if (typeof AudioWorkletNode === "undefined") {
    throw new KzError("unsupported", "this browser has no audio worklets: update it");
  }
}

/** Music as it is: what makes speech clearer would change it. */
async function openStream(deviceId) {
  const audio = { echoCancellation: false, noiseSuppression: false, autoGainControl: false };
  if (deviceId) audio.deviceId = { exact: deviceId };
  try {
    return await navigator.mediaDevices.getUserMedia({ audio });
  } catch (error) {
    throw refusalOf(error);
  }
}

/** At the microphone's own rate where it is known: not every browser converts rates here. */
function contextFor(track) {
  const { sampleRate } = track.getSettings();
  try {
    return new AudioContext(sampleRate ? { sampleRate } : {});
  } catch {
    return new AudioContext();
  }
}

async function loadWorklet(context, url) {
  try {
    await context.audioWorklet.addModule(url);
  } catch (error) {
    throw new KzError("load", `${url} could not be loaded as an audio worklet (${error.message})`);
  }
}

/** A microphone that gives samples; openMicrophone() makes it. */
class Microphone {
  #stream;
  #context;
  #node;
  #stopped;
  #level = 0;

  constructor(stream) {
    this.#stream = stream;
  }

  get rate() {
    return this.#context.sampleRate;
  }

  get level() {
    return this.#level;
  }

  get label() {
    return this.#stream.getAudioTracks()[0].label;
  }

  async start({ onSamples, onEnded, workletUrl }) {
    this.#context = contextFor(this.#stream.getAudioTracks()[0]);
    await loadWorklet(this.#context, workletUrl ?? new URL("./worklet.js", import.meta.url));
    // Made long after the user's click it may be waiting; nobody is to wait for it here.
    this.#context.resume().catch(() => {});
    this.#node = new AudioWorkletNode(this.#context, "kzsdk-capture");
    this.#node.port.onmessage = ({ data }) => {
      if (!data.samples) return;
      this.#level = data.level;
      onSamples(data.samples);
    };
    this.#stream.getAudioTracks()[0].addEventListener("ended", async () => {
      if (this.#stopped) return;
      await this.stop();
      onEnded?.(new KzError("no-microphone", "the microphone has gone: connect it, and try again"));
    });
    this.#context.createMediaStreamSource(this.#stream).connect(this.#node);
    // It gives silence; but what leads nowhere may not be run at all.
    this.#node.connect(this.#context.destination);
  }

  stop() {
    this.#stopped ??= this.#end();
    return this.#stopped;
  }

  async #end() {
    if (this.#node && this.#context.state === "running") await this.#lastBlock();
    this.#level = 0;
    this.#stream.getTracks().forEach((track) => track.stop());
    await this.#context?.close();
  }

  #lastBlock() {
    const { port } = this.#node;
    return new Promise((resolve) => {
      const timer = setTimeout(resolve, LAST_BLOCK_MS);
      port.addEventListener("message", ({ data }) => {
        if (!data.last) return;
        clearTimeout(timer);
        resolve();
      });
      port.postMessage("stop");
    });
  }
}

/** Opens a microphone and hands its samples to `onSamples` until it is stopped. */
export async function openMicrophone({ onSamples, onEnded, deviceId, workletUrl } = {}) {
  if (typeof onSamples !== "function") {
    throw new KzError("invalid-argument", "onSamples is no function: pass one for the samples");
  }
  checkSupport();
  const stream = await openStream(deviceId);
  const microphone = new Microphone(stream);
  try {
    await microphone.start({ onSamples, onEnded, workletUrl });
  } catch (error) {
    await microphone.stop();
    throw error instanceof KzError ? error : refusalOf(error);
  }
  return microphone;
}
