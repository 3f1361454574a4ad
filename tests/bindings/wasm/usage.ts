// Uses everything that the package's types declare. Compiled only; what must not compile is marked.

import {
  KzError,
  NOT_COMPARED,
  load,
  type Alignment,
  type Fingerprint,
  type KzErrorCode,
  type Library,
  type StreamState,
  type Trail,
} from "kzsdk";
import { KzError as SameError, createClient, type Client } from "kzsdk/client";
import { openMicrophone, type Microphone } from "kzsdk/microphone";

const samples = new Float32Array(44100);

export async function library(): Promise<void> {
  const kz: Library = await load();
  await load({ module: new URL("https://example.org/kzsdk.wasm") });
  await load({ module: new Uint8Array(8) });
  const fingerprint: Fingerprint = kz.fingerprint(samples, 44100, { channels: 2 });
  const values: Int16Array = fingerprint.values;
  const document: string = fingerprint.document;
  const times: number = fingerprint.startSeconds + fingerprint.seconds + values[0]!;
  const stream = kz.fingerprintStream(44100, { algorithm: "float" });
  const complete: boolean = stream.feed(samples) || stream.finish();
  const state: StreamState = stream.state();
  stream.result();
  stream.free();
  const builder = kz.trailBuilder(44100, { speed: 1.04 });
  builder.feed(samples);
  const soFar: Uint8Array = builder.trail();
  const whole: Uint8Array = builder.finish();
  builder.free();
  const trail: Trail = kz.readTrail(whole);
  const codes: BigUint64Array = trail.codes;
  const alignment: Alignment = kz.align(soFar, whole);
  const offset: number | undefined = alignment.offset;
  const errors: Uint8Array = alignment.bitErrors.filter((each) => each !== NOT_COMPARED);
  console.log(kz.version, document, times, complete, state.percent, codes, offset, errors);

  // @ts-expect-error samples are floats
  kz.trail(new Int16Array(4), 44100);
  // @ts-expect-error there is no such algorithm
  kz.fingerprint(samples, 44100, { algorithm: "best" });
  // @ts-expect-error a rate is needed
  kz.trail(samples);
  // @ts-expect-error there may be no offset
  const certain: number = alignment.offset;
  console.log(certain);
}

export async function worker(): Promise<void> {
  const kz: Client = await createClient({ workerUrl: "/worker.js", moduleUrl: "/kzsdk.wasm" });
  const bytes: Uint8Array = await kz.trail(samples, 44100, { channels: 2, transfer: true });
  const builder = await kz.trailBuilder(44100);
  await builder.feed(samples, { transfer: true });
  const trail: Trail = await kz.readTrail(await builder.finish());
  const stream = await kz.fingerprintStream(44100);
  const result: Fingerprint = await stream.result();
  await Promise.all([builder.free(), stream.free(), kz.align(bytes, bytes)]);
  console.log(trail.seconds, result.values, kz.version);
  kz.close();

  // @ts-expect-error it is a promise
  const early: Uint8Array = kz.trail(samples, 44100);
  console.log(early);
}

export async function microphone(): Promise<void> {
  const opened: Microphone = await openMicrophone({
    onSamples: (block: Float32Array) => console.log(block.length),
    onEnded: (error: KzError) => console.log(error.message),
    workletUrl: "/worklet.js",
  });
  console.log(opened.rate, opened.level, opened.label);
  await opened.stop();

  // @ts-expect-error somebody has to take the samples
  await openMicrophone({});
}

export function codeOf(error: unknown): KzErrorCode | undefined {
  if (error instanceof SameError) return error.code;
  // @ts-expect-error there is no such code
  return new KzError("other", "").code;
}
