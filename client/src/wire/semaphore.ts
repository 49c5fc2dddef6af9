// SPDX-License-Identifier: Apache-2.0
//
// Lets a fixed number of requests run at a time; the others wait in order.

export class Semaphore {
  #free: number;
  readonly #waiting: (() => void)[] = [];

  constructor(maxConcurrent: number) {
    this.#free = maxConcurrent;
  }

  /** Runs `work` as soon as it may. Rejects without running it when `signal` is aborted while it waits. */
  async run<Result>(signal: AbortSignal, work: () => Promise<Result>): Promise<Result> {
    if (this.#free > 0) this.#free -= 1;
    else await this.#wait(signal);
    try {
      signal.throwIfAborted();
      return await work();
    } finally {
      const next = this.#waiting.shift();
      if (next) next();
      else this.#free += 1;
    }
  }

  #wait(signal: AbortSignal): Promise<void> {
    return new Promise((resolve, reject) => {
      const giveUp = () => {
        this.#waiting.splice(this.#waiting.indexOf(start), 1);
        reject(signal.reason);
      };
      const start = () => {
        signal.removeEventListener("abort", giveUp);
        resolve();
      };
      signal.addEventListener("abort", giveUp, { once: true });
      this.#waiting.push(start);
    });
  }
}
