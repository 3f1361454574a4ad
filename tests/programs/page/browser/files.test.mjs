// Files that are chosen or dropped: clips, long recordings, and what is no sound.

import assert from "node:assert/strict";
import { existsSync, mkdtempSync, readFileSync, rmSync } from "node:fs";
import { tmpdir } from "node:os";
import { join } from "node:path";
import { after, before, describe, test } from "node:test";

import * as setting from "../setting.mjs";

const { shown, sound, textOf } = setting;

describe("files", { skip: setting.SKIPPED }, () => {
  let server;
  let browser;
  let page;

  before(async () => {
    server = await setting.Server.start();
    browser = await setting.browserHearing();
    page = await setting.openPage(browser, server.url);
    await page.setPermission("clipboard-write", "granted");
    await page.setPermission("clipboard-read", "granted");
  });

  after(async () => {
    await browser?.close();
    await server?.stop();
  });

  test("a chosen clip is named, to the second", async () => {
    await page.setFiles("#file", [sound("telephone-15s.wav")]);
    await shown(page, "#result");
    assert.equal(await textOf(page, "#result-title"), "Trip on the Funny Boat");
    assert.match(await textOf(page, "#result-facts"), /Place in the track\s+1:40/);
    await shown(page, "#drawing");
    setting.assertNothingLeaked(page, server.url);
  });

  test("a clip that runs too fast is named", async () => {
    await page.setFiles("#file", [sound("fast.wav")]);
    await page.waitFor(() => /faster/.test(document.querySelector("#result-facts").innerText));
    assert.match(await textOf(page, "#result-facts"), /Place in the track\s+1:40/);
    assert.match(await textOf(page, "#result-facts"), /Played\s+about 4 % faster/);
    await shown(page, "#drawing");
  });

  test("a dropped clip is named", async () => {
    await drop(page, "telephone-15s.wav");
    await page.waitFor(() => document.querySelector("#result").hidden);
    await shown(page, "#result");
    assert.match(await textOf(page, "#history-list"), /in “telephone-15s.wav”/);
  });

  test("a dropped trail file is asked about as it is", async () => {
    const trail = await trailOf(server, 1);
    await drop(page, "track.kzt", trail);
    await shown(page, "#set-list");
    assert.match(await textOf(page, "#set-list-rows"), /Trip on the Funny Boat/);
  });

  test("a long recording gives a set-list", async () => {
    await page.setFiles("#file", [sound("evening.mp3")]);
    await page.waitFor(() => document.querySelectorAll("#set-list-rows tr").length >= 4);
    const rows = await page.evaluate(() =>
      [...document.querySelectorAll("#set-list-rows tr")].map((row) =>
        [...row.cells].map((cell) => cell.innerText.trim()),
      ),
    );
    const titles = rows.map(([, title]) => title.split("\n")[0]);
    assert.deepEqual(titles, [
      "Trip on the Funny Boat",
      "not recognised",
      "First melody",
      '<img src=x onerror="alert(1)">',
    ]);
    assert.match(rows[0][0], /^0:0\d – 0:3\d$/);
    assert.match(rows[2][0], /^0:4\d – 1:2\d$/);
    assert.match(rows[0][2], /^0:2\d$/);
    assert.match(await textOf(page, "#status"), /^3 passages were recognised/);
    setting.assertNothingLeaked(page, server.url);
  });

  test("a set-list is copied as text and as CSV", async () => {
    await page.click("#copy-text");
    await page.waitFor(() => document.querySelector("#status").textContent.endsWith("as text."));
    assert.match(await clipboard(page), /^0:0\d – 0:3\d {2}Trip on the Funny Boat by JDruid\n/);
    await page.click("#copy-csv");
    await page.waitFor(() => document.querySelector("#status").textContent.endsWith("as CSV."));
    assert.match(await clipboard(page), /^begin,end,title,artist,source,place,sure\r?\n0\.\d,3/);
  });

  test("a set-list is saved as a file", async () => {
    const folder = mkdtempSync(join(tmpdir(), "kz-saved-"));
    await browser.connection.send("Browser.setDownloadBehavior", {
      behavior: "allow",
      downloadPath: folder,
      browserContextId: page.ids.browserContextId,
    });
    await page.click("#save-csv");
    const file = join(folder, "evening.csv");
    await page.until(() => existsSync(file), "the file to be saved", 10_000);
    const [header, first] = readFileSync(file, "utf8").split("\r\n");
    assert.match(header, /^\ufeffbegin,end,title,artist/);
    assert.match(first, /^0\.\d,3\d\.\d,Trip on the Funny Boat,JDruid/);
    rmSync(folder, { recursive: true });
  });

  test("where copying is refused the text is offered", async () => {
    await page.setPermission("clipboard-write", "denied");
    await page.evaluate(() => (navigator.clipboard.writeText = () => Promise.reject(new Error())));
    await page.click("#copy-text");
    await shown(page, "#by-hand");
    const selected = await page.evaluate(() => {
      const area = document.querySelector("#by-hand-text");
      return area.value.slice(area.selectionStart, area.selectionEnd);
    });
    assert.match(selected, /Trip on the Funny Boat by JDruid\n/);
  });

  test("a busy server is told of while it is", async () => {
    await page.evaluate(() => {
      const ask = window.fetch;
      const detail = document.querySelector("#detail");
      window.details = [];
      new MutationObserver(() => window.details.push(detail.textContent)).observe(detail, {
        childList: true,
      });
      let asked = 0;
      window.fetch = async (...request) => {
        if (++asked === 1) {
          return Response.json({}, { status: 503, headers: { "Retry-After": "0.5" } });
        }
        await new Promise((resolve) => setTimeout(resolve, 1000));
        window.details.push(`asked again: ${detail.textContent}`);
        return ask(...request);
      };
    });
    await drop(page, "track.kzt", await trailOf(server, 1));
    await shown(page, "#set-list");
    const details = await page.evaluate(() => window.details);
    assert.ok(details.some((text) => text.startsWith("The server is busy")), `${details}`);
    assert.ok(details.includes("asked again: "), `${details}`);
    await page.reload();
  });

  test("an answer says if not all was searched", async () => {
    await page.evaluate(() => {
      const ask = window.fetch;
      window.fetch = async (...request) => {
        const answer = await (await ask(...request)).json();
        return Response.json({ ...answer, shards: { answered: 1, of: 2 } });
      };
    });
    await page.setFiles("#file", [sound("unknown.wav")]);
    await shown(page, "#problem");
    assert.match(await shown(page, "#notice"), /^Part of the catalogue was not searched: 1 of/);
    await page.reload();
  });

  test("a track that the server does not know", async () => {
    await page.setFiles("#file", [sound("unknown.wav")]);
    assert.match(await shown(page, "#problem"), /^Not (recognised|sure)\s/);
    assert.equal(await page.evaluate(() => document.querySelector("#set-list").hidden), true);
  });

  test("silence is too quiet", async () => {
    await problemOf(page, "silence.wav", /^Too quiet\s+There was hardly any sound/);
  });

  test("files without sound are told from sound", async () => {
    await problemOf(page, "text.wav", /“text.wav” is not a sound file/);
    await problemOf(page, "empty.wav", /“empty.wav” is empty/);
  });

  test("of several files the first is taken, and said", async () => {
    await page.evaluate(() => {
      const ask = window.fetch;
      window.fetch = (...request) => {
        if (/match/.test(request[0])) {
          window.noticed = document.querySelector("#notice").textContent;
        }
        return ask(...request);
      };
    });
    await dropMany(page, ["telephone-15s.wav", "silence.wav"]);
    await shown(page, "#result");
    // It stood there while the answer was awaited, and has gone with it.
    assert.match(await page.evaluate(() => window.noticed), /^Only the first of 2 files/);
    assert.equal(await textOf(page, "#notice"), "");
    await shown(page, "#drawing"); // the last that moves what is below
  });

  test("the history can be cleared", async () => {
    await page.click("#clear-history");
    assert.equal(await shown(page, "#history-empty"), "Nothing yet.");
    assert.equal(await page.evaluate(() => document.activeElement.id), "history-heading");
    await page.reload();
    assert.equal(await shown(page, "#history-empty"), "Nothing yet.");
  });
});

