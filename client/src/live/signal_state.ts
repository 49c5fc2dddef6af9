// SPDX-License-Identifier: Apache-2.0
//
// Decides whether what a tile shows is live.
//
// Why so        A frozen picture that looks live is the worst thing a tile can show. So only a new picture, recognised by its
//               capture time and its age, keeps a tile live: not an open connection, nor a part that repeats the last
//               picture, nor an old picture delivered late.
// Invariants    (1) `live` means: the newest picture was captured less than the limit ago.
//               (2) Only a new picture or `end` leaves `lost`, never an attempt to reconnect.

export type SignalState =
  | { kind: "idle" }
  | { kind: "connecting" }
  | { kind: "live" }
  /** Since the capture of the last picture, or since watching began when there was none; unix milliseconds. */
  | { kind: "lost"; sinceMs: number; reason: string };

export interface Clock {
  /** Milliseconds that never jump. */
  steadyMs(): number;
  /** Unix milliseconds. */
  wallMs(): number;
}

export const kBrowserClock: Clock = { steadyMs: () => performance.now(), wallMs: () => Date.now() };

export class SignalMonitor {
  readonly #clock: Clock;
  #watching = false;
  #connected = false;
  /** When the newest picture was captured, or watching began, on the steady clock. */
  #freshAtMs = 0;
  #sinceMs = 0;
  #capturedMs = Number.NaN;
  #lostAfterMs = 0;
  #reason = "";

  constructor(clock: Clock = kBrowserClock) {
    this.#clock = clock;
  }

  /** Starts watching, or continues with another limit. */
  begin(lostAfterMs: number): void {
    this.#lostAfterMs = lostAfterMs;
    if (this.#watching) return;
    this.#watching = true;
    this.#connected = false;
    this.#reason = "";
    this.#capturedMs = Number.NaN;
    this.#freshAtMs = this.#clock.steadyMs();
    this.#sinceMs = this.#clock.wallMs();
  }

  /** A picture has come; one with the capture time of the last is the same picture sent again. */
  picture(capturedMs: number, ageMs: number): void {
    if (capturedMs === this.#capturedMs) return;
    this.#capturedMs = this.#sinceMs = capturedMs;
    this.#freshAtMs = this.#clock.steadyMs() - ageMs;
    this.#connected = true;
    this.#reason = "";
  }

  /** The connection ended or failed; `reason` is for the user. */
  disconnected(reason: string): void {
    this.#connected = false;
    this.#reason = reason;
  }

  /** Nobody looks any more. */
  end(): void {
    this.#watching = false;
  }

  state(): SignalState {
    if (!this.#watching) return { kind: "idle" };
    if (this.#clock.steadyMs() - this.#freshAtMs >= this.#lostAfterMs) {
      return { kind: "lost", sinceMs: this.#sinceMs, reason: this.#reason };
    }
    return { kind: this.#connected ? "live" : "connecting" };
  }
}
