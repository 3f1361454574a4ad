#!/usr/bin/env node
// Times the WebAssembly module in Node beside the native libraries, in turns within one run, and
// prints a table in Markdown: 60 s of stereo sound at 44100 Hz as a fingerprint and as a trail, and
// how large the module is.
//
//   bench/wasm/measure.mjs BUILD [ROUNDS]     BUILD: a folder such as build/release, with the
//                                             targets kz_wasm and kzbench_wasm_native built

import { spawn } from "node:child_process";
import { mkdtempSync, readFileSync, rmSync, writeFileSync } from "node:fs";
import { cpus, tmpdir } from "node:os";
import { join, resolve } from "node:path";
import { createInterface } from "node:readline";
import { pathToFileURL } from "node:url";
import { brotliCompressSync, gzipSync } from "node:zlib";

import { melody, toFloats } from "../../tests/bindings/wasm/sounds.mjs";

const RATE = 44100;
const CHANNELS = 2;
const SECONDS = 60;

const [build, roundsText = "15"] = process.argv.slice(2);
if (!build || !(Number(roundsText) > 0)) {
  process.stderr.write("usage: bench/wasm/measure.mjs BUILD [ROUNDS]\n");
  process.exit(2);
}
const rounds = Number(roundsText);
const packageFolder = resolve(build, "bindings/wasm/package");

/** A native process that waits for the names of what it is to do. */
class Native {
  constructor(file, environment) {
    const program = resolve(build, "bench/kzbench_wasm_native");
    this.child = spawn(program, [file, String(RATE), String(CHANNELS)], {
      stdio: ["pipe", "pipe", "inherit"],
      env: { ...process.env, ...environment },
    });
    this.lines = createInterface({ input: this.child.stdout })[Symbol.asyncIterator]();
  }

  async time(what) {
    this.child.stdin.write(`${what}\n`);
    const { value, done } = await this.lines.next();
    if (done) throw new Error("the native side has ended");
    return Number(value);
  }

  end() {
    this.child.stdin.end();
  }
}

function timeHere(kz, what, samples) {
  const begin = performance.now();
  kz[what](samples, RATE, { channels: CHANNELS });
  return performance.now() - begin;
}

function median(numbers) {
  return [...numbers].sort((a, b) => a - b)[Math.floor(numbers.length / 2)];
}

/** Medians of each side's times, in the order of `sides`. */
async function race(sides) {
  const times = sides.map(() => []);
  for (let round = -3; round < rounds; round += 1) {
    for (const [index, side] of sides.entries()) {
      const took = await side();
      if (round >= 0) times[index].push(took); // the first ones warm up
    }
  }
  return times.map(median);
}

function row(cells) {
  process.stdout.write(`| ${cells.join(" | ")} |\n`);
}

async function printTimes(kz, samples, file) {
  const plain = { KZSDK_KERNELS: "plain", KZCAT_KERNELS: "plain" };
  const natives = [new Native(file, {}), new Native(file, plain)];
  row(["60 s, 44100 Hz, stereo", "in Node, ms", "native, ms", "native plain, ms", "Node / native"]);
  row(["---", "---", "---", "---", "---"]);
  for (const what of ["fingerprint", "trail"]) {
    const [here, native, nativePlain] = await race([
      () => timeHere(kz, what, samples),
      () => natives[0].time(what),
      () => natives[1].time(what),
    ]);
    const times = [here, native, nativePlain].map((time) => time.toFixed(1));
    row([what, ...times, (here / native).toFixed(1)]);
  }
  natives.forEach((native) => native.end());
}

function printSizes() {
  const bytes = readFileSync(join(packageFolder, "kzsdk.wasm"));
  const kilobytes = (buffer) => Math.round(buffer.length / 1000);
  row(["kzsdk.wasm", "as it is", "gzip -9", "Brotli"]);
  row(["---", "---", "---", "---"]);
  const packed = [gzipSync(bytes, { level: 9 }), brotliCompressSync(bytes)];
  row(["KB", ...[bytes, ...packed].map(kilobytes)]);
}

const { load } = await import(pathToFileURL(join(packageFolder, "index.js")).href);
const folder = mkdtempSync(join(tmpdir(), "kz-bench-"));
try {
  const samples = toFloats(melody(RATE, CHANNELS, SECONDS));
  const file = join(folder, "sound.f32");
  writeFileSync(file, samples);
  process.stdout.write(`${cpus()[0].model}, Node ${process.versions.node}, ${rounds} rounds\n\n`);
  await printTimes(await load(), samples, file);
  process.stdout.write("\n");
  printSizes();
} finally {
  rmSync(folder, { recursive: true });
}
