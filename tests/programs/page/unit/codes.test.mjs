// Trails laid against each other, and when the page asks.

import assert from "node:assert/strict";
import { test } from "node:test";

import { countDifferent, gridStart, lay } from "../../../../web/app/codes.js";
import {
  CODE_SECONDS,
  MOMENTS,
  OWN_SPEED,
  nextMoment,
  roundsAt,
} from "../../../../web/app/schedule.js";

const ALL = 0xffffffffffffffffn;

test("bits that differ are counted in all 64", () => {
  const count = (one, other) => countDifferent(BigUint64Array.of(one), BigUint64Array.of(other));
  assert.equal(count(0n, ALL), 64);
  assert.equal(count(1n, 0n), 1);
  assert.equal(count(1n << 63n, 0n), 1);
  assert.equal(count(0x123456789abcdef0n, 0x123456789abcdef0n), 0);
  assert.equal(count(0x80000001n << 16n, 0n), 2);
});

test("a clip is laid at its place", () => {
  const track = BigUint64Array.of(1n, 2n, 3n, 4n, 5n);
  const laid = lay(BigUint64Array.of(3n, ALL), track, 2 * CODE_SECONDS);
  assert.deepEqual([...laid.track], [3n, 4n]);
  assert.equal(laid.different, 63);
  assert.equal(laid.bits, 128);
  assert.equal(laid.from, 2 * CODE_SECONDS);
});

test("codes outside the track are left out", () => {
  const track = BigUint64Array.of(1n, 2n);
  const early = lay(BigUint64Array.of(9n, 1n, 2n, 9n), track, -CODE_SECONDS);
  assert.deepEqual([...early.clip], [1n, 2n]);
  assert.equal(early.different, 0);
  assert.equal(early.from, 0);
  assert.equal(lay(BigUint64Array.of(1n), track, 1000).bits, 0);
});

test("a quicker clip takes codes further apart", () => {
  const track = BigUint64Array.from({ length: 40 }, (_, i) => BigInt(i));
  const clip = BigUint64Array.from({ length: 20 }, (_, i) => BigInt(2 * i));
  assert.equal(lay(clip, track, 0, 2).different, 0);
});

test("a clip is drawn from the track's grid on", () => {
  for (const match of [{ offset: 1 }, { offset: 0.3, tempo: 1.04 }, { offset: -3.1 }]) {
    for (const begin of [0, 5.5]) {
      const start = gridStart(match, begin);
      const codes = (match.offset + start * (match.tempo ?? 1)) / CODE_SECONDS;
      assert.ok(Math.abs(codes - Math.round(codes)) < 1e-6, `${codes}`);
      assert.ok(start >= begin && start - begin < CODE_SECONDS * 1.0001);
    }
  }
  assert.equal(gridStart({ offset: 4 * CODE_SECONDS }, 0), 0, "on the grid nothing is left out");
});

test("the moments to ask at come one by one", () => {
  const moments = [];
  for (let next = nextMoment(0); next !== undefined; next = nextMoment(next)) {
    moments.push(next);
  }
  assert.deepEqual(moments, MOMENTS);
  assert.equal(nextMoment(6), 8);
});

test("other speeds are tried once enough was heard", () => {
  const speeds = (seconds) => roundsAt(seconds).flat().map((reading) => reading.speed);
  assert.deepEqual(new Set(speeds(8)), new Set([1]));
  assert.deepEqual(new Set(speeds(11)), new Set([1, 1.04, 0.96]));
  assert.ok(roundsAt(11)[0].every((reading) => reading.speed === 1), "its own speed comes first");
});

test("readings begin evenly apart within a code", () => {
  const skipped = OWN_SPEED.map((reading) => reading.skipped / CODE_SECONDS);
  assert.deepEqual(skipped, [0, 0.25, 0.5, 0.75]);
});
