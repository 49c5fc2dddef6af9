// SPDX-License-Identifier: Apache-2.0
//
// Segments out of the recording log's run lengths.

import { segmentsOf, overlapping } from "../../../client/src/playback/coverage";
import type { Footage } from "../../../client/src/wire/footage";
import type { Runs } from "../../../client/src/wire/recordings";

test.each<[string, Runs, [number, number, boolean][]]>([
  ["holes are left out", [[0, 2], [1, 3], [0, 1], [2, 1]], [[110, 125, false], [130, 135, true]]],
  ["the last step is cut at the end of the span", [[1, 100]], [[100, 200, false]]],
  ["nothing of a run that lies behind it", [[0, 20], [1, 5]], []],
  ["a damaged count moves nothing backwards", [[1, -3], [1, 1]], [[100, 105, false]]],
])("segments: %s", (_name, runs, segments) => {
  expect(segmentsOf(100, 200, 5, runs).map(({ startS, stopS, isEvent }) => [startS, stopS, isEvent])).toEqual(segments);
});

test("a recording is on the screen however many marks within it have ended before", () => {
  const footage = [[0, 100], ...Array.from({ length: 20 }, (_, at) => [10 + at, 11 + at])].map(([start, stop]) => ({ start, stop }) as Footage);
  expect(overlapping(footage, 50, 60)).toEqual([footage[0]]);
});
