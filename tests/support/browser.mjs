// A headless Chromium for tests: started, driven over its debugging pipe and stopped, with nothing
// but what Node itself contains. serveFolder() gives it pages from a folder of this machine.
//
//   const server = await serveFolder("site", { headers: { "Cache-Control": "no-store" } });
//   const browser = await launch({ flags: microphoneFlags("clip.wav") });
//   const page = await browser.newPage();
//   await page.goto(`${server.url}/index.html`);
//   await page.waitFor(() => document.querySelector("h1"));
//   const title = await page.evaluate(() => document.title);
//   await page.close(); await browser.close(); await server.close();
//
// Every wait has a limit (30 s unless said otherwise) and throws an Error that says what was waited
// for. The programs looked for are chromium-headless-shell, chromium and google-chrome, or what
// KZ_CHROMIUM names; findBrowser() returns undefined where there is none, so a test can say so.

import { spawn } from "node:child_process";
import { accessSync, constants, createReadStream, mkdtempSync, rmSync, statSync } from "node:fs";
import { writeFile } from "node:fs/promises";
import { createServer } from "node:http";
import { tmpdir } from "node:os";
import { delimiter, extname, join, resolve, sep } from "node:path";

const DEFAULT_LIMIT = 30_000;

// ---------------------------------------------------------------------------------------------
// Finding and starting it

const PROGRAMS = ["chromium-headless-shell", "chromium", "chromium-browser", "google-chrome"];

/** The path of the browser's program, or undefined where there is none. */
export function findBrowser() {
  if (process.env.KZ_CHROMIUM) return process.env.KZ_CHROMIUM;
  for (const program of PROGRAMS) {
    for (const folder of (process.env.PATH ?? "").split(delimiter)) {
      const path = join(folder, program);
      try {
        accessSync(path, constants.X_OK);
        return path;
      } catch {
        // Not in this folder.
      }
    }
  }
  return undefined;
}

/**
 * Flags with which getUserMedia() gives what the WAV file contains.
 * @param {string} wavFile
 * @param {{ loop?: boolean }} options
 *   loop: the file begins again at its end; otherwise silence follows
 */
export function microphoneFlags(wavFile, { loop = false } = {}) {
  return [
    "--use-fake-device-for-media-stream",
    "--use-fake-ui-for-media-stream",
    `--use-file-for-fake-audio-capture=${resolve(wavFile)}${loop ? "" : "%noloop"}`,
  ];
}

/** Flags with which there is a microphone, and the user refuses it: NotAllowedError. */
export const REFUSED_MICROPHONE = [
  "--use-fake-device-for-media-stream",
  "--use-fake-ui-for-media-stream=deny",
];

/** Flags with which there is no microphone: NotFoundError. */
export const NO_MICROPHONE = ["--use-fake-ui-for-media-stream"];

function programArguments(folder, flags) {
  return [
    "--headless",
    "--remote-debugging-pipe",
    `--user-data-dir=${folder}`,
    "--no-sandbox",  // the tests' containers run as root, where the sandbox refuses to start
    "--no-first-run",
    "--no-default-browser-check",
    "--disable-gpu",
    "--disable-dev-shm-usage",
    "--disable-background-networking",
    "--disable-component-update",
    "--disable-sync",
    "--autoplay-policy=no-user-gesture-required",
    ...flags,
    "about:blank",
  ];
}

/**
 * Starts a browser with a profile of its own, which close() removes.
 * @param {{ flags?: string[], executable?: string, limit?: number }} options
 *   limit: milliseconds that each answer of the browser may take
 */
export async function launch({ flags = [], executable = findBrowser(), limit } = {}) {
  if (!executable) {
    throw new Error(`there is no browser: install chromium-headless-shell, or set KZ_CHROMIUM`);
  }
  const folder = mkdtempSync(join(tmpdir(), "kz-browser-"));
  const child = spawn(executable, programArguments(folder, flags), {
    stdio: ["ignore", "ignore", "pipe", "pipe", "pipe"],
  });
  const browser = new Browser(child, folder, limit ?? DEFAULT_LIMIT);
  try {
    await browser.connection.send("Browser.getVersion");
  } catch (error) {
    await browser.close();
    throw new Error(`${executable} did not start: ${error.message}\n${browser.log}`);
  }
  return browser;
}

// ---------------------------------------------------------------------------------------------
// The pipe

