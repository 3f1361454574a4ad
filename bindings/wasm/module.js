// Loads the WebAssembly module, from wherever it lies, and gives its functions their memory.
//
// The module stands alone: what it takes from outside are the few functions below. No script is
// generated and none is evaluated, so a Content-Security-Policy needs 'wasm-unsafe-eval' only.

import { KzError } from "./error.js";

const isNode = typeof process === "object" && Boolean(process.versions?.node);

/** The bytes of a file: fetch() of Node does not read files. */
async function readFile(url) {
  const { readFile: read } = await import("node:fs/promises");
  try {
    return await read(url);
  } catch (error) {
    throw new KzError("load", `${url} could not be read (${error.message}): pass where it lies`);
  }
}

async function compileResponse(url) {
  let response;
  try {
    response = await fetch(url);
  } catch (error) {
    throw new KzError("load", `${url} could not be fetched (${error.message}); try again later`);
  }
  if (!response.ok) {
    throw new KzError("load", `${url} could not be fetched: the server says ${response.status}`);
  }
  if (response.headers.get("Content-Type")?.startsWith("application/wasm")) {
    return WebAssembly.compileStreaming(response);
  }
  return WebAssembly.compile(await response.arrayBuffer());
}

/** The compiled module of bytes, an address or a compiled module. */
async function compile(source) {
  if (source instanceof WebAssembly.Module) return source;
  if (source instanceof ArrayBuffer || ArrayBuffer.isView(source)) {
    return WebAssembly.compile(source);
  }
  const url = new URL(source, import.meta.url);
  if (isNode && url.protocol === "file:") return WebAssembly.compile(await readFile(url));
  return compileResponse(url);
}

/** Whatever the module asks of a system: there is no environment, no file, and no end of it. */
function systemFunctions() {
  const unavailable = 52; // ENOSYS
  const known = {
    emscripten_notify_memory_growth: () => {},
    proc_exit: (code) => {
      throw new KzError("failed", `the module ended with ${code}; load it again`);
    },
  };
  return new Proxy(known, { get: (functions, name) => functions[name] ?? (() => unavailable) });
}

function importsOf(module) {
  const system = systemFunctions();
  const imports = {};
  for (const { module: from, name } of WebAssembly.Module.imports(module)) {
    imports[from] ??= {};
    imports[from][name] = system[name];
  }
  return imports;
}

/**
 * Instantiates the module.
 * @param {undefined|string|URL|BufferSource|WebAssembly.Module} source
 *   undefined: kzsdk.wasm beside this file
 */
export async function instantiate(source) {
  let module;
  try {
    module = await compile(source ?? new URL("./kzsdk.wasm", import.meta.url));
    const { exports } = await WebAssembly.instantiate(module, importsOf(module));
    exports._initialize?.();
    return exports;
  } catch (error) {
    if (error instanceof KzError) throw error;
    throw new KzError(
      "load",
      `the WebAssembly module could not be started (${error.message}); it needs a browser with ` +
        "WebAssembly vectors and exceptions, such as Chromium 95, Firefox 100, Safari 16.4 or " +
        "Node 18, and 'wasm-unsafe-eval' in the page's Content-Security-Policy",
    );
  }
}
