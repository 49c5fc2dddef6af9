// SPDX-License-Identifier: Apache-2.0
//
// What is asked for an outline, and when it is asked for again.

import { FootageOutline, outlineOf } from "../../../client/src/playback/footage_outline";
import type { Recordings } from "../../../client/src/wire/recordings";

const kDayMs = 86_400_000;
const kNow = Date.UTC(2026, 2, 27);

test.each([
  ["five days on a phone", 5, 360],
  ["a month", 30, 1400],
  ["ninety days on a wide screen", 90, 3840],
  ["five days on six screens", 5, 12_000],
])("%s: a step is no more than a pixel, and the server takes as many", (_name, days, widthPx) => {
  const msPerPx = (days * kDayMs) / widthPx;
  const startMs = kNow - days * kDayMs;
  const { fromS, toS, stepS } = outlineOf(startMs, msPerPx, widthPx);
  expect((toS - fromS) / stepS).toBeLessThanOrEqual(20_000);
  if (widthPx < 5_000) expect(stepS * 1000).toBeLessThanOrEqual(msPerPx);
  expect(stepS * 2000).toBeGreaterThan(msPerPx);
  expect(fromS * 1000).toBeLessThan(startMs);
  expect(toS * 1000).toBeGreaterThan(startMs + days * kDayMs);
});

describe("an outline", () => {
  beforeEach(() => void vi.useFakeTimers({ now: kNow }));
  afterEach(() => void vi.useRealTimers());

  /** What is asked for, and its answers as they are given. */
  function loaded() {
    const asked: { steps: number; cameras: readonly number[]; answer(): Promise<void> }[] = [];
    const recordings = {
      outline: (fromS: number, toS: number, stepS: number, cameras: readonly number[]) =>
        new Promise((resolve) => {
          const lanes = cameras.map((camera) => ({ camera_id: camera, continuous: [[stepS, stepS]], alarm: [], alert: [], pos: [] }));
          asked.push({ steps: (toS - fromS) / stepS, cameras, answer: async () => (resolve(lanes), vi.advanceTimersByTimeAsync(0).then(() => undefined)) });
        }),
    };
    const outline = new FootageOutline(recordings as unknown as Recordings, () => undefined);
    const load = (days: number, cameras = [1, 2], backDays = 0) =>
      outline.load(cameras, kNow - (days + backDays) * kDayMs, (days * kDayMs) / 1000, 1000);
    return { asked, outline, load };
  }

  test("is asked for once, and again for another camera, zoom, or place beyond its margin", async () => {
    const { asked, load } = loaded();
    const rows: [load: () => void, requests: number][] = [
      [() => load(20), 1],
      [() => load(20), 1],
      [() => load(20, [2]), 1],
      [() => load(20, [1, 2], 9), 1],
      [() => load(20, [1, 2], 11), 2],
      [() => load(20, [1, 2, 3], 11), 3],
      [() => load(60, [1, 2, 3], 11), 4],
      [() => load(60, [], 11), 4],
    ];
    for (const [ask, requests] of rows) {
      ask();
      await vi.advanceTimersByTimeAsync(0);
      expect(asked.length).toBe(requests);
      await asked.at(-1)!.answer();
    }
  });

  test("of many cameras is asked for in parts that the server takes", async () => {
    const { asked, outline, load } = loaded();
    const cameras = Array.from({ length: 300 }, (_, i) => i + 1);
    load(20, cameras);
    for (let part = 0; !outline.get(300) && part < 300; part += 1) {
      await vi.advanceTimersByTimeAsync(0);
      await asked[part]!.answer();
    }
    expect(asked.flatMap((one) => one.cameras)).toEqual(cameras);
    for (const one of asked) expect(one.cameras.length * one.steps).toBeLessThanOrEqual(400_000);
  });

  test("that reaches the present is asked for again after a while", async () => {
    const { asked, load } = loaded();
    load(20);
    await vi.advanceTimersByTimeAsync(0);
    await asked[0]!.answer();
    vi.setSystemTime(kNow + 10_000);
    load(20);
    await vi.advanceTimersByTimeAsync(0);
    expect(asked.length).toBe(1);
    vi.setSystemTime(kNow + 60_000);
    load(20, [1, 2], -60_000 / kDayMs);
    await vi.advanceTimersByTimeAsync(0);
    expect(asked.length).toBe(2);
  });

  test("of a zoom that was left does not take the place of the one that is shown", async () => {
    const { asked, outline, load } = loaded();
    load(20);
    load(60);
    await vi.advanceTimersByTimeAsync(0);
    await asked[1]!.answer();
    const shown = outline.get(1);
    await asked[0]!.answer();
    expect(outline.get(1)).toBe(shown);
    load(20);
    load(60);
    await vi.advanceTimersByTimeAsync(0);
    await asked[2]!.answer();
    expect(outline.get(1), "the view is back before the answer comes").toBe(shown);
  });
});
