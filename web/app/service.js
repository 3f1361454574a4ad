// The service that the page came from: what it takes, what a trail is from, the trail of a track.

/** Raised when the service cannot be reached, or what answers is not the service. */
export class ServiceAway extends Error {
  constructor(message, options) {
    super(message, options);
    this.name = "ServiceAway";
  }
}

/** Raised when the service says no: its own code and sentence, and when to come back. */
export class ServiceRefused extends Error {
  /**
   * @param {number} status      of HTTP
   * @param {string} code        the service's, such as "queue_full"
   * @param {string} message     its sentence
   * @param {number} retryAfter  seconds; 0 when it names none
   */
  constructor(status, code, message, retryAfter) {
    super(message);
    this.name = "ServiceRefused";
    this.status = status;
    this.code = code;
    this.retryAfter = retryAfter;
  }
}

/** An answer has to come within this many milliseconds. */
const LONGEST_ANSWER = 60_000;

/** Times that a busy service is asked again, and the longest wait it may ask for, in seconds. */
const MOST_RETRIES = 4;
const LONGEST_WAIT = 10;

export class Service {
  #base;
  #token;

  /**
   * @param {URL|string} base  Where the service is; the page's own folder.
   * @param {{value: string|null}} token  Read with each request.
   */
  constructor(base, token) {
    this.#base = base;
    this.#token = token;
  }

  /**
   * What the service takes.
   *
   * @param {AbortSignal} [signal]
   * @returns {Promise<{version: string, token: boolean, max_body: number}>}
   */
  options(signal) {
    return this.#json("v1/options", { signal });
  }

  /**
   * How it is; the number of tracks comes only to those with the token.
   *
   * @param {AbortSignal} [signal]
   * @returns {Promise<{status: string, tracks?: number}>}
   */
  health(signal) {
    return this.#json("v1/health", { signal });
  }

  /**
   * Asks what a trail is from. A service that is busy is asked again after the time it names.
   *
   * @param {Uint8Array} trail
   * @param {object} [options]
   * @param {boolean} [options.passages]  The trail may hold several tracks one after another.
   * @param {AbortSignal} [options.signal]
   * @param {(seconds: number) => void} [options.onBusy]  Called before each wait.
   * @returns {Promise<object>} the answer with `verdict` and `matches`
   */
  async match(trail, { passages = false, signal, onBusy } = {}) {
    const path = passages ? "v1/match?passages=1" : "v1/match";
    const request = {
      method: "POST",
      headers: { "Content-Type": "application/x-kzt" },
      body: trail,
      signal,
    };
    for (let retry = 0; ; ++retry) {
      try {
        return await this.#json(path, request);
      } catch (error) {
        const wait = waitOf(error);
        if (wait === undefined || retry === MOST_RETRIES) {
          throw error;
        }
        onBusy?.(wait);
        await pause(wait, signal);
      }
    }
  }

  /**
   * The trail of a track.
   *
   * @param {number} track  its number
   * @param {AbortSignal} [signal]
   * @returns {Promise<Uint8Array>} the bytes of a trail file
   */
  async trail(track, signal) {
    const response = await this.#ask(`v1/tracks/${Number(track)}/trail`, { signal });
    return new Uint8Array(await whole(response.arrayBuffer(), signal));
  }

  async #json(path, request) {
    const response = await this.#ask(path, request);
    const text = await whole(response.text(), request.signal);
    try {
      return JSON.parse(text);
    } catch (cause) {
      throw new ServiceAway("What answered is not the recognition service.", { cause });
    }
  }

  async #ask(path, { headers = {}, signal, ...request }) {
    const limit = AbortSignal.timeout(LONGEST_ANSWER);
    const response = await whole(
      fetch(new URL(path, this.#base), {
        ...request,
        headers: headersWith(headers, this.#token.value),
        signal: signal ? anyOf(signal, limit) : limit,
        cache: "no-store",
        credentials: "same-origin",
        redirect: "error",
      }),
      signal,
    );
    if (!response.ok) {
      throw await refusalOf(response);
    }
    return response;
  }
}

/** A token that no header can carry is not the server's; it is told as one that was refused. */
function headersWith(headers, token) {
  if (!token) {
    return headers;
  }
  try {
    return new Headers({ ...headers, Authorization: `Bearer ${token}` });
  } catch {
    throw new ServiceRefused(401, "bad_token", "The token has characters that no token has.", 0);
  }
}

/**
 * A signal that ends with the first of several: AbortSignal.any() is younger than the browsers that
 * can run the rest of the page.
 *
 * @param {...AbortSignal} signals
 * @returns {AbortSignal}
 */
export function anyOf(...signals) {
  if (AbortSignal.any) {
    return AbortSignal.any(signals);
  }
  const controller = new AbortController();
  for (const signal of signals) {
    if (signal.aborted) {
      controller.abort(signal.reason);
    }
    signal.addEventListener("abort", () => controller.abort(signal.reason), { once: true });
  }
  return controller.signal;
}

/** What fetch() reports of a network that failed says nothing to a reader; a stop stays a stop. */
async function whole(promise, signal) {
  try {
    return await promise;
  } catch (cause) {
    signal?.throwIfAborted();
    throw new ServiceAway("The recognition service does not answer.", { cause });
  }
}

/** The service's own words, or the status alone when something else answered. */
async function refusalOf(response) {
  const retryAfter = Number.parseFloat(response.headers.get("Retry-After") ?? "0") || 0;
  let error = {};
  try {
    error = (await response.json()).error ?? {};
  } catch {
    // A server in between answers with a page of its own.
  }
  const message =
    typeof error.message === "string"
      ? error.message
      : `The server answered with status ${response.status}.`;
  return new ServiceRefused(response.status, String(error.code ?? ""), message, retryAfter);
}

/** Seconds to wait before asking again; undefined for errors that waiting does not cure. */
function waitOf(error) {
  if (!(error instanceof ServiceRefused) || ![429, 503].includes(error.status)) {
    return undefined;
  }
  if (error.retryAfter > LONGEST_WAIT || error.code === "draining") {
    return undefined;
  }
  return Math.max(error.retryAfter, 0.5);
}

function pause(seconds, signal) {
  return new Promise((resolve, reject) => {
    signal?.throwIfAborted();
    const stop = () => {
      clearTimeout(timer);
      reject(signal.reason);
    };
    const timer = setTimeout(() => {
      signal?.removeEventListener("abort", stop);
      resolve();
    }, seconds * 1000);
    signal?.addEventListener("abort", stop, { once: true });
  });
}
