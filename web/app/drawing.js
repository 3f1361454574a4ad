// The drawing of a clip's trail against the track's: the track above, the clip below it, and the
// bits that differ. A column is a code, its lowest bit at the bottom.

import { bitOf } from "./codes.js";

const BITS = 64;

/** Of two recordings that have nothing in common, half of all bits differ by chance. */
export function drawingText(laid) {
  const percent = Math.round((100 * laid.different) / laid.bits);
  return (
    `${percent} % of ${laid.bits.toLocaleString("en")} bits differ. Of two recordings that have ` +
    "nothing in common, 50 % would."
  );
}

/**
 * Paints the strips; to be called again when the colours change.
 *
 * @param {{track: HTMLCanvasElement, clip: HTMLCanvasElement, different: HTMLCanvasElement}} strips
 * @param {import("./codes.js").Laid} laid
 */
export function drawStrips(strips, laid) {
  const count = laid.clip.length;
  const both = (i, bit) => bitOf(laid.clip, i, bit) !== bitOf(laid.track, i, bit);
  drawStrip(strips.track, count, (i, bit) => bitOf(laid.track, i, bit));
  drawStrip(strips.clip, count, (i, bit) => bitOf(laid.clip, i, bit));
  drawStrip(strips.different, count, both);
}

/** One pixel a bit; the style sheet stretches it, and names the colour of a strip's bits. */
function drawStrip(canvas, count, isSet) {
  canvas.width = count;
  canvas.height = BITS;
  const context = canvas.getContext("2d");
  context.fillStyle = getComputedStyle(canvas).color;
  for (let i = 0; i < count; ++i) {
    for (let bit = 0; bit < BITS; ++bit) {
      if (isSet(i, bit)) {
        context.fillRect(i, BITS - 1 - bit, 1, 1);
      }
    }
  }
}
