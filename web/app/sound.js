// What the microphone has heard so far, and the waiting for more of it.

/** Raised when a microphone that was opened gives nothing. */
export class SilentDevice extends Error {
  constructor() {
    super("The microphone was opened and gives no sound.");
    this.name = "SilentDevice";
  }
}

/** Mono samples that arrive in pieces. */
export class HeardSound {
  #pieces = [];
  #count = 0;
  #rate;
  #waiting = null;

  /** @param {number} rate  Samples a second. */
  constructor(rate) {
    this.#rate = rate;
  }

  get rate() {
    return this.#rate;
  }

  /** Seconds heard so far. */
  get seconds() {
    return this.#count / this.#rate;
  }

  /**
   * Takes the next piece.
   *
   * @param {Float32Array} samples  Kept: the caller must not change them afterwards.
   */
  add(samples) {
    this.#pieces.push(samples);
    this.#count += samples.length;
    if (this.#waiting && this.seconds >= this.#waiting.seconds) {
      this.#settle("resolve");
    } else {
      this.#waiting?.alive();
    }
  }

  /**
   * The samples heard last, in an array of their own.
   *
   * @param {number} seconds  At most so many.
   */
  last(seconds) {
    const samples = new Float32Array(Math.min(this.#count, Math.round(seconds * this.#rate)));
    let end = samples.length;
    for (let i = this.#pieces.length - 1; end > 0; --i) {
      const part = this.#pieces[i].subarray(-end);
      end -= part.length;
      samples.set(part, end);
    }
    return samples;
  }

  /**
   * Waits until there are so many seconds. One caller at a time.
   *
   * @param {number} seconds
   * @param {AbortSignal} signal      Ends the wait with its reason.
   * @param {number} patience         Milliseconds without any sample after which it is an error.
   */
  async until(seconds, signal, patience) {
    signal.throwIfAborted();
    if (this.seconds >= seconds) {
      return;
    }
    const abort = () => this.#settle("reject", signal.reason);
    signal.addEventListener("abort", abort);
    try {
      await new Promise((resolve, reject) => {
        this.#waiting = { seconds, resolve, reject, alive: () => this.#restart(patience) };
        this.#restart(patience);
      });
    } finally {
      signal.removeEventListener("abort", abort);
    }
  }

  #restart(patience) {
    clearTimeout(this.#waiting.timer);
    this.#waiting.timer = setTimeout(() => this.#settle("reject", new SilentDevice()), patience);
  }

  #settle(how, value) {
    const waiting = this.#waiting;
    this.#waiting = null;
    clearTimeout(waiting?.timer);
    waiting?.[how](value);
  }
}
