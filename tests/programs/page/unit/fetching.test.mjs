// What the script that fetches axe-core says when it cannot.

import assert from "node:assert/strict";
import { spawn, spawnSync } from "node:child_process";
import { mkdtempSync, rmSync } from "node:fs";
import { createServer } from "node:http";
import { tmpdir } from "node:os";
import { join } from "node:path";
import { test } from "node:test";
import { fileURLToPath } from "node:url";

const SCRIPT = fileURLToPath(new URL("../../../../scripts/fetch_axe.sh", import.meta.url));
const skip = spawnSync("npm", ["--version"]).status === 0 ? false : "no npm (Debian: npm)";

/** How the script ends with that registry, and with nothing fetched before. */
async function statusWith(registry, context) {
  const folder = mkdtempSync(join(tmpdir(), "kz-fetching-"));
  context.after(() => rmSync(folder, { recursive: true }));
  const settings = { npm_config_registry: registry, npm_config_cache: join(folder, "cache") };
  const env = { ...process.env, ...settings };
  const child = spawn(SCRIPT, [join(folder, "axe")], { env, stdio: "ignore" });
  return new Promise((resolve) => child.on("exit", resolve));
}

test("a registry out of reach is no failure of tests", { skip }, async (context) => {
  assert.equal(await statusWith("http://127.0.0.1:1/", context), 77);
});

test("a registry that answers otherwise is a failure", { skip }, async (context) => {
  const server = createServer((request, response) => response.writeHead(404).end("{}"));
  await new Promise((resolve) => server.listen(0, "127.0.0.1", resolve));
  context.after(() => server.close());
  assert.equal(await statusWith(`http://127.0.0.1:${server.address().port}/`, context), 1);
});
