// SPDX-License-Identifier: Apache-2.0
//
// What a player tells of itself, and the rates that it has.

export type PlayerState =
  /** There is nothing to play. */
  | { kind: "empty" }
  | { kind: "opening" | "playing" | "paused" | "ended" }
  /** The server ended the stream before its end: another player of this session has taken over. */
  | { kind: "preempted" }
  /**
   * The connection was lost, or there is none yet; it is tried again until it is back, and playback continues at the
   * frame on the screen, if there is one.
   */
  | { kind: "lost" }
  | { kind: "failed"; reason: string };

/** Below 0 slow motion by that factor; n above 1 shows every n-th frame. */
export const kRates = [-8, -4, -2, 1, 2, 4, 8, 16] as const;
