// Makes what the tests of the page listen to, unless this script made it before: tracks, clips of
// them as a telephone gives them, a long recording of several tracks, and files without music.
//
//   node make_media.mjs MEDIA FOLDER     MEDIA/funnyboat.ogg is there already (make_clips.sh)

import { execFileSync } from "node:child_process";
import { createHash } from "node:crypto";
import { existsSync, mkdirSync, readFileSync, renameSync, rmSync, writeFileSync } from "node:fs";
import { join } from "node:path";

const RATE = 16000;

/** Whole numbers below a limit, the same ones for a seed. */
function random(seed) {
  let state = seed >>> 0;
  return (limit) => {
    state = (Math.imul(state, 1664525) + 1013904223) >>> 0;
    return Math.floor((state / 2 ** 32) * limit);
  };
}

/** Two voices of notes with harmonics that die away, as mono samples. */
function melody(seed, seconds) {
  const next = random(seed);
  const samples = new Float64Array(seconds * RATE);
  for (const [base, length] of [[220, 0.2], [110, 0.5]]) {
    // In no bar: what repeats itself would be found in several places.
    for (let at = 0; at < seconds; at += length * (1 + next(1000) / 400)) {
      addNote(samples, at, base * 2 ** (next(20) / 12), 0.5 + next(100) / 100);
    }
  }
  return samples;
}

function addNote(samples, at, pitch, seconds) {
  const begin = Math.floor(at * RATE);
  const end = Math.min(samples.length, begin + Math.floor(seconds * RATE));
  for (let i = begin; i < end; ++i) {
    const t = (i - begin) / RATE;
    for (let harmonic = 1; harmonic <= 6; ++harmonic) {
      const phase = 2 * Math.PI * pitch * harmonic * t;
      samples[i] += (0.12 / harmonic) * Math.exp((-3 * t * harmonic) / 2) * Math.sin(phase);
    }
  }
}

/** A WAV file of mono samples in 16 bits. */
function wav(samples) {
  const bytes = Buffer.alloc(44 + samples.length * 2);
  bytes.write("RIFF", 0);
  bytes.writeUInt32LE(bytes.length - 8, 4);
  bytes.write("WAVEfmt ", 8);
  bytes.writeUInt32LE(16, 16);
  [1, 1].forEach((number, i) => bytes.writeUInt16LE(number, 20 + 2 * i));
  bytes.writeUInt32LE(RATE, 24);
  bytes.writeUInt32LE(RATE * 2, 28);
  [2, 16].forEach((number, i) => bytes.writeUInt16LE(number, 32 + 2 * i));
  bytes.write("data", 36);
  bytes.writeUInt32LE(samples.length * 2, 40);
  samples.forEach((sample, i) => {
    const level = Math.max(-1, Math.min(1, sample));
    bytes.writeInt16LE(Math.round(level * 32767), 44 + 2 * i);
  });
  return bytes;
}

/** A title that would be a script if the page took it for anything but text. */
const TITLES = { 1: "First melody", 2: '<img src=x onerror="alert(1)">' };

function makeAll(media, folder) {
  const at = (name) => join(folder, name);
  const sox = (...args) => execFileSync("sox", ["-D", "-R", "-V1", ...args]);
  const tune = join(media, "funnyboat.ogg");
  for (const [seed, title] of Object.entries(TITLES)) {
    writeFileSync(at("melody.wav"), wav(melody(Number(seed), 70)));
    const tags = ["--comment", `TITLE=${title}`];
    sox(at("melody.wav"), ...tags, at(`melody-${seed}.flac`));
  }
  writeFileSync(at("unknown.wav"), wav(melody(77, 20)));
  writeFileSync(at("silence.wav"), wav(new Float64Array(12 * RATE)));
  writeFileSync(at("text.wav"), "This is no sound.\n".repeat(100));
  writeFileSync(at("empty.wav"), "");
  rmSync(at("melody.wav"));

  // What a telephone leaves, at a rate that browsers take for a microphone's. The clip begins
  // between two codes of the track.
  const telephone = ["-r", "8000", "-c", "1", "-e", "mu-law"];
  sox(tune, ...telephone, at("telephone.au"), "trim", "100.05", "33", "sinc", "300-3400");
  sox(at("telephone.au"), "-r", "48000", "-b", "16", "-e", "signed", at("telephone.wav"));
  sox(at("telephone.wav"), at("telephone-15s.wav"), "trim", "0", "15");
  sox(at("telephone-15s.wav"), "-b", "16", at("fast.wav"), "speed", "1.05");

  // A long recording: two tracks with noise between them, and a third at its end.
  const piece = (name, from, begin) => {
    sox(from, "-r", "44100", "-c", "2", "-b", "16", at(name), "trim", String(begin), "35");
    return at(name);
  };
  sox("-n", "-r", "44100", "-c", "2", "-b", "16", at("part-noise.wav"), "synth", "12",
      "pinknoise", "vol", "0.2");
  const parts = [
    piece("part-1.wav", tune, 20),
    at("part-noise.wav"),
    piece("part-2.wav", at("melody-1.flac"), 10),
    piece("part-3.wav", at("melody-2.flac"), 5),
  ];
  sox(...parts, "-C", "128", at("evening.mp3"));
  parts.forEach((part) => rmSync(part));
}

const [media, folder] = process.argv.slice(2);
const digest = createHash("sha256").update(readFileSync(new URL(import.meta.url))).digest("hex");
const stamp = join(folder, "made-by");
if (!existsSync(stamp) || readFileSync(stamp, "utf8") !== digest) {
  const made = `${folder}.part`;
  for (const old of [made, folder]) {
    rmSync(old, { recursive: true, force: true });
  }
  mkdirSync(made, { recursive: true });
  makeAll(media, made);
  writeFileSync(join(made, "made-by"), digest);
  renameSync(made, folder); // it is there only when it is whole
}
