// SPDX-License-Identifier: Apache-2.0
//
// How long to wait before the next attempt to reconnect: 1, 2, 4, 8, then 15 seconds, each spread by a quarter, so that
// the tiles of many viewers do not all come back in the same moment after the server restarts.

const kFirstMs = 1_000;
const kMaxMs = 15_000;
const kSpread = 0.25;

export class Backoff {
  #nextMs = kFirstMs;
  readonly #random: () => number;

  /** `random` gives numbers from 0 up to 1, as Math.random does. */
  constructor(random: () => number = Math.random) {
    this.#random = random;
  }

  /** The wait in milliseconds before the next attempt. */
  next(): number {
    const baseMs = this.#nextMs;
    this.#nextMs = Math.min(baseMs * 2, kMaxMs);
    return baseMs * (1 - kSpread + 2 * kSpread * this.#random());
  }

  /** Call when an attempt succeeded. */
  reset(): void {
    this.#nextMs = kFirstMs;
  }
}