/** Commands and events of the debugging protocol, each a JSON text that ends with a zero byte. */
class Connection {
  constructor(output, input, limit) {
    this.output = output;
    this.limit = limit;
    this.nextId = 1;
    this.pending = new Map();
    this.listeners = new Map();
    let rest = [];
    input.on("data", (chunk) => {
      let begin = 0;
      for (let end = chunk.indexOf(0); end >= 0; end = chunk.indexOf(0, begin)) {
        rest.push(chunk.subarray(begin, end));
        this.receive(Buffer.concat(rest).toString("utf8"));
        rest = [];
        begin = end + 1;
      }
      if (begin < chunk.length) rest.push(chunk.subarray(begin));
    });
    input.on("error", () => {});
    output.on("error", () => {});
  }

  receive(text) {
    const message = JSON.parse(text);
    if (message.id === undefined) {
      for (const listener of this.listeners.get(message.sessionId ?? "") ?? []) {
        listener(message.method, message.params);
      }
      return;
    }
    const waiting = this.pending.get(message.id);
    if (!waiting) return;
    this.pending.delete(message.id);
    clearTimeout(waiting.timer);
    if (message.error) waiting.reject(new Error(`${waiting.method}: ${message.error.message}`));
    else waiting.resolve(message.result);
  }

  send(method, params = {}, sessionId = undefined, limit = this.limit) {
    if (this.gone) return Promise.reject(new Error(`${method}: ${this.gone}`));
    return new Promise((resolvePromise, reject) => {
      const id = this.nextId++;
      const timer = setTimeout(() => {
        this.pending.delete(id);
        reject(new Error(`${method}: no answer within ${limit} ms`));
      }, limit);
      this.pending.set(id, { method, resolve: resolvePromise, reject, timer });
      this.output.write(`${JSON.stringify({ id, method, params, sessionId })}\0`);
    });
  }

  listen(sessionId, listener) {
    this.listeners.set(sessionId, [...(this.listeners.get(sessionId) ?? []), listener]);
  }

  end(reason) {
    this.gone = reason;
    for (const { method, reject, timer } of this.pending.values()) {
      clearTimeout(timer);
      reject(new Error(`${method}: ${reason}`));
    }
    this.pending.clear();
  }
}

// ---------------------------------------------------------------------------------------------
// The browser

class Browser {
  constructor(child, folder, limit) {
    this.child = child;
    this.folder = folder;
    this.log = "";
    this.limit = limit;
    this.connection = new Connection(child.stdio[3], child.stdio[4], limit);
    child.stderr.on("data", (data) => (this.log += data));
    this.ended = new Promise((resolvePromise) => {
      child.on("error", (error) => {
        this.connection.end(error.message);
        resolvePromise();
      });
      child.on("exit", (code, signal) => {
        this.connection.end(`the browser ended (${signal ?? code})`);
        resolvePromise();
      });
    });
  }

  /** A page in a context of its own: no cookie, storage or permission is shared with others. */
  async newPage() {
    const { browserContextId } = await this.connection.send("Target.createBrowserContext");
    const { targetId } = await this.connection.send("Target.createTarget", {
      url: "about:blank",
      browserContextId,
    });
    const { sessionId } = await this.connection.send("Target.attachToTarget", {
      targetId,
      flatten: true,
    });
    const page = new Page(this, { browserContextId, targetId, sessionId });
    await page.begin();
    return page;
  }

  async close() {
    if (this.child.exitCode === null && this.child.signalCode === null && !this.connection.gone) {
      this.connection.send("Browser.close").catch(() => {});
      const timer = setTimeout(() => this.child.kill("SIGKILL"), 5000);
      await this.ended;
      clearTimeout(timer);
    }
    rmSync(this.folder, { recursive: true, force: true, maxRetries: 10, retryDelay: 100 });
  }
}

// ---------------------------------------------------------------------------------------------
// A page

const KEYS = {
  Enter: { keyCode: 13, text: "\r" },
  Tab: { keyCode: 9 },
  Escape: { keyCode: 27 },
  Backspace: { keyCode: 8 },
  Delete: { keyCode: 46 },
  Space: { key: " ", keyCode: 32, text: " " },
  ArrowLeft: { keyCode: 37 },
  ArrowUp: { keyCode: 38 },
  ArrowRight: { keyCode: 39 },
  ArrowDown: { keyCode: 40 },
  Home: { keyCode: 36 },
  End: { keyCode: 35 },
  PageUp: { keyCode: 33 },
  PageDown: { keyCode: 34 },
};
const MODIFIERS = { Alt: 1, Control: 2, Meta: 4, Shift: 8 };

