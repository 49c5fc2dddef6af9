// SPDX-License-Identifier: Apache-2.0
//
// Fetches single frames of a recording.
//
// Why so        A frame is decoded from the key frame before it on. So a step back keeps the frames that are passed for
//               the steps after it.

import type { Footage } from "../wire/footage";
import { newStreamKey, type FrameStart, type Recordings } from "../wire/recordings";
import { ServerError } from "../wire/server";
import { kMaxSilenceMs, readFrames, type RecordedFrame } from "./frame_stream";

export class StillReader {
  readonly #recordings: Recordings;
  readonly #cached = new Map<number, RecordedFrame>();

  constructor(recordings: Recordings) {
    this.#recordings = recordings;
  }

  /** What follows is elsewhere: the frames that are kept are of no use there. */
  forget(): void {
    this.#cached.clear();
  }

  /**
   * Hands the frame to `show`. Rejects with a ServerError when it does not come; resolves early when `signal` is
   * aborted.
   */
  async read(
    footage: Footage,
    start: FrameStart,
    show: (frame: RecordedFrame) => Promise<void>,
    signal: AbortSignal,
  ): Promise<void> {
    const cached = this.#cached.get(start.index);
    if (cached) return show(cached);
    this.#cached.clear();
    let isShown = false;
    const open = (until: AbortSignal) => this.#recordings.play(footage, start, "one", 1, newStreamKey(), until);
    const take = async (frame: RecordedFrame) => {
      if (start.from !== undefined) this.#cached.set(frame.index, frame);
      if (frame.index < start.index) return true;
      await show(frame);
      isShown = true;
      return false;
    };
    await readFrames(open, take, signal, kMaxSilenceMs);
    if (!isShown && !signal.aborted) throw new ServerError(0, 0, "The connection was lost.");
  }
}
