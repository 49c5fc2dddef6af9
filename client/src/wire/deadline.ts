// SPDX-License-Identifier: Apache-2.0
//
// Aborts a request when its owner does, or when nothing has come from the server for too long.

export class Deadline {
  readonly #abort = new AbortController();
  readonly #owner: AbortSignal | undefined;
  readonly #onOwnerAbort = () => this.#abort.abort();
  #timer: ReturnType<typeof setTimeout> | undefined;

  /** Runs from now on; call `extend` when data comes, `suspend` while none is read, and `release` at the end. */
  constructor(
    readonly timeoutMs: number,
    owner?: AbortSignal,
  ) {
    this.#owner = owner;
    owner?.addEventListener("abort", this.#onOwnerAbort);
    if (owner?.aborted) this.#abort.abort();
    this.extend();
  }

  /** Hand this to fetch. */
  get signal(): AbortSignal {
    return this.#abort.signal;
  }

  extend(): void {
    clearTimeout(this.#timer);
    this.#timer = setTimeout(() => this.#abort.abort(), this.timeoutMs);
  }

  /** Until `extend` is called. */
  suspend(): void {
    clearTimeout(this.#timer);
  }

  /** Closes the request as well, if it is still open. */
  release(): void {
    clearTimeout(this.#timer);
    this.#owner?.removeEventListener("abort", this.#onOwnerAbort);
    this.#abort.abort();
  }
}
