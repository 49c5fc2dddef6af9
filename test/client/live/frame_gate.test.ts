// SPDX-License-Identifier: Apache-2.0
//
// Which frames a decoder gets that falls behind.

import { FrameGate, kMaxQueuedFrames } from "../../../client/src/live/frame_gate";

test.each<[string, [isKey: boolean, queued: number, admission: string][]]>([
  ["starts at a key frame", [[false, 0, "drop"], [true, 0, "decode"], [false, 1, "decode"]]],
  ["a short backlog is no reason to leave anything out", [[true, 0, "decode"], [false, kMaxQueuedFrames, "decode"]]],
  [
    "behind: all is left out up to the next key frame, which throws the backlog away",
    [[true, 0, "decode"], [false, kMaxQueuedFrames + 1, "drop"], [false, 3, "drop"], [true, 2, "restart"], [false, 1, "decode"]],
  ],
  ["behind, but caught up by the key frame", [[true, 0, "decode"], [false, kMaxQueuedFrames + 1, "drop"], [true, 0, "decode"]]],
  ["behind at the key frame itself", [[true, 0, "decode"], [true, kMaxQueuedFrames + 1, "restart"]]],
])("decoder %s", (_name, steps) => {
  const gate = new FrameGate();
  for (const [isKey, queued, admission] of steps) expect(gate.admit(isKey, queued)).toBe(admission);
});
