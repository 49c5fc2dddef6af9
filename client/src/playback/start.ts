// SPDX-License-Identifier: Apache-2.0
//
// Where playing begins, or what a still shows: a frame, or the frame of a time, which only the server knows.

import type { Footage } from "../wire/footage";
import type { FrameStart } from "../wire/recordings";

/** `atMs`: Unix milliseconds. */
export type Start = FrameStart | { atMs: number };

/** How many frames a step back fetches. */
const kStepBackFrames = 12;

export function startAt({ start, frameCount }: Footage, atMs: number): Start {
  // How many frames a mark has is not known.
  return atMs <= start * 1000 && frameCount > 0 ? { index: 0 } : { atMs: Math.round(atMs) };
}

/**
 * The start of a step by so many frames to `index`. The frames before come with a step back, since more such steps may
 * follow.
 */
export function startOfStep(index: number, by: number): Start {
  return by < 0 ? { index, from: Math.max(0, index - kStepBackFrames + 1) } : { index };
}
