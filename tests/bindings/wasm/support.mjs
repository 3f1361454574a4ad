// Where the tests find the package and the golden files.

import { mkdtempSync, mkdirSync, readFileSync, rmSync, symlinkSync } from "node:fs";
import { tmpdir } from "node:os";
import { join, resolve } from "node:path";
import { pathToFileURL } from "node:url";

function fromEnvironment(name) {
  const value = process.env[name];
  if (!value) throw new Error(`${name} is not set: run these tests through ctest`);
  return resolve(value);
}

/** The folder of the package as it was built. */
export const packageFolder = fromEnvironment("KZ_WASM_PACKAGE");
export const sourceFolder = fromEnvironment("KZ_SOURCE_DIR");

/** A module of the package, by the name of its file. */
export function importOf(file) {
  return import(pathToFileURL(join(packageFolder, file)).href);
}

export function goldenText(name) {
  return readFileSync(join(sourceFolder, "tests/whole/golden", `${name}.txt`), "utf8");
}

/** A folder in which "kzsdk" is installed; `context` removes it when its test ends. */
export function projectFolder(context) {
  const folder = mkdtempSync(join(tmpdir(), "kz-wasm-"));
  context.after(() => rmSync(folder, { recursive: true }));
  mkdirSync(join(folder, "node_modules"));
  symlinkSync(packageFolder, join(folder, "node_modules", "kzsdk"));
  return folder;
}
