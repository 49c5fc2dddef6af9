// SPDX-License-Identifier: Apache-2.0
//
// Decides whether what a tile shows is live.
//
// Why so        A frozen picture that looks live is the worst thing a tile can show. So only a new picture, recognised
//               by its capture time and its age, keeps a tile live: not an open connection, nor a part that repeats the
//               last picture, nor an old picture delivered late.
// Invariants    (1) `live` means: the newest picture was captured less than the limit ago.
//               (2) Only a new picture or `end` leaves `lost`, never an attempt to reconnect.

export type SignalState =
  | { kind: "idle" }
  | { kind: "connecting" }
  | { kind: "live" }
  /** Since the capture of the last picture that was seen, unix milliseconds; null when there was none. */
  | { kind: "lost"; sinceMs: number | null; reason: string };

export class SignalMonitor {
  readonly #steadyMs: () => number;
  #watching = false;
  #connected = false;
  /** When the newest picture was captured, or watching began, on the steady clock. */
  #freshAtMs = 0;
  #capturedMs = Number.NaN;
  #lostAfterMs = 0;
  #reason = "";

  /** `steadyMs` gives milliseconds that never jump. */
  constructor(steadyMs = () => performance.now()) {
    this.#steadyMs = steadyMs;
  }

  /** Starts watching, or continues with another limit. */
  begin(lostAfterMs: number): void {
    this.#lostAfterMs = lostAfterMs;
    if (this.#watching) return;
    this.#watching = true;
    this.#connected = false;
    this.#reason = "";
    this.#capturedMs = Number.NaN;
    this.#freshAtMs = this.#steadyMs();
  }

  /** A picture has come; one with the capture time of the last is the same picture sent again. */
  picture(capturedMs: number, ageMs: number): void {
    if (capturedMs === this.#capturedMs) return;
    this.#capturedMs = capturedMs;
    this.#freshAtMs = this.#steadyMs() - ageMs;
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
    if (this.#steadyMs() - this.#freshAtMs >= this.#lostAfterMs) {
      return { kind: "lost", sinceMs: Number.isNaN(this.#capturedMs) ? null : this.#capturedMs, reason: this.#reason };
    }
    return { kind: this.#connected ? "live" : "connecting" };
  }
}
