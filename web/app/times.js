// Times as people read them.

/**
 * A place in a recording.
 *
 * @param {number} seconds  May be negative: a clip may begin before the track does.
 * @returns {string} "1:40", from an hour on "1:02:05"; to the second, rounded down as a clock is.
 */
export function clockText(seconds) {
  if (!Number.isFinite(seconds)) {
    return "?";
  }
  // What is a hair below a second has been rounded on its way through text.
  const whole = Math.floor(Math.abs(seconds) + 0.05);
  const sign = seconds < 0 && whole > 0 ? "−" : "";
  const two = (number) => String(number).padStart(2, "0");
  const minutes = Math.floor(whole / 60);
  return minutes < 60
    ? `${sign}${minutes}:${two(whole % 60)}`
    : `${sign}${Math.floor(minutes / 60)}:${two(minutes % 60)}:${two(whole % 60)}`;
}

/**
 * A length in words, for those who hear the page read to them.
 *
 * @param {number} seconds  0 or more.
 * @returns {string} "1 minute 40 seconds".
 */
export function lengthText(seconds) {
  const whole = Math.round(seconds);
  const parts = [
    [Math.floor(whole / 3600), "hour"],
    [Math.floor(whole / 60) % 60, "minute"],
    [whole % 60, "second"],
  ].filter(([number]) => number > 0);
  const words = parts.map(([number, unit]) => `${number} ${unit}${number === 1 ? "" : "s"}`);
  return words.join(" ") || "0 seconds";
}
