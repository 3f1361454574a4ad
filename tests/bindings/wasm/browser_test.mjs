// The package in a browser: the golden files through a worker, under a strict policy, and
// microphones.

import assert from "node:assert/strict";
import { mkdtempSync, readFileSync, rmSync, writeFileSync } from "node:fs";
import { tmpdir } from "node:os";
import { join } from "node:path";
import { after, before, test } from "node:test";

import {
  NO_MICROPHONE,
  REFUSED_MICROPHONE,
  launch,
  microphoneFlags,
  serveFolder,
} from "../../support/browser.mjs";
import { melody } from "./sounds.mjs";
import { packageFolder, sourceFolder } from "./support.mjs";

const POLICY =
  "default-src 'none'; script-src 'self' 'wasm-unsafe-eval'; worker-src 'self'; " +
  "connect-src 'self'";

const here = join(sourceFolder, "tests/bindings/wasm");
let folder;

function siteWith(policy) {
  return serveFolder(join(here, "site"), {
    headers: { "Content-Security-Policy": policy, "X-Content-Type-Options": "nosniff" },
    routes: {
      "/kzsdk/": packageFolder,
      "/golden/": join(sourceFolder, "tests/whole/golden"),
      "/sounds.mjs": (_, response) => sendFile(response, "sounds.mjs"),
    },
  });
}

function sendFile(response, name) {
  response.setHeader("Content-Type", "text/javascript");
  response.end(readFileSync(join(here, name)));
}

/** Opens the page in a browser of its own, and closes both when `use` is done. */
async function inBrowser(flags, use, policy = POLICY) {
  const site = await siteWith(policy);
  const browser = await launch({ flags });
  try {
    const page = await browser.newPage();
    await page.goto(`${site.url}/`);
    await page.waitFor("window.ready");
    return await use(page);
  } finally {
    await browser.close();
    await site.close();
  }
}

/** A WAV file of 16-bit samples. */
function writeWav(file, samples, rate) {
  const header = Buffer.alloc(44);
  header.write("RIFF");
  header.writeUInt32LE(36 + samples.byteLength, 4);
  header.write("WAVEfmt ", 8);
  header.writeUInt32LE(16, 16);
  header.writeUInt16LE(1, 20);
  header.writeUInt16LE(1, 22);
  header.writeUInt32LE(rate, 24);
  header.writeUInt32LE(rate * 2, 28);
  header.writeUInt16LE(2, 32);
  header.writeUInt16LE(16, 34);
  header.write("data", 36);
  header.writeUInt32LE(samples.byteLength, 40);
  writeFileSync(file, Buffer.concat([header, Buffer.from(samples.buffer)]));
}

before(() => {
  folder = mkdtempSync(join(tmpdir(), "kz-browser-test-"));
});
after(() => rmSync(folder, { recursive: true }));

test("a worker's documents and trails are golden", async () => {
  await inBrowser([], async (page) => {
    const { differences, compared } = await page.evaluateWithin(300_000, "compareGolden()");
    assert.deepEqual(differences, []);
    assert.ok(compared >= 60, `${compared}`);
    assert.deepEqual(page.errors, []);
  });
});

test("a page and its worker give the same", async () => {
  await inBrowser([], async (page) => {
    const { equal, version } = await page.evaluate("compareThreads()");
    assert.equal(equal, true);
    assert.match(version, /^\d+\.\d+\.\d+$/);
    assert.deepEqual(page.errors, []);
  });
});

test("what cannot be loaded is named", async () => {
  await inBrowser([], async (page) => {
    const codes = await page.evaluate("failuresToLoad()");
    assert.deepEqual(codes, { missing: "load", page: "load", module: "load", worker: "load" });
  });
});

test("a policy without WebAssembly is named", async () => {
  const strict = POLICY.replace(" 'wasm-unsafe-eval'", "");
  const code = await inBrowser([], (page) => page.evaluate("loadCode()"), strict);
  assert.equal(code, "load");
});

test("a microphone gives the sound that plays", async () => {
  const file = join(folder, "melody.wav");
  writeWav(file, melody(44100, 1, 30), 44100);
  await inBrowser(microphoneFlags(file), async (page) => {
    const heard = await page.evaluateWithin(60_000, "listen(10)");
    const text = JSON.stringify(heard);
    assert.equal(heard.found, true, text);
    assert.ok(heard.errorRate < 0.3, text);
    assert.ok(heard.seconds > 7 && heard.seconds < 14, text);
    assert.ok(heard.rate >= 8000 && heard.label !== "", text);
    assert.ok(heard.highest > 0.01 && heard.highest <= 1, text);
    assert.deepEqual([heard.before, heard.blocksAfterStop, heard.levelAfterwards], [0, 0, 0], text);
    assert.equal(heard.longest, 4096, text);
    assert.ok(heard.lastBlocks >= 1, text); // there is always a part of one left
    assert.deepEqual(page.errors, []);
  });
});

test("a microphone that goes is let go", async () => {
  const file = join(folder, "going.wav");
  writeWav(file, melody(44100, 1, 5), 44100);
  await inBrowser(microphoneFlags(file), async (page) => {
    const ended = await page.evaluate("disconnect()");
    assert.deepEqual(ended, { code: "no-microphone", state: "ended" });
  });
});

test("microphones that cannot be had are named", async () => {
  const codeWith = (flags, options) =>
    inBrowser(flags, (page) =>
      page.evaluate((given) => window.microphoneCode(given), options ?? {}),
    );
  assert.equal(await codeWith(REFUSED_MICROPHONE), "refused");
  assert.equal(await codeWith(NO_MICROPHONE), "no-microphone");
  const file = join(folder, "short.wav");
  writeWav(file, melody(44100, 1, 1), 44100);
  assert.equal(await codeWith(microphoneFlags(file)), "none");
  assert.equal(await codeWith(microphoneFlags(file), { deviceId: "other" }), "no-microphone");
  assert.equal(await codeWith(microphoneFlags(file), { workletUrl: "/none.js" }), "load");
  assert.equal(await codeWith(microphoneFlags(file), { onSamples: 5 }), "invalid-argument");
});
