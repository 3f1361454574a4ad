// The library in a worker, so that a page goes on drawing while sound is worked on. client.d.ts
// describes it.

import { KzError } from "./error.js";

export { KzError };

/** A worker of the browser, or one of Node that looks the same. */
async function startWorker(url) {
  if (typeof Worker !== "undefined") return new Worker(url, { type: "module" });
  const { Worker: Thread } = await import("node:worker_threads");
  const thread = new Thread(url);
  const worker = {
    postMessage: (message, transfer) => thread.postMessage(message, transfer),
    terminate: () => thread.terminate(),
  };
  thread.on("message", (data) => worker.onmessage({ data }));
  thread.on("error", (error) => worker.onerror(error));
  thread.unref(); // a program that has nothing else to do may end
  worker.ref = () => thread.ref();
  worker.unref = () => thread.unref();
  return worker;
}

/** Numbers the calls to a worker and settles their promises. */
class Calls {
  #worker;
  #waiting = new Map();
  #next = 1;
  #closed;

  constructor(worker, url) {
    this.#worker = worker;
    worker.onmessage = ({ data }) => this.#settle(data);
    worker.onerror = (event) => {
      const reason = event.message ? ` (${event.message})` : "";
      this.end(new KzError("load", `the worker ${url} could not be run${reason}`));
    };
  }

  make(message, transfer = []) {
    if (this.#closed) return Promise.reject(this.#closed);
    return new Promise((resolve, reject) => {
      const id = this.#next++;
      this.#post({ id, ...message }, transfer);
      this.#waiting.set(id, { resolve, reject });
      this.#worker.ref?.();
    });
  }

  #post(message, transfer) {
    try {
      this.#worker.postMessage(message, transfer);
    } catch (error) {
      throw new KzError("invalid-argument", `this cannot be sent to a worker (${error.message})`);
    }
  }

  end(error) {
    this.#closed ??= error;
    for (const { reject } of this.#waiting.values()) reject(this.#closed);
    this.#waiting.clear();
    this.#worker.terminate();
  }

  #settle({ id, result, error }) {
    // An answer may have been under way when the client was closed: its caller knows already.
    if (!this.#waiting.has(id)) return undefined;
    const { resolve, reject } = this.#waiting.get(id);
    this.#waiting.delete(id);
    if (this.#waiting.size === 0) this.#worker.unref?.();
    if (!error) return resolve(result);
    const { code, message, ...details } = error;
    return reject(new KzError(code, message, details));
  }
}

/** An array as it can be sent alone: of a part the whole memory would be copied, and one that was
 *  handed over before, which is empty, would never arrive. */
function sendable(array) {
  if (!ArrayBuffer.isView(array)) return array;
  if (array.byteLength === 0) return new array.constructor(0);
  return array.byteLength < array.buffer.byteLength ? array.slice() : array;
}

/** What is sent of samples, the buffers that go along, and the options without that wish. */
function packed(samples, { transfer = false, ...options } = {}) {
  const handsOver = transfer && samples?.byteLength > 0;
  return handsOver
    ? { sent: samples, buffers: [samples.buffer], options }
    : { sent: sendable(samples), options };
}

/** An object of the worker's: `feed` may hand its samples over, the rest are plain calls. */
class Remote {
  constructor(calls, object) {
    this.calls = calls;
    this.object = object;
  }

  call(name, args = [], transfer = []) {
    return this.calls.make({ object: this.object, call: name, args }, transfer);
  }

  feed(samples, options) {
    const { sent, buffers } = packed(samples, options);
    return this.call("feed", [sent], buffers);
  }

  finish() {
    return this.call("finish");
  }

  free() {
    return this.call("free");
  }
}

class RemoteStream extends Remote {
  state() {
    return this.call("state");
  }

  result() {
    return this.call("result");
  }
}

class RemoteBuilder extends Remote {
  trail() {
    return this.call("trail");
  }
}

/** The calls of index.js, each of which gives a promise. */
class Client {
  #calls;

  constructor(calls, version) {
    this.#calls = calls;
    this.version = version;
  }

  fingerprint(samples, rate, options) {
    return this.#withSamples("fingerprint", samples, rate, options);
  }

  trail(samples, rate, options) {
    return this.#withSamples("trail", samples, rate, options);
  }

  readTrail(bytes) {
    return this.#calls.make({ call: "readTrail", args: [sendable(bytes)] });
  }

  align(first, second) {
    return this.#calls.make({ call: "align", args: [sendable(first), sendable(second)] });
  }

  async fingerprintStream(rate, options) {
    const object = await this.#calls.make({ call: "fingerprintStream", args: [rate, options] });
    return new RemoteStream(this.#calls, object);
  }

  async trailBuilder(rate, options) {
    const object = await this.#calls.make({ call: "trailBuilder", args: [rate, options] });
    return new RemoteBuilder(this.#calls, object);
  }

  close() {
    this.#calls.end(new KzError("closed", "the client was closed: create another one"));
  }

  #withSamples(call, samples, rate, given) {
    const { sent, buffers, options } = packed(samples, given);
    return this.#calls.make({ call, args: [sent, rate, options] }, buffers);
  }
}

/** Starts a worker and loads the module there. */
export async function createClient({ workerUrl, moduleUrl } = {}) {
  const url = workerUrl ?? new URL("./worker.js", import.meta.url);
  const calls = new Calls(await startWorker(url), url);
  try {
    const module = moduleUrl === undefined ? undefined : String(new URL(moduleUrl, baseUrl()));
    return new Client(calls, await calls.make({ call: "load", args: [{ module }] }));
  } catch (error) {
    calls.end(error);
    throw error;
  }
}

/** What a page takes addresses relative to; in Node, this file. */
function baseUrl() {
  return globalThis.document?.baseURI ?? globalThis.location?.href ?? import.meta.url;
}
