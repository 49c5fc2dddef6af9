// SPDX-License-Identifier: Apache-2.0
//
// Converts between frame numbers and times of a recording, as exactly as is possible without asking the server.
//
// Why so        A stream numbers its frames, the timeline knows times. A list gives a recording's first and last second and
//               its number of frames; a camera of varying frame rate deviates from the straight line between. Each frame that
//               was fetched by its time is exact, so the line is bent to pass through it.

interface Anchor {
  index: number;
  ms: number;
}

const kMaxAnchors = 64;
/** Where the number of frames is unknown. */
const kAssumedFramesPerSecond = 10;

export class FrameClock {
  #end: Anchor;
  /** By index and by time at once, without the end. */
  #anchors: Anchor[] = [{ index: 0, ms: 0 }];

  constructor(frameCount: number, durationMs: number) {
    this.#end = endOf(frameCount, durationMs);
  }

  /** A recording that grows has a later end. */
  extend(frameCount: number, durationMs: number): void {
    this.#end = endOf(frameCount, durationMs);
  }

  /** The frame is known to be of this time. */
  learn(index: number, ms: number): void {
    const before = this.#anchors.filter((anchor) => anchor.index < index && anchor.ms < ms);
    const after = this.#anchors.filter((anchor) => anchor.index > index && anchor.ms > ms);
    this.#anchors = [...before, { index, ms }, ...after].slice(-kMaxAnchors);
  }

  msOf(index: number): number {
    const [from, to] = this.#around((anchor) => anchor.index <= index);
    return from.ms + ((index - from.index) * (to.ms - from.ms)) / (to.index - from.index);
  }

  /** The last frame at or before the time. */
  indexOf(ms: number): number {
    const [from, to] = this.#around((anchor) => anchor.ms <= ms);
    const index = from.index + ((ms - from.ms) * (to.index - from.index)) / (to.ms - from.ms);
    // A time that came from an index leads back to it, whatever rounding did.
    return Math.max(0, Math.floor(index + 1e-6));
  }

  #around(isBefore: (anchor: Anchor) => boolean): [Anchor, Anchor] {
    const at = Math.max(0, this.#anchors.findLastIndex(isBefore));
    const from = this.#anchors[at]!;
    const next = this.#anchors[at + 1] ?? this.#end;
    if (next.index > from.index && next.ms > from.ms) return [from, next];
    // Past the end, as fast as on the whole.
    return [from, { index: from.index + this.#end.index, ms: from.ms + this.#end.ms }];
  }
}

function endOf(frameCount: number, durationMs: number): Anchor {
  const ms = Math.max(durationMs, 1000);
  return { index: frameCount > 0 ? frameCount : (ms / 1000) * kAssumedFramesPerSecond, ms };
}
