// Sound that is made with whole numbers only, as tests/support/melody.cpp makes it, and digests as
// tests/support/digest.hpp takes them: with both, the golden files hold for this package too. Runs
// in Node and in browsers.

const MASK = (1n << 64n) - 1n;

/** A linear congruential generator with 64 bits of state. */
class Congruential {
  constructor(seed) {
    this.state = BigInt(seed);
  }

  next() {
    this.state = (this.state * 6364136223846793005n + 1442695040888963407n) & MASK;
    return Number(this.state >> 32n);
  }

  below(bound) {
    return Number((BigInt(this.next()) * BigInt(bound)) >> 32n);
  }
}

// An arch for each half of the turn, in Q15. All products stay below 2^53.
function archWave(phase) {
  const x = (phase >>> 16) - 32768;
  return Math.floor((x * (32768 - Math.abs(x))) / 8192);
}

function clipped(value) {
  return Math.min(Math.max(value, -32768), 32767);
}

const HERTZ = [55, 82, 110, 165, 220, 247, 330, 370, 440, 494, 659, 880, 1320];

/** Samples of 16 bits, interleaved; `gain` in 1/256. */
export function melody(rate, channels, seconds, gain = 256) {
  const voices = Array.from({ length: 3 }, () => ({ phase: 0, step: 0, level: 0 }));
  const random = new Congruential(7);
  const frames = Math.trunc(rate * seconds);
  const sound = new Int16Array(frames * channels);
  const fifth = Math.trunc(rate / 5);
  const fade = Math.trunc(rate / 4);
  for (let frame = 0; frame < frames; frame += 1) {
    if (frame % fifth === 0) {
      const voice = voices[Math.trunc(frame / fifth) % voices.length];
      voice.step = Number((BigInt(HERTZ[random.below(13)]) << 32n) / BigInt(rate)) >>> 0;
      voice.level = 2 ** 24;
    }
    let sum = 0;
    for (const voice of voices) {
      voice.phase = (voice.phase + voice.step) >>> 0;
      voice.level -= Math.trunc(voice.level / fade);
      sum += Math.floor((archWave(voice.phase) * voice.level) / 2 ** 26);
    }
    for (let channel = 0; channel < channels; channel += 1) {
      const side = channel === 0 ? 256 : 224;
      sound[frame * channels + channel] = clipped(Math.floor((sum * gain * side) / 65536));
    }
  }
  return sound;
}

export function noise(count, shift, seed) {
  const random = new Congruential(seed);
  return Int16Array.from({ length: count }, () => (random.next() | 0) >> (16 + shift));
}

/** Floats that become the same 16 bits again. */
export function toFloats(sound) {
  return Float32Array.from(sound, (sample) => sample / 32768);
}

/** FNV-1a with 64 bits, of bytes. */
export function digestOf(bytes) {
  let value = 0xcbf29ce484222325n;
  for (const byte of bytes) value = ((value ^ BigInt(byte)) * 0x100000001b3n) & MASK;
  return value.toString(16).padStart(16, "0");
}

const DOCUMENT_SECONDS = 15;

const PIECES = {
  music: (rate, channels) => melody(rate, channels, DOCUMENT_SECONDS),
  clipped: (rate, channels) => melody(rate, channels, DOCUMENT_SECONDS, 8192),
  quiet: (rate, channels) => melody(rate, channels, DOCUMENT_SECONDS, 8),
  noise: (rate, channels) => noise(rate * DOCUMENT_SECONDS * channels, 1, rate + channels),
  silence: (rate, channels) => new Int16Array(rate * DOCUMENT_SECONDS * channels),
  late: (rate, channels) => {
    const music = melody(rate, channels, DOCUMENT_SECONDS);
    const sound = new Int16Array(rate * channels * 4 + music.length);
    sound.set(music, rate * channels * 4);
    return sound;
  },
};

const FEATURE_SECONDS = 4;

const FEATURE_PIECES = {
  music: (rate, channels) => melody(rate, channels, FEATURE_SECONDS),
  quiet: (rate, channels) => melody(rate, channels, FEATURE_SECONDS, 4),
  noise: (rate) => noise(rate * FEATURE_SECONDS, 1, 1),
  silence: (rate) => new Int16Array(rate * FEATURE_SECONDS),
};

// Of the sound in these encodings a Float32Array can hold every sample.
const ENCODINGS = ["s16", "f32"];

/** The documents of a golden file that are of one algorithm, and of sound that floats can hold. */
export function goldenDocuments(text, algorithm = "fixed") {
  return text
    .split("\n")
    .map((line) => line.replace(/^stream /, "").split(" "))
    .filter(([kind, , , encoding]) => kind === algorithm && ENCODINGS.includes(encoding))
    .filter(([, , , , , digest]) => digest.length === 16) // others are refusals
    .map(([, rate, channels, encoding, piece, digest]) => ({
      name: `${rate} Hz, ${channels} channels, ${encoding}, ${piece}`,
      rate: Number(rate),
      channels: Number(channels),
      samples: () => samplesOf(encoding, PIECES[piece](Number(rate), Number(channels))),
      digest,
    }));
}

// Those of the golden file's streams have bits below the 16 that are kept.
function samplesOf(encoding, sound) {
  if (encoding === "s16") return toFloats(sound);
  return Float32Array.from(
    sound,
    (sample) => Math.fround(sample * 65536 + (sample & 0xff) * 251) / 2 ** 31,
  );
}

/** The trails of a golden file. */
export function goldenTrails(text) {
  return text
    .split("\n")
    .map((line) => line.split(" "))
    .filter(([kind, , , encoding]) => kind === "features" && ENCODINGS.includes(encoding))
    .map(([, rate, channels, encoding, piece, codes, digest]) => ({
      name: `${rate} Hz, ${channels} channels, ${encoding}, ${piece}`,
      rate: Number(rate),
      channels: Number(channels),
      samples: () => toFloats(FEATURE_PIECES[piece](Number(rate), Number(channels))),
      codes: Number(codes),
      digest,
    }));
}

/** A digest of what this package makes of a golden document. */
export function documentDigest(kz, { samples, rate, channels }, algorithm = "fixed") {
  const { document } = kz.fingerprint(samples(), rate, { algorithm, channels });
  return digestOf(new TextEncoder().encode(document));
}

/** What this package makes of a golden trail. */
export function trailDigest(kz, { samples, rate, channels }) {
  const { codes } = kz.readTrail(kz.trail(samples(), rate, { channels }));
  return `${codes.length} ${digestOf(new Uint8Array(codes.buffer))}`;
}
