// The page hears a telephone's clip of a track and names it; real browser, server and module.

import assert from "node:assert/strict";
import { after, before, describe, test } from "node:test";

import * as setting from "../setting.mjs";

const { shown, textOf } = setting;

describe("listening", { skip: setting.SKIPPED }, () => {
  let server;
  let browser;

  before(async () => {
    server = await setting.Server.start();
    browser = await setting.browserHearing("telephone.wav");
  });

  after(async () => {
    await browser?.close();
    await server?.stop();
  });

  test("a telephone's clip is named, with its place", async () => {
    const page = await setting.openPage(browser, server.url);
    await page.waitFor(
      () => document.querySelector("#catalogue").innerText === "This server knows 3 tracks.",
    );
    await page.click("#listen");
    await shown(page, "#meter");
    await page.waitFor(() => document.querySelector("#meter").ariaValueNow > 20);
    assert.equal(await textOf(page, "#listen"), "Stop");
    await shown(page, "#result", 35_000);
    assert.equal(await textOf(page, "#result-title"), "Trip on the Funny Boat");
    assert.equal(await textOf(page, "#result-artist"), "JDruid");
    const facts = await textOf(page, "#result-facts");
    // The fake microphone runs from when it is opened, so that the place is not to the second.
    assert.match(facts, /Place in the track\s+1:4\d/);
    const said = await textOf(page, "#status");
    assert.match(said, /^Recognised: Trip on the Funny Boat by JDruid, at 1:4/);
    assert.equal(await textOf(page, "#listen"), "Listen");
    await shown(page, "#drawing");
    await assertAgreement(page);
    await setting.picture(page, "heard");
    setting.assertNothingLeaked(page, server.url);

    await page.reload();
    assert.match(await textOf(page, "#history-list"), /Trip on the Funny Boat\s+JDruid, at 1:4/);
    await page.close();
  });

  test("silence is told while it lasts", async () => {
    const silent = await setting.browserHearing("silence.wav");
    const page = await setting.openPage(silent, server.url);
    await page.click("#listen");
    await page.waitFor(() => /hearing nothing/.test(document.querySelector("#status").innerText));
    await page.press("Escape");
    assert.deepEqual(page.sent.filter(({ verb }) => verb !== "GET"), [], "nobody was asked");
    await silent.close();
  });

  test("keys alone listen, stop and clear", async () => {
    const page = await setting.openPage(browser, server.url);
    await page.press("Tab");
    assert.equal(await focused(page), "listen");
    await page.press("Enter");
    await shown(page, "#meter");
    await page.press("Escape");
    await page.waitFor(() => document.querySelector("#status").textContent === "Stopped.");
    assert.equal(await page.evaluate(() => document.querySelector("#meter").hidden), true);
    assert.equal(await focused(page), "listen");
    await page.press("Space");
    await shown(page, "#meter");
    await page.press("Space");
    await page.waitFor(() => document.querySelector("#status").textContent === "Stopped.");
    await page.press("Tab");
    assert.equal(await focused(page), "file");
    const outline = await page.evaluate(
      () => getComputedStyle(document.querySelector("label[for=file]")).outlineStyle,
    );
    assert.equal(outline, "solid", "the focus is seen");
    await page.close();
  });
});

const focused = (page) => page.evaluate(() => document.activeElement.id);

/** The drawing tells that the two are the same recording, to those who see it and who do not. */
async function assertAgreement(page) {
  const text = await textOf(page, "#drawing-text");
  const percent = Number(text.match(/^(\d+) % of [\d,]+ bits differ/)[1]);
  assert.ok(percent < 40, text);
  const label = await page.evaluate(() => document.querySelector("#strips").ariaLabel);
  assert.ok(label.includes(text), label);
  const painted = await page.evaluate(() => {
    const canvas = document.querySelector("#strip-clip");
    const { data } = canvas.getContext("2d").getImageData(0, 0, canvas.width, canvas.height);
    let count = 0;
    for (let i = 3; i < data.length; i += 4) {
      count += data[i] > 0 ? 1 : 0;
    }
    return count / (data.length / 4);
  });
  assert.ok(painted > 0.3 && painted < 0.7, `${painted} of the strip is painted`);
}
