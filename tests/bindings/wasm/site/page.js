// What browser_test.mjs calls in the page: the package by its files, as a page has them.

import * as sounds from "/sounds.mjs";
import { createClient } from "/kzsdk/client.js";
import { load } from "/kzsdk/index.js";
import { openMicrophone } from "/kzsdk/microphone.js";

async function textOf(path) {
  return (await fetch(path)).text();
}

/** What a worker makes of a golden document, or without an algorithm of a golden trail. */
async function digestsInWorker(client, each, algorithm) {
  const { rate, channels } = each;
  if (!algorithm) {
    const trail = await client.trail(each.samples(), rate, { channels, transfer: true });
    const { codes } = await client.readTrail(trail);
    return `${codes.length} ${sounds.digestOf(new Uint8Array(codes.buffer))}`;
  }
  const options = { algorithm, channels, transfer: true };
  const { document } = await client.fingerprint(each.samples(), rate, options);
  return sounds.digestOf(new TextEncoder().encode(document));
}

/** What differs from the golden files through a worker, and how many were compared. */
window.compareGolden = async () => {
  const client = await createClient();
  const documents = await textOf("/golden/documents.txt");
  const trails = sounds.goldenTrails(await textOf("/golden/catalogue.txt"));
  const differences = [];
  let compared = 0;
  const compare = async (each, expected, algorithm) => {
    const is = await digestsInWorker(client, each, algorithm);
    if (is !== expected) differences.push(`${algorithm ?? "trail"} ${each.name}: ${is}`);
    compared += 1;
  };
  for (const algorithm of ["fixed", "float"]) {
    for (const each of sounds.goldenDocuments(documents, algorithm)) {
      await compare(each, each.digest, algorithm);
    }
  }
  for (const each of trails) await compare(each, `${each.codes} ${each.digest}`);
  client.close();
  return { differences, compared };
};

/** The same sound in the page itself, and through a worker with the addresses given. */
window.compareThreads = async () => {
  const kz = await load({ module: "/kzsdk/kzsdk.wasm" });
  const addresses = { workerUrl: "/kzsdk/worker.js", moduleUrl: "kzsdk/kzsdk.wasm" };
  const client = await createClient(addresses);
  const samples = sounds.toFloats(sounds.melody(44100, 1, 5));
  const inPage = String(kz.trail(samples, 44100));
  const inWorker = String(await client.trail(samples, 44100));
  client.close();
  return { equal: inPage === inWorker, version: kz.version };
};

/** The codes of the errors of what cannot be loaded. */
window.failuresToLoad = async () => {
  const codeOf = (work) => work.then(() => "none", (error) => error.code);
  return {
    missing: await codeOf(load({ module: "/kzsdk/missing.wasm" })),
    page: await codeOf(load({ module: "/index.html" })),
    module: await codeOf(createClient({ moduleUrl: "/missing.wasm" })),
    worker: await codeOf(createClient({ workerUrl: "/missing.js" })),
  };
};

window.loadCode = () => load().then(() => "none", (error) => error.code);

/** Listens for some seconds; where the file that plays has what was heard. */
window.listen = async (seconds) => {
  const kz = await load();
  const blocks = [];
  let highest = 0;
  const microphone = await openMicrophone({
    onSamples: (samples) => {
      blocks.push(samples);
      highest = Math.max(highest, microphone.level);
    },
  });
  const before = blocks.length;
  await new Promise((resolve) => setTimeout(resolve, seconds * 1000));
  const beforeStop = blocks.length;
  await microphone.stop();
  const afterStop = blocks.length;
  const builder = kz.trailBuilder(microphone.rate);
  blocks.forEach((block) => builder.feed(block));
  const heard = builder.finish();
  const played = kz.trail(sounds.toFloats(sounds.melody(44100, 1, 30)), 44100);
  const found = kz.align(played, heard);
  await new Promise((resolve) => setTimeout(resolve, 300));
  return {
    seconds: kz.readTrail(heard).seconds,
    rate: microphone.rate,
    label: microphone.label,
    highest,
    levelAfterwards: microphone.level,
    before,
    lastBlocks: afterStop - beforeStop,
    blocksAfterStop: blocks.length - afterStop,
    longest: Math.max(...blocks.map((block) => block.length)),
    found: found.found,
    errorRate: found.errorRate,
  };
};

/** What is told when the microphone's sound ends, as it does when that is disconnected. */
window.disconnect = async () => {
  const devices = navigator.mediaDevices;
  const getUserMedia = devices.getUserMedia.bind(devices);
  let stream;
  devices.getUserMedia = async (wanted) => (stream = await getUserMedia(wanted));
  const error = await new Promise((resolve, reject) => {
    openMicrophone({ onSamples: () => {}, onEnded: resolve }).then(() => {
      stream.getAudioTracks()[0].dispatchEvent(new Event("ended"));
    }, reject);
  });
  devices.getUserMedia = getUserMedia;
  return { code: error.code, state: stream.getAudioTracks()[0].readyState };
};

window.microphoneCode = (options = {}) =>
  openMicrophone({ onSamples: () => {}, ...options }).then(
    async (microphone) => {
      await microphone.stop();
      return "none";
    },
    (error) => error.code,
  );

window.ready = true;
