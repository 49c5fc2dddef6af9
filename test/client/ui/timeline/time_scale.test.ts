// SPDX-License-Identifier: Apache-2.0
//
// Zoom and ticks of the timeline.

import { TimeScale } from "../../../../client/src/ui/timeline/time_scale";

const kHourMs = 3_600_000;

const kDayMs = 24 * kHourMs;

test.each([320, 1000, 2500])("zooming %i pixels leaves the time under the pointer in place, from 10 s to 90 days", (width) => {
  const at = width * 0.3;
  let scale = TimeScale.of(0, kDayMs, width);
  const under = scale.msAt(at);
  for (const [factor, endSpanMs] of [[1 / 1.6, 10_000], [1.6, 90 * kDayMs]] as const) {
    for (let press = 0; press < 40; press += 1) {
      const wasMs = scale.spanMs;
      scale = scale.zoomed(factor, at);
      expect(Math.abs(scale.msAt(at) - under)).toBeLessThan(1);
      // Each press zooms by its factor, and the last by what is left.
      const wantedMs = factor < 1 ? Math.max(wasMs * factor, endSpanMs) : Math.min(wasMs * factor, endSpanMs);
      expect(scale.spanMs / wantedMs).toBeCloseTo(1, 9);
    }
    expect(scale.spanMs).toBeCloseTo(endSpanMs, 3);
  }
});

test("a span beyond either end of the zoom has its middle in the middle, and a resize keeps its end", () => {
  for (const spanMs of [1_000, kDayMs, 365 * kDayMs]) {
    const scale = TimeScale.of(0, spanMs, 1000);
    expect(scale.msAt(500)).toBeCloseTo(spanMs / 2, 3);
    for (const width of [300, 1000, 1700]) {
      const resized = scale.resized(width);
      expect(resized.endMs).toBeCloseTo(scale.endMs, 3);
      expect(resized.spanMs).toBeGreaterThan(9_999);
      expect(resized.spanMs).toBeLessThan(90 * kDayMs + 1);
    }
  }
});

test.each(["UTC", "Asia/Kathmandu", "Australia/Eucla"])("half hours on the axis are those of %s", (zone) => {
  vi.stubEnv("TZ", zone);
  const ticks = new TimeScale(Date.UTC(2026, 2, 27), 20_000, 1000).ticks();
  expect(new Set(ticks.map(({ atMs }) => new Date(atMs).getMinutes()))).toEqual(new Set([0, 30]));
  vi.unstubAllEnvs();
});

test.each([320, 1000, 2500])("marks on an axis of %i pixels never overlap and stay in place while it is dragged, at every zoom", (width) => {
  const now = Date.UTC(2026, 2, 27);
  for (let spanMs = 10_000; spanMs < 90 * kDayMs * 1.7; spanMs *= 1.7) {
    const scale = new TimeScale(now, spanMs / width, width);
    const at = scale.ticks().map(({ atMs }) => atMs);
    const apart = at.slice(1).map((ms, index) => (ms - at[index]!) / scale.msPerPx);
    expect(Math.min(...apart, Infinity), `${spanMs} ms`).toBeGreaterThan(60);
    expect(at.length, `${spanMs} ms`).toBeGreaterThan(1);
    const moved = scale.panned(-37).ticks().map(({ atMs }) => atMs);
    const common = at.filter((ms) => ms > scale.panned(-37).startMs);
    expect(moved.slice(0, common.length)).toEqual(common);
  }
});

test.each([
  [10_000, /^\d\d:\d\d:\d\d$/],
  [90 * kDayMs, /^\D*\d+ \D+$/],
])("labels of a span of %i ms are told apart", (spanMs, form) => {
  const labels = TimeScale.of(kHourMs / 2, kHourMs / 2 + spanMs, 1000).ticks().map(({ label }) => label);
  expect(new Set(labels).size).toBe(labels.length);
  for (const label of labels) expect(label).toMatch(form);
});
