// SPDX-License-Identifier: Apache-2.0
//
// Which tiles stream.

import { chooseStreams, streamLimit } from "../../../client/src/live/stream_budget";

test.each([
  ["h2", true],
  ["h3", true],
  ["http/1.1", false],
  ["", false],
  [undefined, false],
])("protocol %s lets every tile stream: %s", (protocol, every) => {
  expect(streamLimit(protocol)).toBe(every ? Infinity : 4);
});

test.each([
  ["from the top", [1, 2, 3, 4, 5, 6], [], 4, [1, 2, 3, 4]],
  ["who streams goes on", [1, 2, 3, 4, 5, 6], [5, 6], 4, [5, 6, 1, 2]],
  ["who is scrolled away makes room", [3, 4, 5, 6], [1, 2, 3, 4], 4, [3, 4, 5, 6]],
  ["more streaming than allowed", [1, 2, 3], [1, 2, 3], 2, [1, 2]],
  ["no limit", [1, 2, 3, 4, 5, 6], [], Infinity, [1, 2, 3, 4, 5, 6]],
  ["nothing on the screen", [], [1, 2], 4, []],
])("streams: %s", (_name, visible, streaming, limit, chosen) => {
  expect([...chooseStreams(visible, new Set(streaming), limit)]).toEqual(chosen);
});
