// SPDX-License-Identifier: Apache-2.0
//
// Frame numbers and times of a recording.

import { FrameClock } from "../../../client/src/playback/frame_clock";

test("a frame that was fetched by its time bends the line, and every index leads back to itself", () => {
  const clock = new FrameClock(1000, 100_000);
  expect([clock.indexOf(50_000), clock.msOf(500)]).toEqual([500, 50_000]);
  clock.learn(200, 50_000);
  expect([clock.msOf(200), clock.indexOf(25_000), clock.indexOf(75_000)]).toEqual([50_000, 100, 600]);
  for (let index = 0; index < 1500; index += 7) expect(clock.indexOf(clock.msOf(index))).toBe(index);
  // Knowledge that contradicts older knowledge takes its place.
  clock.learn(300, 40_000);
  expect(clock.msOf(300)).toBe(40_000);
  expect(new FrameClock(0, 0).msOf(0)).toBe(0);
});
