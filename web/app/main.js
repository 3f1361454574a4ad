// The page: one thing at a time is looked up, out of the microphone or a file, and shown.

import { announcement, isMatch, lacksText, nameAndArtist, placeOf } from "./answers.js";
import { byId } from "./dom.js";
import { HistoryView } from "./history_view.js";
import { History, Token } from "./keeping.js";
import { Level } from "./level.js";
import { listen } from "./listening.js";
import { openMicrophone, trailMakers } from "./package.js";
import { problemOf, problemOfAnswer } from "./problems.js";
import { Recogniser } from "./recogniser.js";
import { ResultView } from "./result_view.js";
import { asksPassages, roundsAt } from "./schedule.js";
import { Service } from "./service.js";
import { entriesOf } from "./set_list.js";
import { SetListView } from "./set_list_view.js";
import { bytesOf, decode, isTrail, secondsOfTrail } from "./sound_files.js";
import { StatusView } from "./status_view.js";
import { lengthText } from "./times.js";
import { TokenView } from "./token_view.js";

/** Seconds after which it is said that the page is still listening, and that it hears nothing. */
const REMINDER = 15;
const SILENCE = 4;

const token = new Token(() => sessionStorage);
const service = new Service(new URL("../", import.meta.url), token);
const recogniser = new Recogniser(
  {
    trailBuilder: async (rate) => (await trailMakers()).trailBuilder(rate),
    readTrail: async (bytes) => (await trailMakers()).readTrail(bytes),
  },
  service,
);
const history = new History(() => localStorage);
const status = new StatusView();
const say = (text) => status.say(text);
const views = {
  result: new ResultView(),
  setList: new SetListView(say),
  history: new HistoryView(history, say),
  token: new TokenView(token),
};
const button = byId("listen");

/** What is under way; null when nothing is. */
let running = null;
/** Whether the server wants a token; known once it has said so. */
let wantsToken = false;

// ---- One thing at a time

class Stopped extends Error {}

function stop() {
  running?.abort(new Stopped());
  running = null;
  setBusy(false);
}

function setBusy(busy) {
  byId("listen-label").textContent = busy ? "Stop" : "Listen";
  button.classList.toggle("busy", busy);
  document.body.classList.toggle("busy", busy);
  if (!busy) {
    status.level(null);
    status.detail("");
  }
}

function clear() {
  status.clearProblem();
  status.notice("");
  views.result.hide();
  views.setList.hide();
  views.token.hide();
}

/**
 * Runs one thing after ending what ran before.
 *
 * @param {(signal: AbortSignal, keep: (again: () => Promise) => void) => Promise} work
 *   `keep` is given what asks once more without the sound having to be made again.
 */
async function run(work) {
  stop();
  clear();
  if (wantsToken && !token.value) {
    say("This server wants a token first.");
    views.token.ask(() => run(work));
    return;
  }
  const controller = new AbortController();
  running = controller;
  setBusy(true);
  let again = null;
  try {
    await work(controller.signal, (ask) => (again = ask));
  } catch (error) {
    if (controller.signal.aborted) {
      return;
    }
    showError(error, again && (() => run(again)));
  } finally {
    if (running === controller) {
      stop();
    }
  }
}

function showError(error, tryAgain) {
  const problem = problemOf(error);
  if (problem.token) {
    if (token.value) {
      problem.advice = `The one that was entered was not accepted. ${problem.advice}`;
    }
    token.value = null;
    wantsToken = true;
    views.token.ask(() => tryAgain?.());
  }
  say("");
  status.problem(problem, problem.again && !problem.token ? tryAgain : null);
}

const BUSY = "The server is busy, and is asked again in a moment.";

// ---- Out of the microphone

function startListening() {
  return run(async (signal, keep) => {
    say("Waiting for the microphone.");
    // What makes trails is fetched meanwhile; whether that failed is seen when it is needed.
    trailMakers().catch(() => {});
    const level = new Level();
    let clip;
    let loudest = 0;
    let busyUntil = 0;
    let lastSaid = null;
    const answer = await listen({
      openMicrophone,
      recogniser,
      signal,
      onBusy: (seconds) => (busyUntil = performance.now() + 1000 * seconds),
      onHeard: ({ seconds, samples, rate }) => {
        const now = level.after(samples, samples.length / rate);
        loudest = Math.max(loudest, now);
        status.level(now);
        const isBusy = performance.now() < busyUntil;
        status.detail(isBusy ? BUSY : `${Math.floor(seconds)} s heard`);
        lastSaid = sayOnce(listeningText(seconds, loudest), lastSaid);
      },
      onClip: (heard) => {
        clip = heard;
        keep((later, keepAgain) => askAbout(clip, null, later, keepAgain));
      },
    });
    await showAnswer({ answer, clip, from: null, signal });
  });
}

function listeningText(seconds, loudest) {
  if (loudest === 0 && seconds > SILENCE) {
    return "Listening, and hearing nothing. Is the music on, and the microphone?";
  }
  return seconds < REMINDER
    ? "Listening. Hold this device near the loudspeaker."
    : `Still listening: ${REMINDER} seconds were not enough.`;
}

