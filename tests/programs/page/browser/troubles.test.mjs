// What the page says when something is missing: microphone, server, token, storage.

import assert from "node:assert/strict";
import { cpSync, mkdtempSync, rmSync, writeFileSync } from "node:fs";
import { tmpdir } from "node:os";
import { join } from "node:path";
import { after, describe, test } from "node:test";

import * as setting from "../setting.mjs";
import { NO_MICROPHONE, REFUSED_MICROPHONE } from "../../../support/browser.mjs";

const { shown, sound, textOf } = setting;
const TOKEN = "a-token-of-the-tests";

describe("troubles", { skip: setting.SKIPPED }, () => {
  const open = [];
  after(async () => {
    for (const each of open.reverse()) {
      await (each.close ?? each.stop).call(each);
    }
  });
  const start = async (options) => {
    const server = await setting.Server.start(options);
    open.push(server);
    return server;
  };
  const browse = async (flags) => {
    const browser = await setting.browserHearing(undefined, flags);
    open.push(browser);
    return browser;
  };
  const temporary = (name) => {
    const folder = mkdtempSync(join(tmpdir(), name));
    open.push({ close: () => rmSync(folder, { recursive: true }) });
    return folder;
  };
  /** Presses Listen, and returns what is said to be wrong. */
  const troubleOf = async (page) => {
    await page.click("#listen");
    const text = await shown(page, "#problem");
    assert.equal(await textOf(page, "#listen"), "Listen");
    return text;
  };

  test("a microphone that was refused", async () => {
    const page = await setting.openPage(await browse(REFUSED_MICROPHONE), (await start()).url);
    assert.match(await troubleOf(page), /The microphone was refused\s+Allow the microphone/);
  });

  test("no microphone, and none without https", async () => {
    const server = await start({ options: ["--host", "music.test"] });
    const farName = "--host-resolver-rules=MAP music.test 127.0.0.1";
    const browser = await browse([...NO_MICROPHONE, farName]);
    const page = await setting.openPage(browser, server.url);
    assert.match(await troubleOf(page), /No microphone was found/);
    const far = await setting.openPage(browser, `http://music.test:${server.port}/`);
    assert.match(await troubleOf(far), /needs a secure connection/);
    await far.setFiles("#file", [sound("telephone-15s.wav")]);
    await shown(far, "#result");
  });

  test("a server that went and came back", async () => {
    const server = await start();
    const page = await setting.openPage(await browse([]), server.url);
    await page.setFiles("#file", [sound("telephone-15s.wav")]);
    await shown(page, "#result");
    await server.stop();
    await page.setFiles("#file", [sound("telephone-15s.wav")]);
    assert.match(await shown(page, "#problem"), /The server does not answer/);
    await start({ port: server.port });
    await page.click("#problem button");
    await shown(page, "#result");
    assert.equal(await page.evaluate(() => document.querySelector("#problem").hidden), true);
  });

  test("a token is asked for when it is wanted", async () => {
    const file = join(temporary("kz-token-"), "token");
    writeFileSync(file, `${TOKEN}\n`, { mode: 0o600 });
    const server = await start({ options: ["--token-file", file] });
    const page = await setting.openPage(await browse([]), server.url);
    await page.setFiles("#file", [sound("telephone-15s.wav")]);
    await shown(page, "#token-form");
    assert.equal(await page.evaluate(() => document.activeElement.id), "token");

    await page.type("a-token\u200bof-the-tests");
    await page.press("Enter");
    assert.match(await shown(page, "#token-refused"), /^This cannot be a token/);
    await page.evaluate(() => document.querySelector("#token").select());
    await page.type("another-token-than-that");
    await page.press("Enter");
    assert.match(await shown(page, "#problem"), /was not accepted/);

    await shown(page, "#token-form");
    await page.type(TOKEN);
    await page.press("Enter");
    await shown(page, "#result");
    await shown(page, "#drawing");

    await page.reload();
    await page.setFiles("#file", [sound("telephone-15s.wav")]);
    await shown(page, "#result");
  });

  test("a part of the page that does not come", async () => {
    const browser = await browse([]);
    for (const part of ["kzsdk.wasm", "worker.js", "client.js"]) {
      const folder = temporary("kz-part-");
      const isKept = (name) => !name.includes(part);
      cpSync(process.env.KZ_PAGE, folder, { recursive: true, filter: isKept });
      const { url } = await start({ folder });
      const page = await setting.openPage(browser, url);
      await page.setFiles("#file", [sound("telephone-15s.wav")]);
      assert.match(await shown(page, "#problem"), /A part of the page is missing/, part);
    }
  });

  test("a browser that keeps nothing", async () => {
    const page = await browse([]).then((browser) => browser.newPage());
    const { url } = await start();
    await page.send("Page.addScriptToEvaluateOnNewDocument", {
      source: `for (const name of ["localStorage", "sessionStorage"]) {
        const get = () => { throw new DOMException("no", "SecurityError"); };
        Object.defineProperty(window, name, { get });
      }`,
    });
    await page.goto(url);
    await page.setFiles("#file", [sound("telephone-15s.wav")]);
    await shown(page, "#result");
    assert.match(await textOf(page, "#history-list"), /Trip on the Funny Boat/);
    assert.match(await shown(page, "#history-lost"), /keeps nothing/);
  });
});
