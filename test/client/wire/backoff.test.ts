// SPDX-License-Identifier: Apache-2.0
//
// How long one waits before it reconnects.

import { Backoff } from "../../../client/src/wire/backoff";

test("back-off grows to fifteen seconds, spreads by a quarter, starts again after success", () => {
  const lowest = new Backoff(() => 0);
  const highest = new Backoff(() => 1);
  const wait = (backoff: Backoff) => Array.from({ length: 6 }, () => backoff.next() / 1000);
  expect(wait(lowest)).toEqual([0.75, 1.5, 3, 6, 11.25, 11.25]);
  expect(wait(highest)).toEqual([1.25, 2.5, 5, 10, 18.75, 18.75]);
  lowest.reset();
  expect(lowest.next()).toBe(750);
});
