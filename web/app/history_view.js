// What was recognised before, in this browser.

import { nameOf } from "./answers.js";
import { byId, make } from "./dom.js";
import { clockText } from "./times.js";

const WHEN = new Intl.DateTimeFormat(undefined, { dateStyle: "medium", timeStyle: "short" });

export class HistoryView {
  #history;

  /**
   * @param {import("./keeping.js").History} history
   * @param {(text: string) => void} say
   */
  constructor(history, say) {
    this.#history = history;
    byId("clear-history").addEventListener("click", () => {
      history.clear();
      this.show();
      say("The history was cleared.");
      // The button that had the focus has gone.
      byId("history-heading").focus();
    });
    this.show();
  }

  show() {
    const { entries, lasting } = this.#history;
    byId("history-list").replaceChildren(...entries.map(item));
    byId("history-list").hidden = entries.length === 0;
    byId("clear-history").hidden = entries.length === 0;
    byId("history-empty").hidden = entries.length > 0;
    byId("history-lost").hidden = lasting;
  }
}

function item(entry) {
  const datetime = new Date(entry.when).toISOString();
  const time = make("time", { datetime, text: WHEN.format(entry.when) });
  const names = make("span", { class: "strong", text: nameOf(entry) });
  const rest = [
    ...(entry.artist ? [entry.artist] : []),
    `at ${clockText(entry.place)}`,
    ...(entry.from ? [`in “${entry.from}”`] : []),
  ].join(", ");
  return make("li", {}, names, make("span", { text: rest }), make("span", { class: "soft" }, time));
}
