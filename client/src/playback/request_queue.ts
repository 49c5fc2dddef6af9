// SPDX-License-Identifier: Apache-2.0
//
// Runs requests a few at a time, each at most once at a time, and holds back those that failed a moment ago.

import { Semaphore } from "../wire/semaphore";
import { ServerError } from "../wire/server";

const kRetryMs = 5_000;
const kMaxConcurrent = 2;

export class RequestQueue {
  readonly #semaphore = new Semaphore(kMaxConcurrent);
  readonly #running = new Map<string, Promise<void>>();
  readonly #retryAtMs = new Map<string, number>();
  #error = "";

  /** What the last request failed with, for the user; empty when it succeeded. */
  get error(): string {
    return this.#error;
  }

  get isBusy(): boolean {
    return this.#running.size > 0;
  }

  /**
   * Runs a request, or joins the one of the same key that is running. Resolves also when it failed, and at once when it
   * failed less than five seconds ago.
   */
  run(key: string, request: () => Promise<void>): Promise<void> {
    const running = this.#running.get(key);
    if (running) return running;
    if (performance.now() < (this.#retryAtMs.get(key) ?? 0)) return Promise.resolve();
    const started = this.#semaphore
      .run(new AbortController().signal, request)
      .then(
        () => {
          this.#error = "";
          this.#retryAtMs.delete(key);
        },
        (error: unknown) => {
          this.#error = error instanceof ServerError ? error.message : String(error);
          this.#retryAtMs.set(key, performance.now() + kRetryMs);
        },
      )
      .finally(() => this.#running.delete(key));
    this.#running.set(key, started);
    return started;
  }
}
