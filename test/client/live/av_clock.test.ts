// SPDX-License-Identifier: Apache-2.0
//
// Video in sync with audio.

import { AudibleClock, FrameQueue, TimestampMatcher } from "../../../client/src/live/av_clock";

test("what is heard follows the audio context, and falls silent with the reports", () => {
  const clock = new AudibleClock();
  expect(clock.audibleUs(1, 0)).toBe(null);
  clock.report(5_000_000, 2, 100);
  // Rendered at 2 s of the context, of which 1.95 s are audible: the output lags by 50 ms.
  expect(clock.audibleUs(1.95, 100)).toBeCloseTo(4_950_000);
  expect(clock.audibleUs(2.25, 400)).toBeCloseTo(5_250_000);
  expect(clock.audibleUs(2.6, 601)).toBe(null);
  clock.report(null, 3, 700);
  expect(clock.audibleUs(3, 700)).toBe(null);
});

test.each<[string, sent: number[], counted: number[], found: number[]]>([
  ["a camera whose samples are longer", [0, 21, 42, 63, 84], [0, 20, 40, 60, 80], [0, 21, 42, 63, 84]],
  ["a decoder that keeps the first piece to itself", [0, 20, 40], [20, 40], [20, 40]],
  ["a piece more than was sent", [0, 20], [0, 20, 40], [0, 20, 40]],
])("time of sound, sent before it is decoded: %s", (_name, sent, counted, found) => {
  const times = new TimestampMatcher();
  for (const us of sent) times.sent(us);
  expect(counted.map((us) => times.decoded(us))).toEqual(found);
});

test.each<[string, pushed: number[], heardMs: number | null, shown: number | null, closed: number[]]>([
  ["nothing before its time", [40, 80], 39, null, []],
  ["the newest that is due, without those it overtakes", [0, 40, 80, 120], 85, 80, [0, 40]],
  ["the newest when nothing is heard", [0, 40, 80], null, 80, [0, 40]],
  ["a late one too, if it is the newest", [0], 500, 0, []],
  ["one of another time than the sound at once", [5000], 0, 5000, []],
  ["one too early rather than none: the decoder has no more to lend", Array.from({ length: 18 }, (_, n) => 100 + n), 0, 101, [100]],
])("picture to show: %s", (_name, pushed, heardMs, shown, closed) => {
  const gone: number[] = [];
  const queue = new FrameQueue(() => undefined);
  for (const ms of pushed) queue.push({ timestamp: ms * 1000, close: () => gone.push(ms) });
  expect(queue.take(heardMs === null ? null : heardMs * 1000, 0)?.timestamp ?? null).toBe(shown === null ? null : shown * 1000);
  expect(gone).toEqual(closed);
});

test("sound waits for pictures that keep coming late, as long as the least late of them; not for a burst", () => {
  const wait = vi.fn();
  const queue = new FrameQueue(wait);
  let nowMs = 0;
  const show = (pictures: number, lateMs: number, pollIntervalMs: number) => {
    for (let picture = 0; picture < pictures; picture += 1, nowMs += pollIntervalMs) {
      queue.push({ timestamp: 0, close: () => undefined });
      queue.take((lateMs + (picture % 3)) * 1000, nowMs);
    }
  };
  show(70, 300, 5);
  show(1, 20, 40);
  show(37, 120, 40);
  show(1, 20, 40);
  expect(wait).not.toHaveBeenCalled();
  show(40, 120, 40);
  expect(wait.mock.calls).toEqual([[120_000]]);
});
