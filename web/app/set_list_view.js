// The set-list of a long recording as a table, to be copied or saved.

import { changesOf, nameOf, placeOf } from "./answers.js";
import { byId, copy, make, save } from "./dom.js";
import { toCsv, toText } from "./set_list.js";
import { clockText } from "./times.js";

/** Without it spreadsheets take a file for one in the code page of the system. */
const BYTE_ORDER_MARK = "\ufeff";

export class SetListView {
  #section = byId("set-list");
  #entries = [];
  #name = "";

  /** @param {(text: string) => void} say  Tells the person what was done. */
  constructor(say) {
    const onCopy = (textOf, what) => async () => {
      const text = textOf(this.#entries);
      if (await copy(text)) {
        say(`The set-list was copied as ${what}.`);
      } else {
        this.#offerByHand(text);
        say("This browser does not let the page copy. The text is selected: copy it yourself.");
      }
    };
    byId("copy-text").addEventListener("click", onCopy(toText, "text"));
    byId("copy-csv").addEventListener("click", onCopy(toCsv, "CSV"));
    byId("save-csv").addEventListener("click", () => {
      save(BYTE_ORDER_MARK + toCsv(this.#entries), `${this.#name}.csv`, "text/csv;charset=utf-8");
    });
  }

  hide() {
    this.#section.hidden = true;
    byId("by-hand").hidden = true;
  }

  /**
   * @param {import("./set_list.js").Entry[]} entries
   * @param {string} name  of the recording
   */
  show(entries, name) {
    this.#entries = entries;
    this.#name = name.replace(/\.[^.]+$/, "");
    byId("by-hand").hidden = true;
    byId("set-list-name").textContent = name;
    byId("set-list-rows").replaceChildren(...entries.map(row));
    this.#section.hidden = false;
  }

  #offerByHand(text) {
    const area = byId("by-hand-text");
    byId("by-hand").hidden = false;
    area.value = text;
    area.focus();
    area.select();
  }
}

function row({ begin, end, match }) {
  const time = make("th", { scope: "row", text: `${clockText(begin)} – ${clockText(end)}` });
  if (!match) {
    const cell = make("td", { colspan: "3", class: "soft", text: "not recognised" });
    return make("tr", {}, time, cell);
  }
  const place = clockText(placeOf(match));
  const sure = [match.sure, changesOf(match)].filter(Boolean).join(", ");
  const track = make("td", {}, make("span", { class: "strong", text: nameOf(match) }));
  if (match.artist) {
    track.append(make("span", { class: "below", text: match.artist }));
  }
  // A narrow screen has no room for the columns of these two, and shows them here instead.
  track.append(make("span", { class: "below narrow soft", text: `from ${place}, ${sure}` }));
  return make(
    "tr",
    {},
    time,
    track,
    make("td", { class: "wide number", text: place }),
    make("td", { class: "wide", text: sure }),
  );
}
