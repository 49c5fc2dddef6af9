// SPDX-License-Identifier: Apache-2.0
//
// Zoom and ticks of the timeline.

import { TimeScale } from "../../../../client/src/ui/timeline/time_scale";

const kHourMs = 3_600_000;

test("zooming leaves the time under the pointer in place, and ends at seconds and at a month", () => {
  const scale = TimeScale.of(0, 24 * kHourMs, 1000);
  expect(scale.zoomed(0.25, 300).msAt(300)).toBeCloseTo(scale.msAt(300));
  expect(scale.zoomed(1e-9, 500).spanMs).toBe(15_000);
  const widest = scale.zoomed(1e9, 500).spanMs / (24 * kHourMs);
  expect([widest > 31, widest < 46]).toEqual([true, true]);
  expect(scale.panned(100).startMs).toBe(-100 * scale.msPerPx);
});

test.each(["UTC", "Asia/Kathmandu", "Australia/Eucla"])("half hours on the axis are those of %s", (zone) => {
  vi.stubEnv("TZ", zone);
  const ticks = new TimeScale(Date.UTC(2026, 2, 27), 20_000, 1000).ticks();
  expect(new Set(ticks.map(({ atMs }) => new Date(atMs).getMinutes()))).toEqual(new Set([0, 30]));
  vi.unstubAllEnvs();
});

test("marks on the axis never overlap and stay where they are while it is dragged, at every zoom", () => {
  for (let msPerPx = 15; msPerPx < 4_000_000; msPerPx *= 1.7) {
    const scale = new TimeScale(Date.UTC(2026, 2, 27), msPerPx, 1000);
    const at = scale.ticks().map(({ atMs }) => atMs);
    const apart = at.slice(1).map((ms, index) => (ms - at[index]!) / scale.msPerPx);
    expect(Math.min(...apart, Infinity), `${msPerPx} ms a pixel`).toBeGreaterThan(60);
    expect(at.length, `${msPerPx} ms a pixel`).toBeGreaterThan(1);
    const moved = scale.panned(-37).ticks().map(({ atMs }) => atMs);
    const common = at.filter((ms) => ms > scale.panned(-37).startMs);
    expect(moved.slice(0, common.length)).toEqual(common);
  }
});
