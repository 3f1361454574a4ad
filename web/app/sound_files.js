// Sound files that were chosen or dropped: decoded by the browser, mixed to one channel.

import { UnreadableFile } from "./problems.js";
import { CODE_SECONDS } from "./schedule.js";

/**
 * Hertz that files are decoded to. Trails describe sound at 11025 Hz and are computed from that
 * anyway; at this rate two hours of stereo take 635 MB while they are decoded.
 */
const RATE = 11025;

/** For browsers that decode at no lower rate than sound is played at. */
const USUAL_RATE = 44100;

/** The largest file, in bytes: beyond it browsers end the page for want of memory. */
const LARGEST = 1 << 30;

/** Bytes before the codes of a trail file, and those that it begins with. */
const TRAIL_HEADER = 64;
const TRAIL_MAGIC = [0x89, 0x4b, 0x5a, 0x54, 0x0d, 0x0a, 0x1a, 0x0a];

/**
 * Whether bytes are a trail file, which is asked about as it is.
 *
 * @param {Uint8Array} bytes
 */
export function isTrail(bytes) {
  return TRAIL_MAGIC.every((byte, i) => bytes[i] === byte);
}

/**
 * How much sound a trail file describes; whether it is a sound one is for the service to say.
 *
 * @param {Uint8Array} bytes
 * @returns {number} seconds; 0 for a file that is cut short
 */
export function secondsOfTrail(bytes) {
  return (Math.max(0, bytes.length - TRAIL_HEADER) / 8) * CODE_SECONDS;
}

/**
 * The bytes of a file.
 *
 * @param {File} file
 * @returns {Promise<ArrayBuffer>}
 * @throws {UnreadableFile} that says what cures it
 */
export async function bytesOf(file) {
  if (file.size === 0) {
    throw new UnreadableFile(`“${file.name}” is empty. Choose a file that has sound in it.`);
  }
  if (file.size > LARGEST) {
    throw new UnreadableFile(
      `“${file.name}” is larger than 1 GB, more than a browser can decode at once. ` +
        "Cut it, or save it as MP3, Ogg or FLAC.",
    );
  }
  try {
    return await file.arrayBuffer();
  } catch (cause) {
    throw new UnreadableFile(
      `“${file.name}” cannot be opened: it may be a folder, or have been moved. Choose it again.`,
      { cause },
    );
  }
}

/**
 * The sound of a file.
 *
 * @param {ArrayBuffer} bytes  Not usable afterwards.
 * @param {string} name        For the error's sentence.
 * @returns {Promise<import("./recogniser.js").Clip>}
 * @throws {UnreadableFile}
 */
export async function decode(bytes, name) {
  const context = decoder();
  let sound;
  try {
    sound = await context.decodeAudioData(bytes);
  } catch (cause) {
    throw new UnreadableFile(
      `“${name}” is not a sound file that this browser can decode. ` +
        "WAV, FLAC, MP3, Ogg and M4A work in most browsers.",
      { cause },
    );
  }
  const channels = Array.from({ length: sound.numberOfChannels }, (_, i) =>
    sound.getChannelData(i),
  );
  return { samples: mixed(channels), rate: sound.sampleRate };
}

function decoder() {
  try {
    return new OfflineAudioContext(1, 1, RATE);
  } catch {
    return new OfflineAudioContext(1, 1, USUAL_RATE);
  }
}

/**
 * The average of channels.
 *
 * @param {Float32Array[]} channels  Of one length; at least one.
 * @returns {Float32Array} the channel itself when it is the only one
 */
export function mixed(channels) {
  if (channels.length === 1) {
    return channels[0];
  }
  const mix = new Float32Array(channels[0].length);
  for (const channel of channels) {
    for (let i = 0; i < mix.length; ++i) {
      mix[i] += channel[i] / channels.length;
    }
  }
  return mix;
}
