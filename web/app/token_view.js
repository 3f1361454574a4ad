// The field for the server's token, shown only when the server wants one.

import { byId } from "./dom.js";
import { isToken } from "./keeping.js";

const NO_TOKEN =
  "This cannot be a token: it has a space, or a character that is not plain ASCII, perhaps an " +
  "invisible one. Copy the token once more, without what is around it.";

export class TokenView {
  #form = byId("token-form");
  #field = byId("token");
  #onEntered = null;

  /** @param {import("./keeping.js").Token} token */
  constructor(token) {
    this.#form.addEventListener("submit", (event) => {
      event.preventDefault();
      const value = this.#field.value.trim();
      this.#refuse(isToken(value) ? "" : NO_TOKEN);
      if (!isToken(value)) {
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
    this.#refuse("");
  }

  /** Says why what was entered is not taken; "" takes that back. */
  #refuse(text) {
    const refusal = byId("token-refused");
    refusal.textContent = text;
    refusal.hidden = text === "";
    this.#field.setAttribute("aria-invalid", String(text !== ""));
  }
}