/** What is said again is read out again. */
function sayOnce(text, lastSaid) {
  if (text !== lastSaid) {
    say(text);
  }
  return text;
}

// ---- Out of a file

function startFile(files) {
  const [file] = files;
  if (!file) {
    return undefined;
  }
  return run(async (signal, keep) => {
    say(`Reading “${file.name}”.`);
    if (files.length > 1) {
      status.notice(`Only the first of ${files.length} files is looked up.`);
    }
    const bytes = await bytesOf(file);
    const head = new Uint8Array(bytes, 0, Math.min(64, bytes.byteLength));
    if (isTrail(head)) {
      await askAboutTrail(new Uint8Array(bytes), file.name, signal, keep);
      return;
    }
    const clip = await decode(bytes, file.name);
    signal.throwIfAborted();
    await askAbout(clip, file.name, signal, keep);
  });
}

async function askAboutTrail(trail, name, signal, keep) {
  keep((later, keepAgain) => askAboutTrail(trail, name, later, keepAgain));
  say(`Looking up “${name}”.`);
  const passages = asksPassages(name, secondsOfTrail(trail));
  const answer = await service.match(trail, { passages, signal, onBusy: sayBusy });
  await showAnswer({ answer, clip: null, from: name, signal, passages });
}

async function askAbout(clip, name, signal, keep) {
  keep((later, keepAgain) => askAbout(clip, name, later, keepAgain));
  const seconds = clip.samples.length / clip.rate;
  const passages = asksPassages(name, seconds);
  const what = name !== null ? `“${name}”, ${lengthText(seconds)}` : "what was heard";
  say(`Looking up ${what}.`);
  const options = { signal, onBusy: sayBusy };
  const answer = passages
    ? await recogniser.askPassages(clip, options)
    : await recogniser.ask(clip, roundsAt(seconds), options);
  await showAnswer({ answer, clip, from: name, signal, passages });
}

function sayBusy(seconds) {
  status.detail(BUSY, seconds);
}

// ---- What came of it

async function showAnswer({ answer, clip, from, signal, passages = false }) {
  status.notice(lacksText(answer));
  if (!isMatch(answer)) {
    say("");
    status.problem(problemOfAnswer(answer), null);
    return;
  }
  const { matches } = answer;
  if (passages) {
    views.setList.show(entriesOf(answer), from);
  }
  if (passages && matches.length > 1) {
    say(`${matches.length} passages were recognised in “${from}”.`);
    return;
  }
  showTrack(matches, from);
  await drawTrails(clip, matches[0], signal);
}

function showTrack(matches, from) {
  const [best] = matches;
  views.result.show(matches);
  say(announcement(best));
  status.detail("");
  const { track, title, artist, source } = best;
  history.add({ when: Date.now(), track, title, artist, source, place: placeOf(best), from });
  views.history.show();
}

/** The drawing explains the answer; without it the answer stands all the same. */
async function drawTrails(clip, match, signal) {
  if (!clip) {
    return;
  }
  try {
    const laid = await recogniser.layTrails(clip, match, signal);
    if (!signal.aborted && laid.bits > 0) {
      views.result.draw(laid);
    }
  } catch (error) {
    if (!signal.aborted) {
      console.info(`No drawing of ${nameAndArtist(match)}: ${error.message}`);
    }
  }
}

// ---- The page's own controls

function takeDrops() {
  const isFile = (event) => [...(event.dataTransfer?.types ?? [])].includes("Files");
  const show = (shown) => document.body.classList.toggle("dropping", shown);
  addEventListener("dragover", (event) => {
    if (isFile(event)) {
      event.preventDefault();
      show(true);
    }
  });
  addEventListener("dragleave", (event) => event.relatedTarget ?? show(false));
  addEventListener("drop", (event) => {
    show(false);
    if (isFile(event)) {
      event.preventDefault();
      startFile(event.dataTransfer.files);
    }
  });
}

function takeInputs() {
  button.addEventListener("click", () => {
    if (running) {
      stop();
      say("Stopped.");
    } else {
      startListening();
    }
  });
  addEventListener("keydown", (event) => {
    if (event.key === "Escape" && running) {
      stop();
      say("Stopped.");
    }
  });
  const chooser = byId("file");
  chooser.addEventListener("change", () => {
    startFile([...chooser.files]);
    chooser.value = ""; // so that the same file can be chosen again
  });
}

/** What the server says of itself; the page works without, and learns the rest when it asks. */
async function greet() {
  try {
    const { token: asksForToken, longest_clip: longestClip } = await service.options();
    wantsToken = asksForToken === true;
    if (Number.isFinite(longestClip)) {
      recogniser.longestClip = longestClip;
    }
    const { tracks } = await service.health();
    if (Number.isFinite(tracks)) {
      const many = `${tracks.toLocaleString("en")} track${tracks === 1 ? "" : "s"}`;
      byId("catalogue").textContent = `This server knows ${many}.`;
    }
  } catch (error) {
    console.info(`The server did not introduce itself: ${error.message}`);
  }
}

takeDrops();
takeInputs();
greet();
document.body.classList.add("ready");
