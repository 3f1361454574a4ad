// Listening: the microphone is heard, and the service asked at the schedule's moments, until a
// track is recognised, the last moment has passed or the person stops.

import { isMatch } from "./answers.js";
import { LONGEST_HEARD, nextMoment, roundsAt } from "./schedule.js";
import { ServiceAway } from "./service.js";
import { HeardSound } from "./sound.js";

/** Milliseconds that a microphone may take for its next samples. */
const PATIENCE = 4000;

/** A service that does not answer is asked again at the next moment, up to this many seconds: then
 *  enough was heard to be asked about later. */
const ENOUGH_TO_KEEP = 11;

/**
 * Listens until there is an answer.
 *
 * @param {object} parts
 * @param {Function} parts.openMicrophone  ({ onSamples }) => promise of { rate, stop() }
 * @param {import("./recogniser.js").Recogniser} parts.recogniser
 * @param {AbortSignal} parts.signal     Ends it with the signal's reason.
 * @param {(heard: {seconds: number, samples: Float32Array, rate: number}) => void}
 *   parts.onHeard
 * @param {(clip: import("./recogniser.js").Clip) => void} parts.onClip  Before each asking.
 * @param {(seconds: number) => void} [parts.onBusy]  The service asked for a wait.
 * @returns {Promise<object>} the answer; the last one when nothing was recognised
 */
export async function listen({ openMicrophone, recogniser, signal, onHeard, onClip, onBusy }) {
  let sound = null;
  let isOver = false;
  // Samples may come before the promise says at which rate.
  const early = [];
  const take = (samples) => {
    if (isOver || signal.aborted) {
      return;
    }
    if (sound === null) {
      early.push(samples);
      return;
    }
    sound.add(samples);
    onHeard({ seconds: sound.seconds, samples, rate: sound.rate });
  };
  const microphone = await openMicrophone({ onSamples: take });
  try {
    signal.throwIfAborted();
    sound = new HeardSound(microphone.rate);
    early.splice(0).forEach(take);
    const ask = (clip, seconds) => {
      onClip(clip);
      return recogniser.ask(clip, roundsAt(seconds), { signal, onBusy });
    };
    return await askUntilKnown({ sound, rate: microphone.rate, signal, ask });
  } finally {
    // It may give a last piece while it is being closed.
    isOver = true;
    Promise.resolve(microphone.stop()).catch(() => {});
  }
}

async function askUntilKnown({ sound, rate, signal, ask }) {
  let answer;
  for (let moment = nextMoment(0); moment !== undefined; moment = nextMoment(moment)) {
    await sound.until(moment, signal, PATIENCE);
    try {
      answer = await ask({ samples: sound.last(LONGEST_HEARD), rate }, moment);
    } catch (error) {
      if (!(error instanceof ServiceAway) || moment >= ENOUGH_TO_KEEP) {
        throw error;
      }
      continue;
    }
    if (isMatch(answer)) {
      break;
    }
  }
  return answer;
}
