// SPDX-License-Identifier: Apache-2.0
//
// Keeps one picture on the screen live: runs a source, reconnects with growing delays, and watches the signal.

import { Backoff } from "../wire/backoff";
import { delay } from "../wire/delay";
import { ServerError } from "../wire/server";
import { SignalMonitor, type SignalState } from "./signal_state";
import type { Frame, LiveSource } from "./source";

export class Feed {
  readonly #show: (frame: Frame) => void;
  readonly #changed: () => void;
  readonly #monitor = new SignalMonitor();
  #source: LiveSource | null = null;
  #run: AbortController | null = null;
  #failure: ServerError | null = null;

  /**
   * `show` draws and closes a frame; `changed` is called when the state may have changed by something other than time.
   */
  constructor(show: (frame: Frame) => void, changed: () => void) {
    this.#show = show;
    this.#changed = changed;
  }

  /** Null while stopped. */
  get source(): LiveSource | null {
    return this.#source;
  }

  /** What the last attempt failed with, until a picture comes. */
  get failure(): ServerError | null {
    return this.#failure;
  }

  /** Changes with time too: ask again about twice a second. */
  state(): SignalState {
    return this.#monitor.state();
  }

  /** Starts, or changes to another source without losing what is known of the signal. */
  play(source: LiveSource): void {
    if (source === this.#source) return;
    this.#run?.abort();
    this.#run = new AbortController();
    this.#source = source;
    this.#failure = null;
    void this.#keepRunning(source, this.#run.signal);
    this.#changed();
  }

  /** Closes the connection. */
  stop(): void {
    this.#run?.abort();
    this.#run = this.#source = null;
    this.#monitor.end();
    this.#changed();
  }

  async #keepRunning(source: LiveSource, signal: AbortSignal): Promise<void> {
    const backoff = new Backoff();
    const show = (frame: Frame) => {
      const before = this.#monitor.state().kind;
      backoff.reset();
      this.#failure = null;
      this.#monitor.picture(frame.capturedMs, frame.ageMs);
      this.#show(frame);
      if (this.#monitor.state().kind !== before) this.#changed();
    };
    while (!signal.aborted) {
      // A source may get its pictures in another way from one attempt to the next.
      this.#monitor.begin(source.lostAfterMs);
      let failure: ServerError | null = null;
      try {
        await source.run(show, signal);
      } catch (error) {
        failure = error instanceof ServerError ? error : new ServerError(0, 0, "The picture cannot be shown.");
      }
      if (signal.aborted) return;
      this.#failure = failure;
      this.#monitor.disconnected(failure?.message ?? "");
      this.#changed();
      await delay(backoff.next(), signal);
    }
  }
}
