// SPDX-License-Identifier: Apache-2.0
//
// The events' screen in a real browser: from the calendar to the picture of a time, and with keys from there.

import type { Page } from "playwright-core";
import { hasBrowser, smallControls } from "../../support/served_client";
import { hashOf, noFocus, ServedEvents, state } from "../../support/served_events";

describe.skipIf(!hasBrowser)("in a browser", () => {
  const events = new ServedEvents();
  const { archive, noon } = events;

  /** Clicks where the timeline, whose width a day fills, shows that time of the camera. */
  async function clickLane(page: Page, camera: number, atS: number): Promise<void> {
    const { x, y, width, height } = (await page.locator(".timeline-lanes").boundingBox())!;
    await page.mouse.click(x + (width * (atS - (noon - 43_200))) / 86_400, y + (height * (camera - 0.5)) / 2);
  }

  test("calendar, timeline, picture of that time; pause, rate and the way back", async () => {
    const page = await events.open("#events", 1440, 900);
    const day = new Date(noon * 1000).setHours(0, 0, 0, 0);
    await page.click(`.day.has[data-day="${day}"]`);
    expect(await page.locator(".day.has").count()).toBe(1);
    await page.waitForFunction(() => document.querySelectorAll(".row").length > 5);
    await clickLane(page, 2, noon + 1700);
    await state(page, "playing");
    const [, id, frame] = /^event(\d+) frame (\d+) /.exec(archive.asked[0]!)!;
    expect(hashOf(page)).toMatch(new RegExp(`^#event=${id}&at=`));
    // A pixel of this day is more than a minute.
    expect(Math.abs((Number(id) - 40) * 300 + Number(frame) / 10 - 1700)).toBeLessThan(90);
    await noFocus(page);
    await page.keyboard.press(" ");
    await state(page, "paused");
    await vi.waitFor(() => expect(archive.streams).toEqual([]));
    await page.keyboard.press("]");
    await page.keyboard.press(" ");
    await vi.waitFor(() => expect(archive.asked.at(-1)).toMatch(/ at 2$/));
    await page.goBack();
    await state(page, "empty");
    expect(hashOf(page)).toBe("#events");
  }, 40_000);

  test("an address opens its recording; the file is offered; a mark's text is text", async () => {
    const page = await events.open("#pos=90", 1440, 900);
    await state(page, "playing");
    expect(archive.asked[0]).toBe("pos90 frame 0 to -1 at 1");
    const link = await page.getAttribute("a[aria-label^=Download]", "href");
    const offset = -new Date(noon * 1000).getTimezoneOffset();
    expect(link).toBe(`webapi?api=VEXO.Event&version=1&method=Download&event=90&kind=pos&utc_offset_min=${offset}`);
    await page.locator(".row-text", { hasText: /^2 Tea <b> · Total 5$/ }).waitFor({ state: "attached" });
    await page.waitForSelector("[data-ref=pos90] button[title$='Reported by terminal']");
  }, 40_000);

  test("words find what an alert or a receipt says, at any time, marked; a click plays it", async () => {
    const start = noon - 90 * 86_400;
    archive.recorded.push({ id: 91, camera: 1, start, stop: start + 30, frames: 300, kind: "alert", text: "Van at gate <i>\n2 Tea" });
    const page = await events.open("#events", 1440, 900);
    const field = page.getByRole("searchbox");
    const texts = () => page.locator(".row-text").allTextContents();
    await field.fill("Tea");
    await page.locator(".list-head", { hasText: "2 found" }).waitFor();
    expect(await texts()).toEqual(expect.arrayContaining(["2 Tea <b>", "2 Tea"]));
    expect(await page.locator(".row-text mark").allTextContents()).toEqual(["Tea", "Tea"]);
    await page.locator(".chips label", { hasText: "POS" }).click();
    await page.locator(".list-head", { hasText: "1 found" }).waitFor();
    await page.locator("[data-ref=alert91] .row-open").click();
    await state(page, "playing");
    expect(archive.asked.at(-1)).toBe("alert91 frame 0 to -1 at 1");
    await field.fill("Milk");
    await page.locator(".list-note", { hasText: "Nothing found." }).waitFor();
    await field.fill("");
    await page.locator(".list-head", { hasText: "event" }).waitFor();
    archive.recorded.pop();
  }, 40_000);

  test("the walk keeps to the filter and to no day, and says what comes next; a gap is told; cards load few stills", async () => {
    const start = noon - 20 * 86_400;
    archive.recorded.push({ id: 5, camera: 2, start, stop: start + 1, frames: 10, reason: 3 });
    archive.recorded.push({ id: 6, camera: 1, start: start + 60, stop: start + 61, frames: 10 });
    archive.recorded.push({ id: 7, camera: 1, start: start + 7_260, stop: start + 7_261, frames: 10 });
    archive.stills.length = 0;
    const page = await events.open("#event=6", 1440, 900);
    await page.locator(".notice", { hasText: "Skipped 1 h 59 min without recordings." }).waitFor({ timeout: 10_000 });
    await page.waitForURL(/#event=7&/);
    for (const kind of ["Continuous", "POS"]) await page.locator(".chips label", { hasText: kind }).click();
    await noFocus(page);
    const before = page.locator('[aria-label^="Previous event: "][aria-label$=" · Parking"]');
    await before.click();
    await page.waitForURL(/#event=5&/);
    const day = new Date(start * 1000).toLocaleDateString("en-GB", { day: "numeric", month: "short" });
    await page.locator(".notice", { hasText: new RegExp(`^${day} ..:.. · Parking$`) }).waitFor();
    await page.keyboard.press("ArrowDown");
    await page.waitForURL(/#event=40&/);
    await page.locator(".row-still.loaded").first().waitFor();
    expect(new Set(archive.stills).size).toBeLessThan(40);
    archive.recorded.splice(archive.recorded.findIndex(({ id }) => id === 5), 3);
  }, 40_000);

  test("ten thousand events of a day are listed and drawn, and cost the page no more elements than ten", async () => {
    const busy = noon - 2 * 86_400;
    for (let at = 0; at < 10_000; at += 1) {
      const start = busy - 40_000 + at * 8;
      archive.recorded.push({ id: 1_000 + at, camera: 1 + (at % 2), start, stop: start + 8, frames: 80, reason: at % 5 ? 1 : 3 });
    }
    const page = await events.open("#events", 1440, 900);
    const elements = () => page.locator("*").count();
    const listed = () => page.locator(".list-head", { hasText: /^10000 events/ }).waitFor();
    await page.waitForSelector(".day.has");
    const quiet = await elements();
    await page.click(`.day[data-day="${new Date(busy * 1000).setHours(0, 0, 0, 0)}"]`);
    await listed();
    expect(await elements()).toBeLessThan(quiet + 500);
    await page.hover(".timeline-lanes");
    for (let step = 0; step < 20; step += 1) await page.mouse.wheel(0, step < 10 ? -120 : 120);
    await listed();
    expect(await elements()).toBeLessThan(quiet + 500);
    archive.recorded.splice(archive.recorded.findIndex(({ id }) => id === 1_000), 10_000);
  }, 40_000);

  test("a phone has all of it, nothing too small for a finger, and no sideways scrolling", async () => {
    const page = await events.open("#event=14", 390, 844);
    await state(page, "playing");
    expect(await page.evaluate(smallControls, "button:not(.day), a, summary, select")).toEqual([]);
    expect(await page.evaluate(() => document.documentElement.scrollWidth)).toBe(390);
  }, 40_000);

  test("a recording is kept with a note, found again by the filter, and released", async () => {
    const page = await events.open("#event=14", 1440, 900);
    await state(page, "playing");
    await page.click("button[aria-label='Keep this recording']");
    await page.keyboard.type("police [4]");
    await page.keyboard.press("Enter");
    await page.locator("button[aria-label='Kept by admin: police [4]']").waitFor();
    await page.locator("[data-ref=event14] .row-kept").waitFor();
    await page.locator(".chips label", { hasText: "Kept" }).click();
    await page.locator(".list-head", { hasText: /^1 event · / }).waitFor();
    expect(await page.getAttribute("[data-ref=event14] button", "title")).toMatch(/\nKept by admin: police \[4\]$/);
    await page.click(".keep-button");
    await page.click(".dialog button:text-is('Release')");
    await page.locator(".list-head", { hasText: /^0 events · / }).waitFor();
    await page.locator(".chips label", { hasText: "Kept" }).click();
    await page.route(/Event&version=1&method=Get&/, (route) => route.abort());
    await page.locator("[data-ref^=event]:not([data-ref=event14]) button").first().click();
    await page.locator(".keep-button[title='The server does not answer.']").waitFor();
  }, 40_000);

  test("a span is chosen by keys, by a handle and by camera; its size is told; it is downloaded", async () => {
    const page = await events.open("#event=21", 1440, 900);
    await state(page, "playing");
    await noFocus(page);
    await page.keyboard.press("x");
    const about = (text: string) => page.locator(".export-about", { hasText: text }).waitFor();
    await about("5 min · about 300 MB");
    const end = page.locator(".span-handle[data-end=toMs]");
    const { x, y, width, height } = (await end.boundingBox())!;
    await page.mouse.move(x + width / 2, y + height / 2);
    await page.mouse.down();
    await page.mouse.move(x + 40, y + height / 2);
    await page.mouse.up();
    await page.locator(".export-about", { hasText: "12 s of Camera 1 missing" }).waitFor();
    await page.click("button:text-is('This event')");
    await about("5 min · about 300 MB");
    await end.focus();
    await page.keyboard.press("Shift+ArrowLeft");
    await about("4 min · about 240 MB");
    await page.locator(".export-panel .chip", { hasText: "Parking" }).click();
    await about("2 files in a ZIP");
    await page.evaluate(() => Object.assign(window, { showSaveFilePicker: undefined }));
    const [download] = await Promise.all([page.waitForEvent("download"), page.click(".export-panel a")]);
    const asked = new URL(download.url()).searchParams;
    const span = [asked.get("cameralists"), Number(asked.get("from")), Number(asked.get("to"))];
    expect(span).toEqual(["1,2", noon + 3300, noon + 3540]);
    await page.locator(".export-run", { hasText: "list of downloads" }).waitFor();
    await page.keyboard.press("Escape");
    await end.waitFor({ state: "hidden" });
  }, 40_000);

  test.each([[390, 844], [844, 390]])("at %i × %i the button of the export is in sight", async (widthPx, heightPx) => {
    const page = await events.open("#event=21", widthPx, heightPx);
    await state(page, "playing");
    await noFocus(page);
    await page.keyboard.press("x");
    await page.locator(".export-about", { hasText: "about" }).waitFor();
    const isInSight = (button: Element) => {
      const { x, y, width, height } = button.getBoundingClientRect();
      return button.contains(document.elementFromPoint(x + width / 2, y + height / 2));
    };
    expect(await page.locator(".export-panel a").evaluate(isInSight)).toBe(true);
  }, 40_000);

  test.each([
    ["whole", "Exported export.zip, 3.0 MB.", "closed 3000000"],
    ["cut", "The export broke off", "aborted removed"],
    ["cancelled", "The export of export.zip was cancelled.", "aborted removed"],
    ["refused", "Nothing was exported. The server is busy.", "aborted removed"],
  ])("an export into a chosen file that is %s", async (how, said, file) => {
    let [body, isLeft]: [ReadableStreamDefaultController | null, boolean] = [null, false];
    const stream = new ReadableStream({ start: (made) => void (body = made), cancel: () => void (isLeft = true) });
    const headers = { "Content-Type": "application/zip", "Content-Length": "3000000" };
    archive.exported = how === "refused" ? Response.json({ success: false }, { status: 503 }) : new Response(stream, { headers });
    const send = (bytes: number) => body!.enqueue(new Uint8Array(bytes));
    const page = await events.open("#event=11", 1440, 900);
    await state(page, "playing");
    await page.evaluate(() => {
      const log = (text: string) => void (document.body.dataset.file = `${document.body.dataset.file ?? ""} ${text}`.trim());
      let size = 0;
      const write = (chunk: Uint8Array) => void (size += chunk.length);
      const createWritable = async () => new WritableStream({ write, close: () => log(`closed ${size}`), abort: () => log("aborted") });
      const chosen = { createWritable, getFile: async () => ({ size: 0 }), remove: async () => log("removed") };
      const pick = async ({ suggestedName }: { suggestedName: string }) => ({ ...chosen, name: suggestedName });
      Object.assign(window, { showSaveFilePicker: pick });
    });
    await noFocus(page);
    await page.keyboard.press("x");
    await page.click(".export-panel a[href]");
    const run = (text: string) => page.locator(".export-run", { hasText: text }).waitFor();
    if (how !== "refused") {
      await run("0 B of about 300 MB");
      send(1_000_000);
      await run("1.0 MB of 3.0 MB");
      page.once("dialog", (asked) => void asked.dismiss());
      await page.getByRole("link", { name: "Live", exact: true }).click();
      send(1_000_000);
      await run("2.0 MB of 3.0 MB");
    }
    if (how === "whole") send(1_000_000), body!.close();
    if (how === "cut") body!.error(new Error("cut"));
    if (how === "cancelled") {
      await page.click("button:text-is('Cancel')");
      await vi.waitFor(() => expect(isLeft).toBe(true));
    }
    await run(said);
    expect(await page.getAttribute("body", "data-file")).toBe(file);
    expect(await page.locator(".export-panel a").isVisible()).toBe(true);
    archive.exported = null;
  }, 40_000);

  test("of a camera that may not be exported, recordings play, and neither download nor export is offered", async () => {
    archive.notExported = [2];
    const page = await events.open("#event=41", 1440, 900);
    await state(page, "playing");
    const link = page.locator("a[aria-label^='You may play the recordings of this camera']");
    await link.waitFor();
    expect(await link.getAttribute("href")).toBeNull();
    await noFocus(page);
    await page.keyboard.press("x");
    const about = (text: string) => page.locator(".export-about", { hasText: text }).waitFor();
    await about("Choose a camera.");
    expect(await page.getByLabel("Parking (no export)").isDisabled()).toBe(true);
    await page.locator(".export-panel .chip", { hasText: "Entrance" }).click();
    await about("about 300 MB");
    await page.keyboard.press("Escape");
    archive.notExported = [1, 2];
    await events.open("#event=11", 1440, 900).then(async (again) => {
      await again.locator("a[aria-label^='You may play the recordings of this camera']").waitFor();
      await noFocus(again);
      await again.keyboard.press("x");
      await again.locator(".export-about", { hasText: "You may play these recordings, but not export them." }).waitFor();
    });
    archive.notExported = [];
  }, 40_000);

  test("a phone, too, says that there is nothing only once it knows", async () => {
    const page = await events.open("#events", 390, 844);
    const note = await page.waitForFunction(() => document.querySelector(".list-note")?.textContent);
    const first = new Date(new Date().setDate(1));
    const isOnCalendar = noon * 1000 >= first.setDate(1 - ((first.getDay() + 6) % 7));
    expect(await note.jsonValue()).toMatch(isOnCalendar ? /^No events in this time span/ : /^Nothing was recorded/);
  }, 40_000);
});
