// What the service answers, put into words. Nothing here touches the page or the network.

import { clockText } from "./times.js";

/** A change of speed that is not worth telling. */
const NO_CHANGE = 0.005;

/**
 * The name under which a track is shown.
 *
 * @param {{track: number, source?: string, title?: string|null}} match
 * @returns {string} its title; without one the file's name; without that its number
 */
export function nameOf(match) {
  const title = (match.title ?? "").trim();
  if (title) {
    return title;
  }
  const file = (match.source ?? "").split(/[\\/]/).pop();
  return file || `Track ${match.track}`;
}

/**
 * Title and artist in one line.
 *
 * @param {{title?: string|null, artist?: string|null}} match
 * @returns {string} "Title by Artist", or the name alone
 */
export function nameAndArtist(match) {
  const artist = (match.artist ?? "").trim();
  return artist ? `${nameOf(match)} by ${artist}` : nameOf(match);
}

/**
 * Where in the track what was heard begins. `offset` is the place of the clip's first sample, also
 * when only a later part of the clip is from the track.
 *
 * @param {{offset: number, clip_begin?: number, tempo?: number}} match
 * @returns {number} seconds of the track
 */
export function placeOf(match) {
  return match.offset + (match.clip_begin ?? 0) * (match.tempo ?? 1);
}

function changeText(factor, more, less) {
  const percent = Math.round((factor - 1) * 100);
  return `about ${Math.abs(percent)} % ${percent > 0 ? more : less}`;
}

/**
 * How the clip differs from the track in speed, tempo and pitch. Of a trail it is known by how it
 * was read, to two percent or so.
 *
 * @param {{speed?: number, tempo?: number, pitch?: number}} match
 * @returns {string} "about 4 % faster", or "" when nothing was changed
 */
export function changesOf(match) {
  const changed = (factor) => Number.isFinite(factor) && Math.abs(factor - 1) >= NO_CHANGE;
  if (changed(match.speed)) {
    return changeText(match.speed, "faster", "slower");
  }
  const parts = [];
  if (changed(match.tempo)) {
    parts.push(changeText(match.tempo, "quicker in tempo", "slower in tempo"));
  }
  if (changed(match.pitch)) {
    parts.push(changeText(match.pitch, "higher in pitch", "lower in pitch"));
  }
  return parts.join(", ");
}

/**
 * How sure an answer is, with the numbers it rests on.
 *
 * @param {{sure?: string, score: number, threshold: number}} match
 * @returns {string} "certain (score 12.9, 7.3 needed)"
 */
export function sureText(match) {
  const numbers = `score ${match.score.toFixed(1)}, ${match.threshold.toFixed(1)} needed`;
  return match.sure ? `${match.sure} (${numbers})` : numbers;
}

/**
 * The sentence that is read out when a track was recognised.
 *
 * @param {object} match  One of `matches` of an answer.
 * @returns {string} "Recognised: Title by Artist, at 1:40."
 */
export function announcement(match) {
  return `Recognised: ${nameAndArtist(match)}, at ${clockText(placeOf(match))}.`;
}

/**
 * The answer to a trail that was read as if the clip had been played at another speed, in the
 * clip's own seconds and with its own speed.
 *
 * @param {object} answer  What the service said.
 * @param {number} speed   How much faster the clip was taken to be: 1.04 is 4 %.
 * @returns {object} a copy
 */
export function atOwnSpeed(answer, speed) {
  if (speed === 1) {
    return answer;
  }
  const ownMatch = (match) => ({
    ...match,
    speed: factorTimes(match.speed, speed),
    tempo: factorTimes(match.tempo, speed),
    pitch: factorTimes(match.pitch, speed),
    clip_begin: secondsOver(match.clip_begin, speed),
    clip_end: secondsOver(match.clip_end, speed),
  });
  return { ...answer, matches: (answer.matches ?? []).map(ownMatch) };
}

function factorTimes(factor, speed) {
  return (factor ?? 1) * speed;
}

