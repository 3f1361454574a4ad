// What the tests of the page share: the real `kzfp serve` over a catalogue of three tracks, and a
// browser with the page open. What has to be there is named by variables of the environment:
//
//   KZFP       the program                      KZ_PAGE      the page's folder
//   KZ_MEDIA   the tests' clips                 KZ_SOUNDS    what make_media.mjs made
//   KZ_AXE     axe.min.js's folder, or nothing  KZ_PICTURES  where screenshots go

import assert from "node:assert/strict";
import { execFileSync, spawn } from "node:child_process";
import { mkdirSync, mkdtempSync, rmSync } from "node:fs";
import { tmpdir } from "node:os";
import { join } from "node:path";
import { createInterface } from "node:readline";

import { findBrowser, launch, microphoneFlags } from "../../support/browser.mjs";

const env = process.env;

/** The path of a file that make_media.mjs made. */
export const sound = (name) => join(env.KZ_SOUNDS, name);

/** Why these tests cannot run here; false when they can. */
export const SKIPPED = findBrowser() ? false : "no browser (Debian: chromium-headless-shell)";

/** Seconds of the tune at which the telephone's clip begins. */
export const CLIP_PLACE = 100.05;

/** The shape of the trails that the page may send. */
const TRAIL = "application/x-kzt";

/** A folder that is removed after the tests of the file. */
function temporaryFolder() {
  const folder = mkdtempSync(join(tmpdir(), "kz-page-"));
  process.on("exit", () => rmSync(folder, { recursive: true, force: true }));
  return folder;
}

/** A catalogue of the tune and two melodies. */
function makeCatalogue(folder) {
  const catalogue = join(folder, "music.kzc");
  const tune = join(env.KZ_MEDIA, "funnyboat.ogg");
  const tracks = [tune, sound("melody-1.flac"), sound("melody-2.flac")];
  execFileSync(env.KZFP, ["add", catalogue, ...tracks], { stdio: "pipe" });
  return catalogue;
}

/** A running `kzfp serve`. */
export class Server {
  static #catalogue = null;

  /**
   * Starts it at a free port, or the one named.
   *
   * @param {{port?: number, folder?: string, options?: string[]}} settings
   *   folder: of the page, when it is another one
   */
  static async start({ port = 0, folder = env.KZ_PAGE, options = [] } = {}) {
    Server.#catalogue ??= makeCatalogue(temporaryFolder());
    const server = new Server();
    const where = ["--listen", `127.0.0.1:${port}`, "--page", folder, "--log", "none"];
    server.child = spawn(env.KZFP, ["serve", Server.#catalogue, ...where, ...options], {
      stdio: ["ignore", "pipe", "inherit"],
    });
    server.ended = new Promise((resolve) => server.child.on("exit", resolve));
    const line = await Promise.race([
      new Promise((resolve) => createInterface(server.child.stdout).once("line", resolve)),
      server.ended.then((status) => assert.fail(`kzfp serve ended with ${status}`)),
    ]);
    server.url = line.match(/https?:\S+/)[0];
    server.port = Number(new URL(server.url).port);
    return server;
  }

  async stop() {
    this.child.kill("SIGTERM");
    await this.ended;
  }
}

/**
 * A browser whose microphone plays a file.
 *
 * @param {string} [file]    Of make_media.mjs; without one the browser has no microphone.
 * @param {string[]} [flags] Further ones of the browser.
 */
export function browserHearing(file, flags = []) {
  return launch({ flags: [...(file ? microphoneFlags(sound(file)) : []), ...flags] });
}

/** A page of the browser that has been opened, with all that it sends on record. */
export async function openPage(browser, url, { screen = {} } = {}) {
  const page = await browser.newPage();
  page.sent = [];
  page.browser.connection.listen(page.ids.sessionId, (method, params) => {
    if (method === "Network.requestWillBeSent") {
      const { url: to, method: verb, headers, hasPostData } = params.request;
      page.sent.push({ to, verb, type: headers["Content-Type"], hasBody: Boolean(hasPostData) });
    }
  });
  await page.emulate({ width: 1280, height: 900, ...screen });
  await page.goto(url);
  await page.waitFor(() => document.body.classList.contains("ready"));
  return page;
}

/** The text of an element, without what is hidden. */
export const textOf = (page, selector) =>
  page.evaluate((wanted) => document.querySelector(wanted).innerText.trim(), selector);

/** Waits until an element is shown, and returns its text. */
export async function shown(page, selector, limit = 20_000) {
  const isShown = (wanted) => !document.querySelector(wanted).hidden;
  await page.waitFor(isShown, { limit, args: [selector] });
  return textOf(page, selector);
}

/** Nothing went to another host, only trails were sent, and the browser complained of nothing. */
export function assertNothingLeaked(page, url) {
  const { origin } = new URL(url);
  const elsewhere = page.sent.filter(
    ({ to }) => new URL(to).origin !== origin && !/^(blob|data):/.test(to),
  );
  assert.deepEqual(elsewhere, []);
  const posts = page.sent.filter(({ verb, hasBody }) => verb !== "GET" || hasBody);
  assert.ok(posts.length > 0, "something was asked");
  for (const post of posts) {
    assert.equal(post.type, TRAIL, `${post.verb} ${post.to}`);
  }
  assert.deepEqual(page.errors, []);
}

/** A picture for people to look at. */
export async function picture(page, name) {
  mkdirSync(env.KZ_PICTURES, { recursive: true });
  await page.screenshot(join(env.KZ_PICTURES, `${name}.png`), { fullPage: true });
}