function keyEvent(name) {
  const parts = name.split("+");
  const last = name.endsWith("+") ? "+" : parts.pop();
  const modifiers = parts.reduce((sum, part) => sum | (MODIFIERS[part] ?? 0), 0);
  const known = KEYS[last];
  if (known) {
    const key = known.key ?? last;
    const event = { key, code: last, windowsVirtualKeyCode: known.keyCode, modifiers };
    return known.text ? { ...event, text: known.text } : event;
  }
  if ([...last].length !== 1) throw new Error(`there is no key "${name}"`);
  const keyCode = last.toUpperCase().charCodeAt(0);
  return { key: last, windowsVirtualKeyCode: keyCode, modifiers, text: modifiers & 7 ? "" : last };
}

function describeArgument(argument) {
  if (argument.value !== undefined) {
    return typeof argument.value === "string" ? argument.value : JSON.stringify(argument.value);
  }
  return argument.description ?? argument.unserializableValue ?? argument.type;
}

function describeException({ exception, text, url, lineNumber }) {
  const where = url ? ` (${url}:${lineNumber + 1})` : "";
  return `${exception?.description ?? exception?.value ?? text}${where}`;
}

/** What evaluate() and waitFor() run: an expression, or a function with arguments sent as JSON. */
function expressionOf(code, parameters) {
  if (typeof code !== "function") return code;
  return `(${code})(${parameters.map((value) => JSON.stringify(value) ?? "undefined").join(",")})`;
}

class Page {
  constructor(browser, ids) {
    this.browser = browser;
    this.ids = ids;
    /** What the page wrote to its console: { type, text }. */
    this.messages = [];
    /** What was not caught, and what the browser itself reports as errors, such as a refused
     *  resource or a breach of the Content-Security-Policy: texts. */
    this.errors = [];
    /** Every request: { url, method, body }. */
    this.requests = [];
    this.loads = 0;
    browser.connection.listen(ids.sessionId, (method, params) => this.receive(method, params));
  }

  /** A command of the debugging protocol, for what has no method here. */
  send(method, params = {}, limit = this.browser.limit) {
    return this.browser.connection.send(method, params, this.ids.sessionId, limit);
  }

  async begin() {
    const domains = ["Page", "Runtime", "Log", "Network"];
    await Promise.all(domains.map((domain) => this.send(`${domain}.enable`)));
  }

  receive(method, params) {
    if (method === "Runtime.consoleAPICalled") {
      this.messages.push({ type: params.type, text: params.args.map(describeArgument).join(" ") });
    } else if (method === "Runtime.exceptionThrown") {
      this.errors.push(describeException(params.exceptionDetails));
    } else if (method === "Log.entryAdded" && params.entry.level === "error") {
      const { text, url } = params.entry;
      this.errors.push(url ? `${text} (${url})` : text);
    } else if (method === "Page.loadEventFired") {
      this.loads += 1;
    } else if (method === "Network.requestWillBeSent") {
      const { url, method: verb, postData } = params.request;
      this.requests.push({ url, method: verb, body: postData });
    }
  }

  /** Opens an address and returns once the page's load event came. */
  async goto(url, limit = this.browser.limit) {
    const before = this.loads;
    const { errorText } = await this.send("Page.navigate", { url }, limit);
    if (errorText) throw new Error(`${url}: ${errorText}`);
    await this.until(() => this.loads > before, `${url} to load`, limit);
  }

  async reload(limit = this.browser.limit) {
    const before = this.loads;
    await this.send("Page.reload", {}, limit);
    await this.until(() => this.loads > before, "the page to load again", limit);
  }

  /** Runs an expression, or a function with arguments that JSON can carry, in the page; returns
   *  its value, or what its promise gives. Throws what it throws. */
  async evaluate(code, ...parameters) {
    return this.evaluateWithin(this.browser.limit, code, ...parameters);
  }

  /** The same with a limit of its own, in milliseconds. */
  async evaluateWithin(limit, code, ...parameters) {
    const answer = await this.send(
      "Runtime.evaluate",
      {
        expression: expressionOf(code, parameters),
        awaitPromise: true,
        returnByValue: true,
        userGesture: true,
      },
      limit,
    );
    if (answer.exceptionDetails) throw new Error(describeException(answer.exceptionDetails));
    return answer.result.value;
  }

