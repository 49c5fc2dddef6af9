// SPDX-License-Identifier: Apache-2.0
//
// Which days the server is asked for.

import { midnight, midnights, requestsFor } from "../../../client/src/playback/recorded_days";

const kHourMs = 3_600_000;

test("days are asked for in runs of 24 hours, cut where the clock is changed and at what the server answers at once", () => {
  const day = 24 * kHourMs;
  const spring = [0, day, 2 * day - kHourMs, 3 * day - kHourMs];
  expect(requestsFor(spring)).toEqual([{ startMs: 0, count: 2 }, { startMs: 2 * day - kHourMs, count: 2 }]);
  const many = Array.from({ length: 130 }, (_, index) => index * day);
  expect(requestsFor(many).map(({ count }) => count)).toEqual([128, 2]);
  const start = midnight(Date.UTC(2026, 2, 20, 15));
  expect(midnights(start + kHourMs, start + 3 * day + 1)).toEqual([0, 1, 2, 3].map((days) => midnight(start, days)));
});
