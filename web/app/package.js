// The kzsdk package that lies beside the page, loaded when it is first needed: the worker that
// makes trails, and the microphone.

import { NoMicrophoneHere, PageBroken } from "./problems.js";

const FOLDER = new URL("../kzsdk/", import.meta.url);

let client = null;

/**
 * What makes and reads trails, in a worker.
 *
 * @returns {Promise<{trailBuilder: Function, readTrail: Function}>}
 * @throws {PageBroken}
 */
export function trailMakers() {
  client ??= startClient().catch((cause) => {
    client = null; // the next attempt may have the network back
    throw new PageBroken("The part that reads sound could not be started.", { cause });
  });
  return client;
}

async function startClient() {
  const { createClient } = await import(new URL("client.js", FOLDER).href);
  return createClient();
}

/**
 * Opens the microphone; the browser asks the person first.
 *
 * @param {{onSamples: (samples: Float32Array) => void}} settings
 * @returns {Promise<{rate: number, stop: () => void}>}
 */
export async function openMicrophone({ onSamples }) {
  if (!navigator.mediaDevices?.getUserMedia) {
    throw new NoMicrophoneHere(window.isSecureContext);
  }
  let library;
  try {
    library = await import(new URL("microphone.js", FOLDER).href);
  } catch (cause) {
    throw new PageBroken("The part that opens the microphone could not be loaded.", { cause });
  }
  return library.openMicrophone({ onSamples });
}