function secondsOver(seconds, speed) {
  return seconds === undefined ? undefined : seconds / speed;
}

/**
 * The answer to a trail of a clip's end, in seconds of the whole clip.
 *
 * @param {object} answer   What the service said.
 * @param {number} skipped  Seconds of the clip before the trail begins.
 * @returns {object} a copy
 */
export function fromTheStart(answer, skipped) {
  if (skipped === 0) {
    return answer;
  }
  const ownMatch = (match) => ({
    ...match,
    offset: match.offset - skipped * (match.tempo ?? 1),
    clip_begin: (match.clip_begin ?? 0) + skipped,
    clip_end: (match.clip_end ?? 0) + skipped,
  });
  return { ...answer, matches: (answer.matches ?? []).map(ownMatch) };
}

/** How much more a clip has to score that was read at another speed: each is one more chance for
 *  a stranger. The service asks the same of the readings that it makes itself. */
const FURTHER_MARGIN = 1;

/** Whether an answer names a track, and how well one that names none is worth telling. */
const VERDICTS = ["too quiet", "no match", "not sure"];

function rankOf(answer) {
  return VERDICTS.indexOf(answer.verdict);
}

/**
 * Whether an answer names a track.
 *
 * @param {object} answer
 */
export function isMatch(answer) {
  return answer.verdict === "match" && (answer.matches ?? []).length > 0;
}

/**
 * An answer to a clip that was read at another speed than its own, less sure of itself.
 *
 * @param {object} answer
 * @param {number} speed  1 changes nothing.
 * @returns {object}
 */
export function withMargin(answer, speed) {
  if (speed === 1 || !isMatch(answer)) {
    return answer;
  }
  const matches = answer.matches
    .map((match) => ({ ...match, threshold: match.threshold + FURTHER_MARGIN }))
    .filter((match) => match.score >= match.threshold);
  return { ...answer, verdict: matches.length > 0 ? "match" : "not sure", matches };
}

/**
 * The best of several answers about one clip.
 *
 * @param {object[]} answers  At least one.
 * @returns {object} of those that name a track the one that scores highest; else the one that comes
 *          nearest to it
 */
export function bestOf(answers) {
  const better = (one, other) => {
    if (isMatch(one) && isMatch(other)) {
      return other.matches[0].score > one.matches[0].score ? other : one;
    }
    if (isMatch(one) || isMatch(other)) {
      return isMatch(one) ? one : other;
    }
    return rankOf(other) > rankOf(one) ? other : one;
  };
  return { ...answers.reduce(better), ...lacksOf(answers) };
}

/**
 * What several answers about one clip rest on less than they should: each as the worst has it.
 *
 * @param {object[]} answers
 * @returns {{warning?: string, left_out?: number, shards?: {answered: number, of: number}}} only
 *          what there is
 */
export function lacksOf(answers) {
  const lacks = {};
  for (const { warning, left_out: leftOut, shards } of answers) {
    if (warning) {
      lacks.warning ??= warning;
    }
    if (leftOut > (lacks.left_out ?? 0)) {
      lacks.left_out = leftOut;
    }
    if (shards && !(shards.answered >= lacks.shards?.answered)) {
      lacks.shards = shards;
    }
  }
  return lacks;
}

/**
 * What an answer lacks, for the person who reads it.
 *
 * @param {object} answer
 * @returns {string} sentences; "" when it lacks nothing
 */
export function lacksText({ warning, left_out: leftOut, shards }) {
  const sentences = [];
  if (shards) {
    const { answered, of } = shards;
    sentences.push(
      `Part of the catalogue was not searched: ${answered} of its ${of} servers answered. ` +
        "Try again later.",
    );
  }
  if (leftOut) {
    const many = leftOut === 1 ? "1 track is" : `${leftOut} tracks are`;
    sentences.push(
      `Part of the catalogue was not searched: ${many} damaged. Tell whoever runs the server.`,
    );
  }
  if (warning) {
    sentences.push(`The server says: ${warning}`);
  }
  return sentences.join(" ");
}
