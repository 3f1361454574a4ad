// The package as npm installs it: by its name, with its types, and the programs of its page.

import assert from "node:assert/strict";
import { execFileSync } from "node:child_process";
import { existsSync, readFileSync, readdirSync, writeFileSync } from "node:fs";
import { join } from "node:path";
import { test } from "node:test";

import { packageFolder, projectFolder, sourceFolder } from "./support.mjs";

const manifest = JSON.parse(readFileSync(join(packageFolder, "package.json"), "utf8"));
const scripts = readdirSync(packageFolder).filter((file) => file.endsWith(".js"));

function run(folder, program) {
  return execFileSync(process.execPath, [program], { cwd: folder, encoding: "utf8" });
}

/** The blocks of one language between fences of the package's page. */
function blocksOf(language) {
  const page = readFileSync(join(packageFolder, "README.md"), "utf8");
  const fence = new RegExp(`^\`\`\`${language}\n(.*?)^\`\`\`$`, "gms");
  return [...page.matchAll(fence)].map(([, text]) => text);
}

test("every export leads to a file", () => {
  for (const target of Object.values(manifest.exports).flatMap((each) =>
    typeof each === "string" ? [each] : Object.values(each),
  )) {
    assert.ok(existsSync(join(packageFolder, target)), target);
  }
});

test("nothing is needed at run time", () => {
  assert.equal(manifest.dependencies, undefined);
  for (const script of scripts) {
    const text = readFileSync(join(packageFolder, script), "utf8");
    for (const [, name] of text.matchAll(/(?:\bfrom |\bimport\()"([^"]+)"/g)) {
      assert.match(name, /^(\.\/|node:)/, `${script} imports ${name}`);
    }
  }
});

test("no script is made from text", () => {
  for (const script of scripts) {
    const text = readFileSync(join(packageFolder, script), "utf8");
    assert.doesNotMatch(text, /\beval\s*\(|new Function|createObjectURL/, script);
  }
});

test("the module asks for nothing of a system", () => {
  const bytes = readFileSync(join(packageFolder, "kzsdk.wasm"));
  const imports = WebAssembly.Module.imports(new WebAssembly.Module(bytes));
  const known = [
    "emscripten_notify_memory_growth",
    "environ_get",
    "environ_sizes_get",
    "proc_exit",
  ];
  assert.deepEqual(imports.map(({ name }) => name).sort(), known);
});

test("the page's programs print what it shows", (context) => {
  const folder = projectFolder(context);
  const [program] = blocksOf("js");
  const [expected] = blocksOf("text");
  writeFileSync(join(folder, "example.mjs"), program);
  assert.equal(run(folder, "example.mjs"), expected);
});

test("sub-paths can be imported by name", (context) => {
  const folder = projectFolder(context);
  writeFileSync(
    join(folder, "example.mjs"),
    `import { openMicrophone } from "kzsdk/microphone";
     import { createClient, KzError } from "kzsdk/client";
     const kz = await createClient();
     const failure = await openMicrophone({ onSamples: () => {} }).catch((error) => error);
     console.log(kz.version, failure instanceof KzError, failure.code);
     kz.close();`,
  );
  assert.equal(run(folder, "example.mjs"), `${manifest.version} true unsupported\n`);
});

// The compiler is a package of its own, which need not be there.
const compiler = process.env.KZ_TSC;

test("types describe what there is", { skip: !compiler && "no tsc" }, (context) => {
  const folder = projectFolder(context);
  const usage = readFileSync(join(sourceFolder, "tests/bindings/wasm/usage.ts"), "utf8");
  writeFileSync(join(folder, "usage.mts"), usage);
  const options = ["--noEmit", "--strict", "--target", "es2022", "--lib", "es2022,dom"];
  const found = ["--module", "node16", "--moduleResolution", "node16", "usage.mts"];
  try {
    execFileSync(compiler, [...options, ...found], { cwd: folder, encoding: "utf8" });
  } catch (error) {
    assert.fail(error.stdout);
  }
});
