// SPDX-License-Identifier: Apache-2.0
//
// One visit to what was recorded: from the calendar over the timeline to the picture of a time, then pause, snapshot,
// steps, a jump and a drag; marks by their addresses, on to the event after, and its export with another camera's.
// EVENT_START and EVENT_MIDDLE are Unix seconds of a recording of camera 1, MARKS are addresses of marks within its
// recordings.
import { download } from "../support/browsers.mjs";
import { address, folder, logIn, report, visit } from "./visit.mjs";

const start = Number(process.env.EVENT_START);
const middle = Number(process.env.EVENT_MIDDLE);

await visit(async (page, complaints) => {
  /**
   * Waits for one of the states; the page shows what a click changed with the next picture of the screen at the latest.
   */
  const settled = async (...states) => {
    await page.evaluate(() => new Promise((resolve) => requestAnimationFrame(() => requestAnimationFrame(resolve))));
    await page.locator(states.map((state) => `.stage-picture:first-of-type[data-state="${state}"]`).join()).waitFor({ timeout: 15_000 });
  };
  const text = (selector) => page.locator(selector).first().textContent();
  /** What the canvas shows, the frame that is told, if one is, and the second of the playhead. */
  const shown = () =>
    page.evaluate(() => ({
      picture: document.querySelector(".stage-picture canvas").toDataURL("image/jpeg", 0.95).split(",")[1],
      told: Number(/^frame (\d+)/.exec(document.querySelector(".transport-frame").textContent)?.[1]) - 1,
      time: document.querySelector(".transport-time").textContent,
      caption: document.querySelector(".stage-time").textContent,
    }));

  await page.goto(`${address}#events`);
  await logIn(page);
  const day = new Date(start * 1000).setHours(0, 0, 0, 0) / 1000;
  await page.locator(`.day.has[data-day="${day * 1000}"]`).click();
  const box = await page.locator(".timeline-lanes").boundingBox();
  const y = box.y + 16;
  /** The time under a point of the timeline, by a click on it. */
  const timeAt = async (x) => {
    await page.mouse.click(box.x + x, y);
    await settled("playing", "empty");
    const [, date, time] = /^\w+ (.*) (\S+)$/.exec(await text(".transport-time"));
    return Date.parse(`${date} ${new Date(start * 1000).getFullYear()} ${time.slice(0, 8)}`) / 1000 + Number(time.slice(8));
  };
  // On a day that is not over, the timeline also shows hours of the day before. So look where the time is, pan it to
  // the middle, for near an edge the timeline follows what plays, go on towards the seconds, and look again, until it is
  // there: a browser may take a wheel for turned before the page has seen it.
  const x = box.width / 2;
  let scale;
  let offS;
  const aim = async () => {
    const [here, before] = [await timeAt(x), await timeAt(x - 400)];
    scale = (here - before) / 400;
    offS = Math.abs(middle - here);
    await page.mouse.move(box.x + x, y);
    await page.mouse.wheel(Math.round((middle - here) / scale), 0);
  };
  for (await aim(); scale > 0.2 || offS > 1; await aim()) {
    for (let step = 0; scale > 0.2 && step < 8; step += 1) await page.mouse.wheel(0, -240);
  }
  await timeAt(x);
  await page.keyboard.press(" ");
  await settled("paused");
  await page.screenshot({ path: `${folder}/events.png` });
  await report("found", await shown());
  await page.keyboard.press("s");
  const save = page.getByRole("dialog", { name: "Snapshot" }).getByRole("link", { name: "Download" });
  await report("snapshot", { file: await download(page, () => save.click(), folder) });
  await page.keyboard.press("Escape");

  const before = await shown();
  await page.waitForTimeout(700);
  await report("stands still", { same: before.picture === (await shown()).picture });

  const next = async (key, frame) => {
    await page.keyboard.press(key);
    await page.waitForFunction((wanted) => document.querySelector(".transport-frame").textContent.startsWith(`frame ${wanted} `), frame + 1);
    await settled("paused");
  };
  await next("ArrowRight", before.told + 1);
  await report("one on", await shown());
  await next("ArrowLeft", before.told);
  await next("ArrowLeft", before.told - 1);
  await report("two back", await shown());

  const by = 3;  // seconds
  await timeAt(x + by / scale);
  await page.keyboard.press(" ");
  await settled("paused");
  await report("jumped", { ...(await shown()), by });

  const axis = await page.locator(".timeline-axis").boundingBox();
  const to = (seconds, options) => page.mouse.move(axis.x + x + seconds / scale, axis.y + 10, options);
  await to(by);
  await page.mouse.down();
  const from = await text(".stage-time");
  await to(-by);
  // A picture of where the playhead is comes while the pointer is down.
  await page.waitForFunction(([start, way]) => {
    const seconds = (time) => time.split(" ").at(-1).split(":").reduce((sum, part) => sum * 60 + Number(part), 0);
    const [playhead, picture] = [".transport-time", ".stage-time"].map((one) => seconds(document.querySelector(one).textContent));
    return Math.abs(picture - playhead) < 1 && Math.abs(picture - seconds(start)) > way;
  }, [from, by]);
  await report("dragged", { ...(await shown()), by });
  await page.mouse.up();
  await settled("playing");
  await page.keyboard.press(" ");
  await settled("paused");
  await report("let go", await shown());

  for (const mark of process.env.MARKS.split(",")) {
    await page.evaluate((to) => void (location.hash = to), mark);
    const [kind, id] = mark.split("=");
    await page.locator(`.transport a[href*="event=${id}&kind=${kind}"]`).waitFor();
    await page.waitForFunction(() => /^frame ([5-9]|\d\d)/.test(document.querySelector(".transport-frame").textContent));
    await page.keyboard.press(" ");
    await settled("paused");
    const after = page.locator('[aria-label^="Next event: "]');
    const said = await text(".mark-text:not([hidden]) p");
    await report(kind, { ...(await shown()), said, next: await after.getAttribute("aria-label", { timeout: 5000 }) });
  }
  await page.keyboard.press("ArrowDown");
  await page.locator(".notice.shown").waitFor();
  await settled("paused");
  const stills = await page.waitForFunction(() => {
    const { length } = document.querySelectorAll(".row-still.loaded");
    return length > 1 ? length : null;
  });
  await page.screenshot({ path: `${folder}/walked.png` });
  await report("walked", {
    address: await page.evaluate(() => location.hash),
    notice: await text(".notice"),
    stills: await stills.jsonValue(),
  });

  await page.keyboard.press("x");
  for (const name of ["Entrance", "Parking"]) {
    const chip = page.locator(".export-panel .chip", { hasText: name });
    if (!(await chip.locator("input").isChecked())) await chip.click();
  }
  await page.locator(".export-about", { hasText: "2 files in a ZIP" }).waitFor();
  await page.screenshot({ path: `${folder}/export.png` });
  // Else a dialog of the browser asks where to save it.
  await page.evaluate(() => Object.assign(window, { showSaveFilePicker: undefined }));
  const file = await download(page, () => page.locator(".export-panel a").click(), folder);
  await report("exported", { file, complaints });
});
