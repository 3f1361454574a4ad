// What went wrong, told to the person in front of the page: what it is and what cures it.

/**
 * @typedef {object} Problem
 * @property {string} title   what happened
 * @property {string} advice  what to do about it
 * @property {boolean} again  whether asking once more, as it is, may help
 * @property {boolean} token  whether the server wants a token, or another one
 */

function problem(title, advice, { again = false, token = false } = {}) {
  return { title, advice, again, token };
}

/** Raised when a browser gives a page no microphone at all. */
export class NoMicrophoneHere extends Error {
  /** @param {boolean} secure  Whether the page came over https or from this computer. */
  constructor(secure) {
    super("This page has no access to microphones.");
    this.name = "NoMicrophoneHere";
    this.secure = secure;
  }
}

/** Raised when a file cannot be taken; the message says why and what cures it. */
export class UnreadableFile extends Error {
  constructor(message, options) {
    super(message, options);
    this.name = "UnreadableFile";
  }
}

/** Raised when the page's own parts do not load or do not start. */
export class PageBroken extends Error {
  constructor(message, options) {
    super(message, options);
    this.name = "PageBroken";
  }
}

/** The names that browsers give to a microphone that cannot be had. */
const MICROPHONE = {
  NotAllowedError: () =>
    problem(
      "The microphone was refused",
      "Allow the microphone for this page in your browser (usually at the sign beside the " +
        "address), then press Listen again. Or choose a sound file.",
    ),
  SecurityError: () => MICROPHONE.NotAllowedError(),
  NotFoundError: () =>
    problem(
      "No microphone was found",
      "Connect a microphone and press Listen again, or choose a sound file.",
    ),
  OverconstrainedError: () => MICROPHONE.NotFoundError(),
  NotReadableError: () =>
    problem(
      "The microphone cannot be used",
      "Another program may be holding it. Close that program and press Listen again.",
    ),
  AbortError: () => MICROPHONE.NotReadableError(),
  SilentDevice: () =>
    problem(
      "The microphone gives no sound",
      "It was opened, and nothing comes from it. Check that it is not switched off, choose " +
        "another one in your browser's settings, and press Listen again.",
    ),
};

/** What the package says of a microphone, and of itself. */
const PACKAGE = {
  refused: () => MICROPHONE.NotAllowedError(),
  "no-microphone": () => MICROPHONE.NotFoundError(),
  busy: () => MICROPHONE.NotReadableError(),
  load: (error) => OTHERS.PageBroken(new PageBroken(error.message)),
};

const OTHERS = {
  NoMicrophoneHere: (error) =>
    error.secure
      ? problem(
          "This browser gives pages no microphone",
          "Use a current version of Firefox, Chrome, Edge or Safari, or choose a sound file.",
        )
      : problem(
          "The microphone needs a secure connection",
          "Browsers let a page listen only when it comes over https, or from this computer " +
            "itself. Ask whoever runs the server for its https address, or choose a sound file.",
        ),
  UnreadableFile: (error) => problem("The file could not be read", error.message),
  PageBroken: (error) =>
    problem(
      "A part of the page is missing",
      `${error.message} Load the page again; if that does not help, tell whoever runs the server.`,
    ),
  ServiceAway: () =>
    problem(
      "The server does not answer",
      "Check that this device is online, then try again. What was heard is still here.",
      { again: true },
    ),
};

const BUSY = () =>
  problem("The server is busy", "Many are asking at the moment. Try again in a minute.", {
    again: true,
  });

/** What the service refuses, by status. */
const REFUSED = {
  401: () =>
    problem("The server wants a token", "Enter the token that you were given for this server.", {
      again: true,
      token: true,
    }),
  413: () =>
    problem("The recording is too long for this server", "Cut it into shorter files."),
  429: BUSY,
  503: (error) =>
    error.code === "draining"
      ? problem("The server is being stopped", "Try again in a minute.", { again: true })
      : BUSY(),
};

/**
 * The problem that an error is for the person who meets it.
 *
 * @param {Error} error
 * @returns {Problem}
 */
export function problemOf(error) {
  if (error.name === "ServiceRefused") {
    const known = REFUSED[error.status];
    return known ? known(error) : problem("The server refused", error.message, { again: true });
  }
  // A helper may wrap what the browser said.
  for (const each of [error, error.cause]) {
    const known =
      OTHERS[each?.name] ??
      MICROPHONE[each?.name] ??
      (each?.name === "KzError" ? PACKAGE[each.code] : undefined);
    if (known) {
      return known(each);
    }
  }
  return problem("Something unexpected happened", `The browser says: ${error.message}`);
}

/** What to say, by the verdict of an answer without matches. */
const VERDICTS = {
  "no match": () =>
    problem(
      "Not recognised",
      "This server does not know the track, or there was too much beside it. Get nearer to the " +
        "loudspeaker and try another part of the track.",
    ),
  "not sure": () =>
    problem(
      "Not sure",
      "It resembles a track, too little to name it. Try once more, nearer to the loudspeaker, or " +
        "with more of the track.",
    ),
  "too quiet": () =>
    problem(
      "Too quiet",
      "There was hardly any sound. Turn the music up, hold the device nearer, and try again.",
    ),
};

/**
 * What to say about an answer without matches.
 *
 * @param {{verdict: string}} answer
 * @returns {Problem}
 */
export function problemOfAnswer(answer) {
  return (VERDICTS[answer.verdict] ?? VERDICTS["no match"])();
}
