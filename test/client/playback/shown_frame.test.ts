// SPDX-License-Identifier: Apache-2.0
//
// Where the playhead is with each frame, repeated ones too.

import { ShownFrame } from "../../../client/src/playback/shown_frame";

test("only a frame that was shown is repeated; the first is due at its own time, or at that which was asked for", () => {
  const shown = new ShownFrame();
  const positions = [
    { index: 40, capturedMs: 5000 },
    { index: 41, capturedMs: 5000 },
    { index: 43, capturedMs: 5000 },
    { index: 44, capturedMs: 8500 },
  ];
  const play = () =>
    positions.map((frame) => {
      shown.take({ ...frame, jpeg: new Uint8Array() } as unknown as Parameters<ShownFrame["take"]>[0]);
      return shown.positionMs;
    });
  for (const askedMs of [5000, 4990]) {
    shown.reset(askedMs);
    expect(play()).toEqual([5000, 6000, 8000, 8500]);
  }
  // A picture that was taken long before the time that was asked for holds up no other camera.
  shown.begin(7500);
  expect(play()).toEqual([7500, 8500, 10500, 8500]);
});
