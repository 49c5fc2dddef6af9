// SPDX-License-Identifier: Apache-2.0
//
// Audio without gaps, although it comes in bursts.

import { JitterBuffer } from "../../../client/src/live/jitter_buffer";

/**
 * Plays pieces of 20 ms at 8 kHz, of which each sample is its own number; returns what `pull` gave, 10 ms at a time.
 */
class Player {
  readonly buffer: JitterBuffer;
  #pushed = 0;

  constructor(outputRate = 8000) {
    this.buffer = new JitterBuffer(outputRate);
  }

  push(pieces: number, jumpMs = 0): void {
    for (let piece = 0; piece < pieces; piece += 1, this.#pushed += 160) {
      const samples = Float32Array.from({ length: 160 }, (_, index) => this.#pushed + index);
      this.buffer.push({ timestampUs: this.#pushed * 125 + jumpMs * 1000, rate: 8000, channels: [samples] });
    }
  }

  /** The stream times in ms at which each 10 ms began. */
  pull(times: number): (number | null)[] {
    return Array.from({ length: times }, () => {
      const output = [new Float32Array(80), new Float32Array(80)];
      const startUs = this.buffer.pull(output);
      expect(output[1], "one channel is heard on both sides").toEqual(output[0]);
      if (startUs === null) expect(output[0]!.every((sample) => sample === 0)).toBe(true);
      return startUs === null ? null : startUs / 1000;
    });
  }
}

test("jitter: plays without a gap once enough is here, every sample once", () => {
  const player = new Player();
  player.push(2);
  expect(player.pull(2)).toEqual([null, null]);
  player.push(1);
  const heard: number[] = [];
  for (let turn = 0; turn < 50; turn += 1) {
    const output = [new Float32Array(160)];
    expect(player.buffer.pull(output)).toBe(turn * 20_000);
    heard.push(...output[0]!);
    player.push(1);
  }
  expect(heard).toEqual(heard.map((_, index) => index));
});

test("jitter: what has come beyond the wanted delay is left out before it begins", () => {
  const player = new Player();
  player.buffer.postpone(10);
  player.push(3);
  expect(player.pull(1)).toEqual([null]);
  player.push(1);
  expect(player.pull(2)).toEqual([10, 20]);
});

test("jitter: after running dry it gathers more than before, and less again when nothing runs dry for minutes", () => {
  const player = new Player();
  const runDry = () => player.pull(60).lastIndexOf(null) >= 0;
  const gathered = () => {
    let pieces = 0;
    for (; player.pull(1)[0] === null; pieces += 1) player.push(1);
    return pieces;
  };
  const before = gathered();
  expect(runDry()).toBe(true);
  const after = gathered();
  expect(after - before, "pieces of 20 ms").toBe(2);
  let delayMs = 0;
  for (let turn = 0; turn < 8000; turn += 1) {
    player.push(1);
    const [, at] = player.pull(2);
    expect(at).not.toBeNull();
    delayMs = (turn + 1) * 20 - at!;
  }
  expect(delayMs).toBeLessThan(before * 20 * 1.3 + 20);
});

test.each([
  ["of a burst the oldest is left out", 50, 0, 1120 - 120 - 250, 1120],
  ["another stream's time empties it", 6, 60_000, 60_140, 60_140],
])("jitter: %s", (_name, pieces, jumpMs, fromMs, toMs) => {
  const player = new Player();
  player.push(6);
  player.pull(1);
  player.push(pieces, jumpMs);
  const [at] = player.pull(1);
  expect(at).toBeGreaterThanOrEqual(fromMs);
  expect(at).toBeLessThanOrEqual(toMs);
});

test("jitter: a device of twice the rate hears what lies between two samples, also of two pieces", () => {
  const player = new Player(16_000);
  player.push(3);
  const output = [new Float32Array(900)];
  player.buffer.pull(output);
  expect([...output[0]!]).toEqual(Array.from({ length: 900 }, (_, index) => index / 2));
});

test("jitter: a clock that runs apart is followed, in both directions, without a gap", () => {
  for (const push of [1.003, 0.997]) {
    const player = new Player();
    player.push(6);
    player.pull(1);
    let pushed = 6;
    const delaysMs: number[] = [];
    for (let turn = 1; turn <= 6000; turn += 1) {
      const due = Math.floor(6 + push * turn * 0.5) - pushed;
      player.push(due);
      pushed += due;
      const output = [new Float32Array(80)];
      delaysMs.push(pushed * 20 - (player.buffer.pull(output) ?? NaN) / 1000);
    }
    expect(Math.min(...delaysMs)).toBeGreaterThan(0);
    expect(Math.max(...delaysMs)).toBeLessThan(250);
  }
});
