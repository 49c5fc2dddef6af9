// SPDX-License-Identifier: Apache-2.0
//
// The events' screen in a real browser: from the calendar to the picture of a time, and with keys from there.

import { hasBrowser, type Page } from "../../support/browser";
import { ServedClient, smallControls } from "../../support/served_client";

const kFrames = 3_000;

describe.skipIf(!hasBrowser)("in Chromium", () => {
  const client = new ServedClient();
  const { archive } = client.server;
  /** Two days ago at noon of the browser's zone: an hour of two cameras, in recordings of five minutes. */
  const noon = Math.floor(new Date(Date.now() - 2 * 86_400_000).setHours(12, 0, 0, 0) / 1000);

  beforeAll(() => {
    archive.framesPerSecond = 10;
    client.server.cameras.push({ id: 1, name: "Entrance <b>", video_type: 1 }, { id: 2, name: "Parking", video_type: 1 });
    for (let piece = 0; piece < 12; piece += 1) {
      const start = noon + piece * 300;
      archive.recorded.push({ id: 10 + piece, camera: 1, start, stop: start + 300, frames: kFrames });
      archive.recorded.push({ id: 40 + piece, camera: 2, start, stop: start + 300, frames: kFrames, reason: 3 });
    }
    archive.recorded.push({ id: 90, camera: 2, start: noon, stop: noon + 30, frames: 300, kind: "pos", text: "2 Tea <b>\nTotal 5" });
  });

  async function opened(hash: string, widthPx: number, heightPx: number, players = 1): Promise<Page> {
    archive.playersPerSession = players;
    archive.asked.length = 0;
    client.server.hasSession = true;
    return client.open(`${client.address}${hash}`, widthPx, heightPx);
  }

  const state = (page: Page, wanted: string) =>
    page.until((kind) => document.querySelector<HTMLElement>(".stage-picture")!.dataset["state"] === kind, wanted);

  async function clickLane(page: Page, camera: number, atS: number): Promise<void> {
    const box = await page.run(() => {
      const { x, y, width, height } = document.querySelector(".timeline-lanes")!.getBoundingClientRect();
      return { x, y, width, height };
    });
    // The calendar's day fills the timeline's width.
    const x = box.x + (box.width * (atS - (noon - 43_200))) / 86_400;
    const where = { x, y: box.y + (box.height * (camera - 0.5)) / 2, button: "left", clickCount: 1 };
    for (const type of ["mousePressed", "mouseReleased"]) await page.send("Input.dispatchMouseEvent", { type, ...where });
  }

  test("calendar, timeline, picture of that time; pause, rate and the way back", async () => {
    const page = await opened("#events", 1440, 900);
    const day = new Date(noon * 1000).setHours(0, 0, 0, 0);
    await page.until((ms) => document.querySelector(`.day.has[data-day="${ms}"]`) !== null, day);
    expect(await page.run(() => document.querySelectorAll(".day.has").length)).toBe(1);
    await page.click(`.day[data-day="${day}"]`);
    await page.until(() => document.querySelectorAll(".row").length > 5);
    await clickLane(page, 2, noon + 1700);
    await state(page, "playing");
    const hash = await page.run(() => location.hash);
    const [, id, ms] = /^event(\d+) time (\d+) /.exec(archive.asked[0]!)!;
    expect(hash).toBe(`#event=${id}`);
    // A pixel of this day is more than a minute.
    expect(Math.abs((Number(id) - 40) * 300 + Number(ms) / 1000 - 1700)).toBeLessThan(90);
    await page.run(() => (document.activeElement as HTMLElement).blur());
    await page.press(" ");
    await state(page, "paused");
    await vi.waitFor(() => expect(archive.streams).toEqual([]));
    await page.press("]");
    await page.press(" ");
    await vi.waitFor(() => expect(archive.asked.at(-1)).toMatch(/ at 2$/));
    await page.run(() => history.back());
    await state(page, "empty");
    expect(await page.run(() => location.hash)).toBe("#events");
    await client.leave(page);
  }, 40_000);

  test("an address opens its recording; the file is offered; a mark's text is text", async () => {
    const page = await opened("#pos=90", 1440, 900);
    await state(page, "playing");
    expect(archive.asked[0]).toBe("pos90 frame 0 to -1 at 1");
    const link = () => document.querySelector<HTMLAnchorElement>("a[aria-label^=Download]")!.getAttribute("href");
    expect(await page.run(link)).toBe("webapi?api=VEXO.Event&version=1&method=Download&event=90&kind=pos");
    await page.until(() => [...document.querySelectorAll(".row-text")].some((row) => row.textContent === "2 Tea <b> · Total 5"));
    await page.until(() => document.querySelector("[data-ref=pos90] button[title$='Reported by till']") !== null);
    await client.leave(page);
  }, 40_000);

  test("two cameras play the same time where the server allows it; the one that is preempted says so", async () => {
    const page = await opened("#event=14", 1440, 900, 4);
    await state(page, "playing");
    await page.run(() => document.querySelectorAll<HTMLElement>(".lane-name")[1]!.click());
    await page.until(() => document.querySelectorAll(".stage-picture[data-state=playing]").length === 2);
    const times = await page.run(() => [...document.querySelectorAll(".stage-time")].map((time) => time.textContent!));
    const [first, second] = times.map((time) => Date.parse(`2026 ${time.slice(4)}`));
    expect(Math.abs(first! - second!)).toBeLessThanOrEqual(2000);
    archive.streams[0]!.preempt();
    await page.until(() => document.querySelector(".stage-picture[data-state=preempted] .button") !== null);
    await client.leave(page);
  }, 40_000);

  test("ten thousand events of a day are listed and drawn, and cost the page no more elements than ten", async () => {
    const busy = noon - 2 * 86_400;
    for (let at = 0; at < 10_000; at += 1) {
      const start = busy - 40_000 + at * 8;
      archive.recorded.push({ id: 1_000 + at, camera: 1 + (at % 2), start, stop: start + 8, frames: 80, reason: at % 5 ? 1 : 3 });
    }
    const page = await opened("#events", 1440, 900);
    const elements = () => document.querySelectorAll("*").length;
    await page.until(() => document.querySelector(".day.has") !== null);
    const quiet = await page.run(elements);
    await page.click(`.day[data-day="${new Date(busy * 1000).setHours(0, 0, 0, 0)}"]`);
    await page.until(() => document.querySelector(".list-head")!.textContent!.startsWith("10000 events"));
    expect(await page.run(elements)).toBeLessThan(quiet + 500);
    const box = await page.run(() => {
      const { x, y, width, height } = document.querySelector(".timeline-lanes")!.getBoundingClientRect();
      return { x: x + width / 2, y: y + height / 2 };
    });
    for (let step = 0; step < 20; step += 1) {
      await page.send("Input.dispatchMouseEvent", { type: "mouseWheel", ...box, deltaX: 0, deltaY: step < 10 ? -120 : 120 });
    }
    await page.until(() => document.querySelector(".list-head")!.textContent!.startsWith("10000 events"));
    expect(await page.run(elements)).toBeLessThan(quiet + 500);
    await client.leave(page);
    archive.recorded.splice(archive.recorded.findIndex(({ id }) => id === 1_000), 10_000);
  }, 40_000);

  test("a phone has all of it, nothing too small for a finger, and no sideways scrolling", async () => {
    const page = await opened("#event=14", 390, 844);
    await state(page, "playing");
    expect(await page.run(smallControls, "button:not(.day), a, summary, select")).toEqual([]);
    expect(await page.run(() => document.documentElement.scrollWidth)).toBe(390);
    await client.leave(page);
  }, 40_000);
});
