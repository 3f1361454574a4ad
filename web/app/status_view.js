// What the page says at the moment: the line that screen readers follow, the meter, and problems.

import { byId, make } from "./dom.js";

export class StatusView {
  #line = byId("status");
  #detail = byId("detail");
  #meter = byId("meter");
  #problem = byId("problem");
  #notice = byId("notice");
  #ending;

  /** Says something to everybody; it is read out. */
  say(text) {
    this.#line.textContent = text;
  }

  /**
   * Shows something that changes too often to be read out.
   *
   * @param {string} text
   * @param {number} [seconds]  after which it is taken away, if nothing else has replaced it
   */
  detail(text, seconds) {
    clearTimeout(this.#ending);
    this.#detail.textContent = text;
    if (seconds !== undefined) {
      this.#ending = setTimeout(() => this.detail(""), 1000 * seconds);
    }
  }

  /**
   * Shows how loud it is.
   *
   * @param {number|null} level  0 to 1; null takes the meter away.
   */
  level(level) {
    this.#meter.hidden = level === null;
    const percent = String(Math.round(100 * (level ?? 0)));
    this.#meter.setAttribute("aria-valuenow", percent);
    this.#meter.firstElementChild.style.width = `${percent}%`;
  }

  /**
   * Shows a problem; it is read out at once.
   *
   * @param {import("./problems.js").Problem} problem
   * @param {(() => void)|null} tryAgain  Asks once more with what there is; null offers nothing.
   */
  problem(problem, tryAgain) {
    const parts = [
      make("h2", { text: problem.title }),
      make("p", { text: problem.advice }),
    ];
    if (tryAgain) {
      const button = make("button", { type: "button", class: "plain", text: "Try again" });
      button.addEventListener("click", tryAgain);
      parts.push(button);
    }
    this.#problem.replaceChildren(...parts);
    this.#problem.hidden = false;
  }

  /** Shows what has to be known beside all else; it is read out. "" takes it away. */
  notice(text) {
    this.#notice.textContent = text;
    this.#notice.hidden = text === "";
  }

  clearProblem() {
    this.#problem.hidden = true;
    this.#problem.replaceChildren();
  }
}
