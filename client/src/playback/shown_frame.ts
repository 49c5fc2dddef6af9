// SPDX-License-Identifier: Apache-2.0
//
// Which frame is on the screen, and what time it is there.
//
// Why so        The caption tells when the picture was taken. A slow camera's picture is repeated each second until the
//               next comes: the playhead continues meanwhile.

import type { RecordedFrame } from "./frame_stream";

/** The server repeats a picture when the next is further away. */
export const kMaxFrameMs = 1_000;

export class ShownFrame {
  #index = 0;
  #capturedMs = 0;
  #positionMs = 0;
  /** When the first frame of a run, which repeats nothing, is due at the earliest; null once it is shown. */
  #dueFromMs: number | null = null;
  /** By performance.now(). */
  #shownMs = 0;

  get index(): number {
    return this.#index;
  }

  /** Unix milliseconds at which the picture was taken; before the first one, of the time that was asked for. */
  get capturedMs(): number {
    return this.#capturedMs;
  }

  /** The same, but going on while the picture is repeated. */
  get positionMs(): number {
    return this.#positionMs;
  }

  /** How long ago it came, in milliseconds. */
  get ageMs(): number {
    return performance.now() - this.#shownMs;
  }

  /** Whether a frame was shown since `begin`. */
  get hasBegun(): boolean {
    return this.#dueFromMs === null;
  }

  /** Nothing of a recording is shown yet, of which that time was asked for. */
  reset(atMs: number): void {
    this.#index = 0;
    this.#dueFromMs = -Infinity;
    this.#capturedMs = this.#positionMs = atMs;
  }

  /** A stream begins at that time; a slow camera's first picture may have been taken long before. */
  begin(atMs: number): void {
    this.#dueFromMs = atMs;
  }

  /** The position at which a frame is to be shown that follows. */
  positionOf({ index, capturedMs }: RecordedFrame): number {
    if (this.#dueFromMs !== null) return Math.max(capturedMs, this.#dueFromMs);
    const isRepeated = capturedMs === this.#capturedMs && index > this.#index;
    return isRepeated ? this.#positionMs + (index - this.#index) * kMaxFrameMs : capturedMs;
  }

  take(frame: RecordedFrame): void {
    this.#positionMs = this.positionOf(frame);
    this.#capturedMs = frame.capturedMs;
    this.#index = frame.index;
    this.#dueFromMs = null;
    this.#shownMs = performance.now();
  }
}
