// How the page's folder is put together, by the script that the build runs.

import assert from "node:assert/strict";
import { execFileSync } from "node:child_process";
import { existsSync, mkdirSync, mkdtempSync, readdirSync, readFileSync, rmSync, writeFileSync }
  from "node:fs";
import { tmpdir } from "node:os";
import { join } from "node:path";
import { test } from "node:test";
import { fileURLToPath } from "node:url";
import { gunzipSync } from "node:zlib";

const SCRIPT = fileURLToPath(new URL("../../../../web/assemble.cmake", import.meta.url));
const TEXT = "<!DOCTYPE html>\n".repeat(100);

/** Folders with a page and a package of one file each, gone after the test. */
function folders(context) {
  const folder = mkdtempSync(join(tmpdir(), "kz-assembling-"));
  context.after(() => rmSync(folder, { recursive: true }));
  for (const [name, file] of [["web", "index.html"], ["package", "index.js"]]) {
    mkdirSync(join(folder, name));
    writeFileSync(join(folder, name, file), TEXT);
  }
  return { folder, page: join(folder, "page") };
}

function assemble(folder, gzip) {
  const settings = { SOURCE: "web", PACKAGE: "package", PAGE: "page" };
  const defined = Object.entries(settings).map(([name, at]) => `-D${name}=${join(folder, at)}`);
  execFileSync(process.env.KZ_CMAKE ?? "cmake", [...defined, `-DGZIP=${gzip}`, "-P", SCRIPT], {
    stdio: "pipe",
  });
}

test("what an interrupted build compressed is not kept", (context) => {
  const { folder, page } = folders(context);
  const broken = join(folder, "broken-gzip");
  writeFileSync(broken, "#!/bin/sh\nprintf cut; exit 1\n", { mode: 0o755 });
  assert.throws(() => assemble(folder, broken));
  assert.ok(!existsSync(join(page, "index.html.gz")));

  assemble(folder, "gzip");
  assert.equal(gunzipSync(readFileSync(join(page, "index.html.gz"))).toString(), TEXT);
  const files = readdirSync(page, { recursive: true }).filter((name) => name !== "kzsdk").sort();
  assert.deepEqual(files, ["index.html", "index.html.gz", "kzsdk/index.js", "kzsdk/index.js.gz"]);
});
