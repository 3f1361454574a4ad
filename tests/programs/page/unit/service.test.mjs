// The service as the page asks it, over a real server that answers as told.

import assert from "node:assert/strict";
import { createServer } from "node:http";
import { after, before, beforeEach, test } from "node:test";

import { Service } from "../../../../web/app/service.js";

const token = { value: null };
let server;
let service;
let requests;
let answers;

before(async () => {
  server = createServer(async (request, response) => {
    const chunks = [];
    for await (const chunk of request) {
      chunks.push(chunk);
    }
    requests.push({ ...request, url: request.url, headers: request.headers,
                    body: Buffer.concat(chunks) });
    const { status = 200, headers = {}, body = "{}" } = answers.shift() ?? {};
    response.writeHead(status, headers).end(body);
  });
  await new Promise((resolve) => server.listen(0, "127.0.0.1", resolve));
  service = new Service(`http://127.0.0.1:${server.address().port}/below/`, token);
});

after(() => {
  server.closeAllConnections();
  server.close();
});

beforeEach(() => {
  requests = [];
  answers = [];
  token.value = null;
});

const MATCH = '{"verdict": "match", "matches": []}';

test("a trail is sent as it is, with its type", async () => {
  answers = [{ body: MATCH }];
  const answer = await service.match(Uint8Array.of(1, 2, 3));
  assert.equal(answer.verdict, "match");
  const [request] = requests;
  assert.equal(request.url, "/below/v1/match");
  assert.equal(request.headers["content-type"], "application/x-kzt");
  assert.deepEqual([...request.body], [1, 2, 3]);
  assert.equal(request.headers.authorization, undefined);
});

test("a token goes with every request", async () => {
  token.value = "secret";
  answers = [{}, { body: "\x01\x02" }];
  await service.options();
  const trail = await service.trail(7);
  assert.deepEqual([...trail], [1, 2]);
  assert.deepEqual(requests.map((request) => request.headers.authorization),
                   ["Bearer secret", "Bearer secret"]);
  assert.equal(requests[1].url, "/below/v1/tracks/7/trail");
});

test("a token that cannot be sent is a refused one", async () => {
  for (const bad of ["snow\u2603man", "zero\u200bwidth", "line\nend"]) {
    token.value = bad;
    await assert.rejects(service.options(), { name: "ServiceRefused", status: 401 });
  }
  assert.equal(requests.length, 0);
});

test("a busy service is asked again after its time", async () => {
  answers = [{ status: 503, headers: { "Retry-After": "0" } }, { body: MATCH }];
  const waits = [];
  await service.match(Uint8Array.of(1), { passages: true, onBusy: (wait) => waits.push(wait) });
  assert.equal(waits.length, 1);
  assert.deepEqual(requests.map((request) => request.url),
                   ["/below/v1/match?passages=1", "/below/v1/match?passages=1"]);
});

test("a long wait is left to the person", async () => {
  answers = [{ status: 503, headers: { "Retry-After": "300" } }];
  await assert.rejects(service.match(Uint8Array.of(1)), { retryAfter: 300 });
  assert.equal(requests.length, 1);
});

test("a refusal has the service's code and words", async () => {
  answers = [{ status: 400, body: '{"error": {"code": "bad_trail", "message": "It is cut."}}' }];
  await assert.rejects(service.match(Uint8Array.of(1)),
                       { status: 400, code: "bad_trail", message: "It is cut." });
});

test("a page of a server in between is no answer", async () => {
  answers = [{ status: 502, body: "<html>" }, { status: 200, body: "<html>" }];
  await assert.rejects(service.options(), { name: "ServiceRefused", message: /502/ });
  await assert.rejects(service.options(), { name: "ServiceAway" });
});

test("a service that is away is said to be", async () => {
  const away = new Service("http://127.0.0.1:1/", token);
  await assert.rejects(away.options(), { name: "ServiceAway" });
});

test("stopping ends a wait, with its reason", { timeout: 5000 }, async () => {
  answers = [{ status: 503, headers: { "Retry-After": "9" } }];
  const controller = new AbortController();
  const reason = new Error("stopped");
  const asked = service.match(Uint8Array.of(1), {
    signal: controller.signal,
    onBusy: () => controller.abort(reason),
  });
  await assert.rejects(asked, reason);
  assert.equal(requests.length, 1);
});
