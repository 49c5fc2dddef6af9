// SPDX-License-Identifier: Apache-2.0
//
// What the lanes show at every zoom, seen in their pixels.

import type { Page } from "playwright-core";
import { ServedEvents } from "../../support/served_events";

const kDayS = 86_400;
const kMaxSpanS = 90 * kDayS;
/** What a press of a key changes the span by. */
const kZoom = 1.6;

/** First and last pixel in which the lane is painted between the axis' lines, and how many of all are; null for none. */
const painted = (page: Page, lane: number, lanes: number) =>
  page.evaluate(
    ([lane, lanes]) => {
      const canvas = document.querySelector<HTMLCanvasElement>(".timeline-lanes")!;
      const y = Math.round(((lane! + 0.5) * canvas.height) / lanes!);
      const { data } = canvas.getContext("2d")!.getImageData(0, y, canvas.width, 1);
      const at = Array.from({ length: canvas.width }, (_, x) => x).filter((x) => Math.max(...data.slice(4 * x, 4 * x + 3)) > 110);
      return at.length > 0 ? { from: at[0]!, to: at.at(-1)! + 1, count: at.length, width: canvas.width } : null;
    },
    [lane, lanes],
  );

describe("the timeline", () => {
  const events = new ServedEvents();
  const { archive, noon } = events;

  test("an hour has its true width from hours to ninety days, and is never lost on the way", async () => {
    const page = await events.open("#events", 1440, 900);
    const day = new Date(noon * 1000).setHours(0, 0, 0, 0);
    await page.click(`.day.has[data-day="${day}"]`);
    const lanes = page.locator(".timeline-lanes");
    await expect.poll(() => painted(page, 0, 2)).not.toBeNull();
    for (let spanS = kDayS, press = 0; press < 13; press += 1, spanS = Math.min(kMaxSpanS, spanS * kZoom)) {
      const widthOf = async () => {
        const bar = await painted(page, 0, 2);
        return bar && ((bar.to - bar.from) * spanS) / bar.width;
      };
      const spanPerPx = spanS / ((await lanes.boundingBox())!.width);
      // A pixel at either end; and there before anything that is fetched can have come.
      const first = await widthOf();
      expect(first, `${spanS} s`).not.toBeNull();
      expect(Math.abs(first! - 3600), `${spanS} s`).toBeLessThan(2.5 * spanPerPx);
      await page.waitForFunction(() => document.querySelector<HTMLElement>(".progress")?.hidden !== false);
      expect(Math.abs((await widthOf())! - 3600), `${spanS} s, all fetched`).toBeLessThan(2.5 * spanPerPx);
      await lanes.press("-");
      await page.evaluate(() => new Promise((drawn) => requestAnimationFrame(() => requestAnimationFrame(drawn))));
    }
  }, 60_000);

  test("events of two pixels are told apart, and what is not chosen is not shown, in weeks too", async () => {
    // Hours with two hours between, for twelve days.
    for (let at = 0; at < 96; at += 1) {
      const start = noon - 14 * kDayS + at * 3 * 3600;
      archive.recorded.push({ id: 1_000 + at, camera: 1, start, stop: start + 3600, frames: 80 });
    }
    const page = await events.open("#events", 1440, 900);
    const lanes = page.locator(".timeline-lanes");
    await page.waitForSelector(".day.has");
    for (let press = 0; press < 9; press += 1) await lanes.press("-");
    await expect.poll(async () => (await painted(page, 0, 2))?.count ?? 0, { timeout: 10_000 }).toBeGreaterThan(80);
    const bar = (await painted(page, 0, 2))!;
    const share = bar.count / (bar.to - bar.from);
    expect(share).toBeGreaterThan(0.25);
    expect(share).toBeLessThan(0.6);
    await page.locator(".chips label", { hasText: "Continuous" }).click();
    await expect.poll(() => painted(page, 0, 2)).toBeNull();
    archive.recorded.splice(archive.recorded.findIndex(({ id }) => id === 1_000), 96);
  }, 60_000);
});
