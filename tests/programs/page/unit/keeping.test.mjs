// What the browser keeps, when it does and when it does not.

import assert from "node:assert/strict";
import { test } from "node:test";

import { History, isToken, MOST_ENTRIES, Token } from "../../../../web/app/keeping.js";

/** A storage as browsers have it. */
class Store {
  #map = new Map();
  getItem(name) {
    return this.#map.get(name) ?? null;
  }
  setItem(name, text) {
    this.#map.set(name, String(text));
  }
  removeItem(name) {
    this.#map.delete(name);
  }
}

const entry = (when) => ({
  when,
  track: 1,
  title: `T${when}`,
  artist: null,
  source: "a.ogg",
  place: 3,
  from: null,
});

test("entries are kept, the newest first", () => {
  const store = new Store();
  const history = new History(() => store);
  history.add(entry(1));
  history.add(entry(2));
  const reloaded = new History(() => store);
  assert.deepEqual(reloaded.entries, [entry(2), entry(1)]);
  assert.ok(reloaded.lasting);
});

test("two tabs do not undo each other's entries", () => {
  const store = new Store();
  const [one, other] = [new History(() => store), new History(() => store)];
  one.add(entry(1));
  other.add(entry(2));
  assert.deepEqual(other.entries.map((each) => each.when), [2, 1]);
});

test("the oldest entries go when there are too many", () => {
  const history = new History(() => new Store());
  const store = new Store();
  const full = new History(() => store);
  for (let i = 0; i < MOST_ENTRIES + 5; ++i) {
    full.add(entry(i));
  }
  assert.equal(full.entries.length, MOST_ENTRIES);
  assert.equal(full.entries.at(-1).when, 5);
  assert.deepEqual(history.entries, []);
});

test("clearing is kept", () => {
  const store = new Store();
  const history = new History(() => store);
  history.add(entry(1));
  history.clear();
  assert.deepEqual(history.entries, []);
  assert.deepEqual(new History(() => store).entries, []);
});

test("a storage that refuses leaves the tab its list", () => {
  const history = new History(() => {
    throw new Error("SecurityError");
  });
  history.add(entry(1));
  history.add(entry(2));
  assert.deepEqual(history.entries.map((each) => each.when), [2, 1]);
  assert.equal(history.lasting, false);
});

test("broken contents are an empty list", () => {
  for (const broken of ["{", "7", "null", '[1, null, "x", {"when": "now"}, {"when": 1e99}]']) {
    const store = new Store();
    store.setItem("kzfp.history", broken);
    assert.deepEqual(new History(() => store).entries, [], broken);
  }
});

test("fields of the wrong kind are not believed", () => {
  const store = new Store();
  store.setItem("kzfp.history", JSON.stringify([{ when: 1, title: { a: 1 }, place: "x" }]));
  assert.deepEqual(new History(() => store).entries, [
    { when: 1, track: 0, title: null, artist: null, source: "", place: 0, from: null },
  ]);
});

test("a token lasts for the session, null ends it", () => {
  const store = new Store();
  const token = new Token(() => store);
  assert.equal(token.value, null);
  token.value = "secret";
  assert.equal(new Token(() => store).value, "secret");
  token.value = null;
  assert.equal(new Token(() => store).value, null);
});

test("what cannot be a token is not kept as one", () => {
  assert.ok(isToken("0123456789abcdef+/=~!"));
  const store = new Store();
  for (const bad of ["", "two words", "snow\u2603man", "soft\u00adhyphen", "zero\u200bwidth"]) {
    assert.ok(!isToken(bad), bad);
    store.setItem("kzfp.token", bad);
    assert.equal(new Token(() => store).value, null, bad);
  }
});
