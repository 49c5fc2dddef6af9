// SPDX-License-Identifier: Apache-2.0
//
// What it means that the server has ended a stream.
//
// Why so        The server cannot be asked whether this player was preempted, so that is concluded from how the stream
//               ended: at the tail of what is still being recorded the server waits for more, and only then ends it.

import type { Footage } from "../wire/footage";
import { isTemporary } from "../wire/outage";
import type { Recordings } from "../wire/recordings";
import type { ServerError } from "../wire/server";

/** The server waits longer for what is still being recorded, and not at all when another player takes over. */
const kTailSilenceMs = 1_500;

export type StreamEnd =
  /** More: another stream continues from here. The footage is as the server has it now. */
  | { kind: "more" | "ended" | "preempted"; footage: Footage }
  /** The server does not answer. */
  | { kind: "lost" }
  /** There is no such footage any more, or not for this user. */
  | { kind: "removed" };

/** The last frame of a stream, and how long ago it came. */
export interface LastFrame {
  index: number;
  ageMs: number;
  rate: number;
  /** Frames of the whole footage, as far as is known. */
  frameCount: number;
  /** The server says that there is nothing more. */
  isWhole: boolean;
}

/** `before` is the footage as it was known while the stream ran. */
export async function streamEnd(recordings: Recordings, before: Footage, last: LastFrame): Promise<StreamEnd> {
  if (last.isWhole && !before.isGrowing) return { kind: "ended", footage: before };
  const wasAtTail = last.isWhole || (before.isGrowing && last.ageMs >= kTailSilenceMs);
  const footage = await recordings.find(before).catch((error: ServerError) => (isTemporary(error) ? "lost" : before));
  if (footage === "lost") return { kind: "lost" };
  if (!footage) return { kind: "removed" };
  if (!wasAtTail) return { kind: "preempted", footage };
  const frameCount = Math.max(last.frameCount, footage.frameCount);
  const isAtEnd = !footage.isGrowing && (last.isWhole || last.index + Math.max(1, last.rate) >= frameCount);
  return { kind: isAtEnd ? "ended" : "more", footage };
}
