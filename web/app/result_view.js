// The track that was recognised, and the drawing that shows why.

import { changesOf, nameAndArtist, nameOf, placeOf, sureText } from "./answers.js";
import { drawStrips, drawingText } from "./drawing.js";
import { byId, make } from "./dom.js";
import { clockText } from "./times.js";

export class ResultView {
  #section = byId("result");
  #facts = byId("result-facts");
  #figure = byId("drawing");
  #strips = {
    track: byId("strip-track"),
    clip: byId("strip-clip"),
    different: byId("strip-different"),
  };
  #laid = null;

  constructor() {
    const redraw = () => this.#laid && drawStrips(this.#strips, this.#laid);
    for (const query of ["(prefers-color-scheme: dark)", "(forced-colors: active)"]) {
      matchMedia(query).addEventListener("change", redraw);
    }
  }

  hide() {
    this.#section.hidden = true;
    this.#figure.hidden = true;
    this.#laid = null;
  }

  /**
   * Shows an answer's best match, and by name the others.
   *
   * @param {object[]} matches  At least one.
   */
  show(matches) {
    const [best, ...others] = matches;
    byId("result-title").textContent = nameOf(best);
    byId("result-artist").textContent = best.artist ?? "";
    byId("result-artist").hidden = !best.artist;
    this.#facts.replaceChildren(...facts(best).flatMap(([name, value]) => fact(name, value)));
    const also = byId("result-others");
    also.hidden = others.length === 0;
    also.textContent = othersText(others);
    this.#figure.hidden = true;
    this.#section.hidden = false;
  }

  /**
   * Shows the trails.
   *
   * @param {import("./codes.js").Laid} laid  With at least one code.
   */
  draw(laid) {
    this.#laid = laid;
    this.#figure.hidden = false;
    const text = drawingText(laid);
    byId("drawing-text").textContent = text;
    byId("strips").setAttribute("aria-label", `The trails of the track and of the clip. ${text}`);
    drawStrips(this.#strips, laid);
  }
}

function facts(match) {
  const changes = changesOf(match);
  return [
    ["Place in the track", clockText(placeOf(match))],
    ["How sure", sureText(match)],
    ...(changes ? [["Played", changes]] : []),
    ...(match.title && match.source ? [["File", match.source]] : []),
  ];
}

function fact(name, value) {
  return [make("div", {}, make("dt", { text: name }), make("dd", { text: value }))];
}

function othersText(others) {
  const names = others.map((match) => `${nameAndArtist(match)} (${clockText(placeOf(match))})`);
  return `The same passage is in: ${names.join("; ")}.`;
}