  /** Waits until the expression or function gives something true, and returns it. */
  async waitFor(code, { limit = this.browser.limit, args = [] } = {}) {
    let value;
    const ask = async () => {
      try {
        value = await this.evaluateWithin(limit, code, ...args);
      } catch (error) {
        // A page that is being replaced has no place to run anything for a moment.
        if (!/context|navigat/i.test(error.message)) throw error;
        value = undefined;
      }
      return value;
    };
    await this.until(ask, String(code), limit);
    return value;
  }

  async until(condition, what, limit) {
    const end = Date.now() + limit;
    while (!(await condition())) {
      if (Date.now() > end) {
        const errors = this.errors.length ? `; errors: ${this.errors.join("; ")}` : "";
        throw new Error(`waited ${limit} ms in vain for ${what}${errors}`);
      }
      await new Promise((resolvePromise) => setTimeout(resolvePromise, 25));
    }
  }

  /** Presses a key by its name ("Tab", "Enter", "Space", "a"), with "Shift+" or others before it
   *  if wanted. */
  async press(name) {
    const event = keyEvent(name);
    const down = { type: event.text ? "keyDown" : "rawKeyDown", ...event };
    await this.send("Input.dispatchKeyEvent", down);
    await this.send("Input.dispatchKeyEvent", { type: "keyUp", ...event, text: undefined });
  }

  /** Types text into what has the focus. */
  async type(text) {
    for (const character of text) await this.press(character === " " ? "Space" : character);
  }

  /** Clicks the middle of the first element that the selector finds, scrolled into view. */
  async click(selector) {
    const point = await this.evaluate((wanted) => {
      const element = document.querySelector(wanted);
      if (!element) return null;
      element.scrollIntoView({ block: "center", inline: "center", behavior: "instant" });
      const box = element.getBoundingClientRect();
      return { x: box.x + box.width / 2, y: box.y + box.height / 2 };
    }, selector);
    if (!point) throw new Error(`there is no element ${selector} to click`);
    const button = { ...point, button: "left", clickCount: 1 };
    await this.send("Input.dispatchMouseEvent", { type: "mouseMoved", ...point });
    await this.send("Input.dispatchMouseEvent", { type: "mousePressed", ...button });
    await this.send("Input.dispatchMouseEvent", { type: "mouseReleased", ...button });
  }

  /** Puts files into an <input type="file">, as its user would. */
  async setFiles(selector, files) {
    const { root } = await this.send("DOM.getDocument");
    const { nodeId } = await this.send("DOM.querySelector", { nodeId: root.nodeId, selector });
    if (!nodeId) throw new Error(`there is no element ${selector} for files`);
    await this.send("DOM.setFileInputFiles", { nodeId, files: files.map((file) => resolve(file)) });
  }

  /**
   * What the page is told about its screen and its user. What is left out stays as it was.
   * @param {{ width?: number, height?: number, scale?: number, mobile?: boolean,
   *           colorScheme?: "dark"|"light", reducedMotion?: boolean,
   *           forcedColors?: boolean, features?: object }} screen
   */
  async emulate(screen) {
    this.screen = { width: 1280, height: 800, scale: 1, mobile: false, ...this.screen, ...screen };
    const { width, height, scale, mobile } = this.screen;
    await this.send("Emulation.setDeviceMetricsOverride", {
      width,
      height,
      deviceScaleFactor: scale,
      mobile,
    });
    const features = Object.entries(this.screen.features ?? {});
    if (this.screen.colorScheme) features.push(["prefers-color-scheme", this.screen.colorScheme]);
    if (this.screen.reducedMotion) features.push(["prefers-reduced-motion", "reduce"]);
    if (this.screen.forcedColors) features.push(["forced-colors", "active"]);
    await this.send("Emulation.setEmulatedMedia", {
      features: features.map(([name, value]) => ({ name, value })),
    });
  }

  /** Sets a permission ("microphone", "clipboard-read", ...) to "granted", "denied" or "prompt",
   *  for all sites of this page's context. */
  async setPermission(name, setting) {
    await this.browser.connection.send("Browser.setPermission", {
      permission: { name },
      setting,
      browserContextId: this.ids.browserContextId,
    });
  }

