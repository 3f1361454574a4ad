// Every error has a sentence that says what cures it.

import assert from "node:assert/strict";
import { test } from "node:test";

import {
  NoMicrophoneHere,
  PageBroken,
  UnreadableFile,
  problemOf,
  problemOfAnswer,
} from "../../../../web/app/problems.js";
import { ServiceAway, ServiceRefused } from "../../../../web/app/service.js";
import { SilentDevice } from "../../../../web/app/sound.js";

const named = (name) => Object.assign(new Error("raw"), { name });

test("each trouble of the microphone has its words", () => {
  assert.match(problemOf(named("NotAllowedError")).title, /refused/);
  assert.match(problemOf(named("NotFoundError")).title, /No microphone/);
  assert.match(problemOf(named("NotReadableError")).advice, /Another program/);
  assert.match(problemOf(new SilentDevice()).title, /gives no sound/);
  assert.match(problemOf(new NoMicrophoneHere(false)).advice, /https/);
  assert.match(problemOf(new NoMicrophoneHere(true)).advice, /current version/);
});

test("the package's words for them are known too", () => {
  const coded = (code) => Object.assign(named("KzError"), { code });
  assert.match(problemOf(coded("refused")).title, /refused/);
  assert.match(problemOf(coded("no-microphone")).title, /No microphone/);
  assert.match(problemOf(coded("busy")).title, /cannot be used/);
  assert.match(problemOf(coded("load")).title, /part of the page/);
});

test("an error that was wrapped is still known", () => {
  const wrapped = new Error("could not open", { cause: named("NotAllowedError") });
  assert.match(problemOf(wrapped).title, /refused/);
});

test("troubles of the server can be tried again", () => {
  assert.equal(problemOf(new ServiceAway("x")).again, true);
  assert.equal(problemOf(new ServiceRefused(503, "queue_full", "x", 1)).again, true);
  assert.match(problemOf(new ServiceRefused(503, "draining", "x", 1)).title, /stopped/);
  assert.equal(problemOf(new UnreadableFile("x")).again, false);
});

test("a missing token asks for one", () => {
  const problem = problemOf(new ServiceRefused(401, "token_missing", "x", 0));
  assert.equal(problem.token, true);
});

test("other refusals are told in the server's words", () => {
  assert.equal(problemOf(new ServiceRefused(400, "bad", "The trail is cut.", 0)).advice,
               "The trail is cut.");
});

test("what nobody thought of is told all the same", () => {
  assert.match(problemOf(new Error("odd thing")).advice, /odd thing/);
  assert.match(problemOf(new PageBroken("The worker.")).advice, /The worker\. Load/);
});

test("each verdict without a track has its words", () => {
  const titles = ["no match", "not sure", "too quiet", "match"].map(
    (verdict) => problemOfAnswer({ verdict }).title,
  );
  assert.deepEqual(titles, ["Not recognised", "Not sure", "Too quiet", "Not recognised"]);
});
