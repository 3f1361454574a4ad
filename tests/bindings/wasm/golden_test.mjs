// The golden files of the C libraries, held against the module in Node.

import assert from "node:assert/strict";
import { test } from "node:test";

import { documentDigest, goldenDocuments, goldenTrails, trailDigest } from "./sounds.mjs";
import { goldenText, importOf } from "./support.mjs";

const { load } = await importOf("index.js");
const kz = await load();

for (const algorithm of ["fixed", "float"]) {
  const documents = goldenDocuments(goldenText("documents"), algorithm);

  test(`there are ${algorithm} documents to compare`, () => {
    assert.ok(documents.length >= 20, `${documents.length}`);
  });
  for (const each of documents) {
    test(`the ${algorithm} document of ${each.name}`, () => {
      assert.equal(documentDigest(kz, each, algorithm), each.digest);
    });
  }
}

const trails = goldenTrails(goldenText("catalogue"));

test("there are trails to compare", () => assert.ok(trails.length >= 15, `${trails.length}`));
for (const each of trails) {
  test(`the trail of ${each.name}`, () => {
    assert.equal(trailDigest(kz, each), `${each.codes} ${each.digest}`);
  });
}