  /** Whether the network is away for this page. */
  async setOffline(offline) {
    const conditions = { offline, latency: 0, downloadThroughput: -1, uploadThroughput: -1 };
    await this.send("Network.emulateNetworkConditions", conditions);
  }

  /** Lets evaluate() add scripts that the page's policy would refuse, such as a checker's. */
  async bypassPolicy() {
    await this.send("Page.setBypassCSP", { enabled: true });
  }

  /** What a screen reader is told: [{ role, name, ... }] of all nodes that are not ignored. */
  async accessibilityTree() {
    const { nodes } = await this.send("Accessibility.getFullAXTree");
    return nodes
      .filter((node) => !node.ignored)
      .map((node) => ({
        role: node.role?.value,
        name: node.name?.value ?? "",
        value: node.value?.value,
        ...Object.fromEntries((node.properties ?? []).map((each) => [each.name, each.value.value])),
      }));
  }

  /** A PNG of what is seen, or of the whole page, written to a file if one is named. */
  async screenshot(file, { fullPage = false } = {}) {
    const options = { format: "png", captureBeyondViewport: fullPage };
    if (fullPage) {
      const { cssContentSize } = await this.send("Page.getLayoutMetrics");
      options.clip = { ...cssContentSize, x: 0, y: 0, scale: 1 };
    }
    const { data } = await this.send("Page.captureScreenshot", options);
    const bytes = Buffer.from(data, "base64");
    if (file) await writeFile(file, bytes);
    return bytes;
  }

  async close() {
    const { targetId, browserContextId } = this.ids;
    await this.browser.connection.send("Target.closeTarget", { targetId });
    await this.browser.connection.send("Target.disposeBrowserContext", { browserContextId });
  }
}

// ---------------------------------------------------------------------------------------------
// Pages to open

const TYPES = {
  ".css": "text/css; charset=utf-8",
  ".html": "text/html; charset=utf-8",
  ".js": "text/javascript; charset=utf-8",
  ".json": "application/json",
  ".mjs": "text/javascript; charset=utf-8",
  ".png": "image/png",
  ".svg": "image/svg+xml",
  ".wasm": "application/wasm",
  ".wav": "audio/wav",
};

function openFile(folder, path) {
  const file = resolve(folder, `.${path.endsWith("/") ? `${path}index.html` : path}`);
  if (file !== folder && !file.startsWith(folder + sep)) return undefined;
  try {
    return statSync(file).isFile() ? file : undefined;
  } catch {
    return undefined;
  }
}

/**
 * Serves a folder at a free port of 127.0.0.1.
 * @param {string} folder
 * @param {{ headers?: object, routes?: object }} options
 *   headers: sent with every answer
 *   routes: for paths that are no files: { "/v1/match": (request, response, body) => ... } or
 *   { "/other/": "folder" } for a further folder below that path
 * @returns {Promise<{ url: string, port: number, paths: string[], close: () => Promise<void> }>}
 *   paths: what was asked for so far
 */
export async function serveFolder(folder, { headers = {}, routes = {} } = {}) {
  const paths = [];
  const server = createServer(async (request, response) => {
    const path = decodeURIComponent(new URL(request.url, "http://localhost").pathname);
    paths.push(path);
    for (const [name, value] of Object.entries(headers)) response.setHeader(name, value);
    if (typeof routes[path] === "function") {
      const chunks = [];
      for await (const chunk of request) chunks.push(chunk);
      await routes[path](request, response, Buffer.concat(chunks));
      return;
    }
    const prefix = Object.keys(routes).find(
      (each) => typeof routes[each] === "string" && path.startsWith(each),
    );
    const file = prefix
      ? openFile(resolve(routes[prefix]), `/${path.slice(prefix.length)}`)
      : openFile(resolve(folder), path);
    if (!file) {
      response.writeHead(404, { "Content-Type": "text/plain" }).end("not found\n");
      return;
    }
    response.setHeader("Content-Type", TYPES[extname(file)] ?? "application/octet-stream");
    createReadStream(file).pipe(response);
  });
  await new Promise((resolvePromise) => server.listen(0, "127.0.0.1", resolvePromise));
  const { port } = server.address();
  const close = () =>
    new Promise((resolvePromise) => {
      server.closeAllConnections?.();
      server.close(resolvePromise);
    });
  return { url: `http://127.0.0.1:${port}`, port, paths, close };
}
