// How the page looks and reads in each of its states: no violation that axe-core knows, nothing
// wider than a narrow screen, and pictures for people to look at, in both themes.

import assert from "node:assert/strict";
import { existsSync, readFileSync } from "node:fs";
import { join } from "node:path";
import { after, before, describe, test } from "node:test";

import * as setting from "../setting.mjs";

const { shown, sound } = setting;
const SCREENS = {
  "light-wide": { width: 1280, height: 900, colorScheme: "light" },
  "dark-wide": { width: 1280, height: 900, colorScheme: "dark" },
  "light-narrow": { width: 320, height: 640, colorScheme: "light", mobile: true },
  "dark-narrow": { width: 320, height: 640, colorScheme: "dark", mobile: true },
};
const axeFile = join(process.env.KZ_AXE ?? "", "axe.min.js");
const axe = existsSync(axeFile) ? readFileSync(axeFile, "utf8") : null;

/** How the page comes into each of its states. */
const STATES = {
  start: async () => {},
  listening: async (page) => {
    await page.click("#listen");
    await page.waitFor(() => document.querySelector("#meter").ariaValueNow > 20);
  },
  error: async (page) => {
    await page.setFiles("#file", [sound("text.wav")]);
    await shown(page, "#problem");
  },
  matched: async (page) => {
    await page.setFiles("#file", [sound("telephone-15s.wav")]);
    await shown(page, "#drawing");
  },
  token: async (page) => {
    await page.evaluate(() => (document.querySelector("#token-form").hidden = false));
  },
  "set-list": async (page) => {
    await page.setFiles("#file", [sound("evening.mp3")]);
    await page.waitFor(() => document.querySelectorAll("#set-list-rows tr").length >= 4);
  },
};

describe("looks", { skip: setting.SKIPPED }, () => {
  let server;
  let browser;
  let page;

  before(async () => {
    server = await setting.Server.start();
    browser = await setting.browserHearing("telephone.wav");
    page = await setting.openPage(browser, server.url);
    if (axe) {
      await page.bypassPolicy();
      await page.reload();
      await page.evaluate(axe);
    }
  });

  after(async () => {
    await browser?.close();
    await server?.stop();
  });

  for (const [state, enter] of Object.entries(STATES)) {
    test(`in the state "${state}"`, async (context) => {
      await enter(page);
      for (const [name, screen] of Object.entries(SCREENS)) {
        await page.emulate({ mobile: false, ...screen });
        await page.waitFor(
          (dark) => matchMedia("(prefers-color-scheme: dark)").matches === dark,
          { args: [screen.colorScheme === "dark"] },
        );
        await setting.picture(page, `${state}-${name}`);
        await assertFits(page, `${state}, ${name}`);
        if (axe) {
          await assertNoViolation(page, `${state}, ${name}`);
        }
      }
      if (!axe) {
        context.diagnostic("nothing was checked by axe-core: npm, or its registry, was not there");
      }
    });
  }

  test("nothing moves if the system asks for that", async () => {
    const bar = () => getComputedStyle(document.querySelector("#meter div")).transitionDuration;
    const duration = () => page.evaluate(bar);
    assert.notEqual(await duration(), "0s");
    await page.emulate({ reducedMotion: true });
    assert.equal(await duration(), "0s");
  });
});

async function assertFits(page, what) {
  const [inner, full] = await page.evaluate(() => [
    document.documentElement.clientWidth,
    document.documentElement.scrollWidth,
  ]);
  assert.ok(full <= inner, `${what}: ${full} pixels on a screen of ${inner}`);
}

async function assertNoViolation(page, what) {
  const violations = await page.evaluate(async () => {
    const tags = ["wcag2a", "wcag2aa", "wcag21a", "wcag21aa", "wcag22aa", "best-practice"];
    const result = await globalThis.axe.run(document, { runOnly: tags });
    return result.violations.map(({ id, nodes }) => [id, nodes.map((node) => node.html)]);
  });
  assert.deepEqual(violations, [], what);
}
