// SPDX-License-Identifier: Apache-2.0
//
// Decides which frames of a compressed stream the decoder gets.
//
// Why so        A frame depends on those before it, so only all up to the next key frame can be dropped. A decoder that
//               falls behind would show ever older frames; it is better to show none until the next key frame.

/** What a network delivers at once after a stall; decoders are far faster than cameras. */
export const kMaxQueuedFrames = 20;

export type FrameDecision =
  | "decode"
  /** Leave the frame out. */
  | "drop"
  /** Discard what waits to be decoded, and continue with this frame. */
  | "restart";

export class FrameGate {
  #waitsForKey = true;
  #behind = false;

  /** `queued` frames wait to be decoded. */
  admit(isKey: boolean, queued: number): FrameDecision {
    if (queued > kMaxQueuedFrames) this.#behind = this.#waitsForKey = true;
    if (!isKey) return this.#waitsForKey ? "drop" : "decode";
    // The decoder may have caught up since: then nothing has to be discarded.
    const restart = this.#behind && queued > 0;
    this.#waitsForKey = this.#behind = false;
    return restart ? "restart" : "decode";
  }

  /** The decoder is a new one, or was reset. */
  begin(): void {
    this.#waitsForKey = true;
    this.#behind = false;
  }
}
