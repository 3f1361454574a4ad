// Does the work of client.js in a worker, of a browser or of Node: each message names a call, and
// is answered by one with the same number.

import { KzError } from "./error.js";
import { load } from "./index.js";

/** What was created here and not freed yet, by the number that the client knows it by. */
const objects = new Map();
let library;
let nextObject = 1;

function keep(object) {
  objects.set(nextObject, object);
  return nextObject++;
}

/** Calls by name; each receives the message's arguments. */
const CALLS = {
  load: async (options) => {
    library = await load(options);
    return library.version;
  },
  fingerprint: (...args) => library.fingerprint(...args),
  trail: (...args) => library.trail(...args),
  readTrail: (...args) => library.readTrail(...args),
  align: (...args) => library.align(...args),
  fingerprintStream: (...args) => keep(library.fingerprintStream(...args)),
  trailBuilder: (...args) => keep(library.trailBuilder(...args)),
};

function run({ call, object, args }) {
  if (object === undefined) return CALLS[call](...args);
  const target = objects.get(object);
  if (!target && call === "free") return undefined;
  if (!target) throw new KzError("order", "it was freed: create another one");
  if (call === "free") objects.delete(object);
  return target[call](...args);
}

/** Errors keep their properties only as plain records. */
function recordOf(error) {
  const { code = "failed", message, status, state } = error;
  return { code, message, status, state };
}

/** Buffers that the answer need not copy. */
function buffersOf(result) {
  const parts = ArrayBuffer.isView(result) ? [result] : Object.values(result ?? {});
  return parts.filter((part) => ArrayBuffer.isView(part)).map((part) => part.buffer);
}

async function answer(port, message) {
  try {
    const result = await run(message);
    port.postMessage({ id: message.id, result }, buffersOf(result));
  } catch (error) {
    port.postMessage({ id: message.id, error: recordOf(error) });
  }
}

function serve(port) {
  port.onmessage = ({ data }) => answer(port, data);
}

if (typeof WorkerGlobalScope === "undefined") {
  import("node:worker_threads").then(({ parentPort }) => serve(parentPort));
} else {
  serve(globalThis);
}
