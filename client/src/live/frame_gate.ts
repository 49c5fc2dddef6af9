// SPDX-License-Identifier: Apache-2.0
//
// Decides which pictures of a compressed stream the decoder gets.
//
// Why so        A picture builds on those before it, so none but all up to the next key frame can be left out. A decoder
//               that falls behind would show ever older pictures; it is better to show none until the next key frame.

/** What a network that stood still for a moment delivers at once; decoders are far faster than cameras. */
export const kLongestQueue = 20;

export type Admission =
  | "decode"
  /** Leave the picture out. */
  | "drop"
  /** Forget what waits to be decoded, and go on with this picture. */
  | "restart";

export class FrameGate {
  #waitsForKey = true;
  #behind = false;

  /** `queued` pictures wait to be decoded. */
  admit(isKey: boolean, queued: number): Admission {
    if (queued > kLongestQueue) this.#behind = this.#waitsForKey = true;
    if (!isKey) return this.#waitsForKey ? "drop" : "decode";
    // The decoder may have caught up since: then nothing has to be thrown away.
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