/** Chooses a file and waits for what is said about it. */
async function problemOf(page, name, expected) {
  await page.setFiles("#file", [sound(name)]);
  await page.waitFor(
    (pattern) => {
      const problem = document.querySelector("#problem");
      return !problem.hidden && new RegExp(pattern).test(problem.innerText);
    },
    { args: [expected.source], limit: 10_000 },
  );
}

/** The bytes of a track's trail file, as the server gives them. */
async function trailOf(server, track) {
  const response = await fetch(new URL(`v1/tracks/${track}/trail`, server.url));
  return Buffer.from(await response.arrayBuffer());
}

const drop = (page, name, bytes = readFileSync(sound(name))) =>
  dropBytes(page, [[name, bytes.toString("base64")]]);

const dropMany = (page, names) =>
  dropBytes(page, names.map((name) => [name, readFileSync(sound(name)).toString("base64")]));

/** Drops files on the page as a hand would: over it first, then let go. */
function dropBytes(page, files) {
  return page.evaluate((given) => {
    const carried = new DataTransfer();
    for (const [name, text] of given) {
      const bytes = Uint8Array.from(atob(text), (letter) => letter.charCodeAt(0));
      carried.items.add(new File([bytes], name));
    }
    for (const type of ["dragover", "drop"]) {
      const event = new DragEvent(type, { dataTransfer: carried, bubbles: true, cancelable: true });
      document.querySelector("main").dispatchEvent(event);
      if (!event.defaultPrevented) {
        throw new Error(`${type} was left to the browser, which would open the file`);
      }
    }
  }, files);
}

const clipboard = (page) => page.evaluate(() => navigator.clipboard.readText());
