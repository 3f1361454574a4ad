// The field for the server's token, shown only when the server wants one.

import { byId } from "./dom.js";

export class TokenView {
  #form = byId("token-form");
  #field = byId("token");
  #onEntered = null;

  /** @param {import("./keeping.js").Token} token */
  constructor(token) {
    this.#form.addEventListener("submit", (event) => {
      event.preventDefault();
      const value = this.#field.value.trim();
      if (!value) {
        return;
      }
      token.value = value;
      this.#field.value = "";
      this.#form.hidden = true;
      this.#onEntered?.();
    });
  }

  /**
   * Asks for a token.
   *
   * @param {() => void} onEntered  Called once there is one.
   */
  ask(onEntered) {
    this.#onEntered = onEntered;
    this.#form.hidden = false;
    this.#field.focus();
  }

  hide() {
    this.#form.hidden = true;
    this.#onEntered = null;
  }
}
