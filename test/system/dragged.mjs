// SPDX-License-Identifier: Apache-2.0
//
// A visit that drags the playhead through recordings and counts the pictures that are drawn: step by step, each waited
// for, then to and fro for LOOKHAVEN_WATCH_MS. EVENTS are ids of recordings with a second in the middle of each, "7@1772",
// joined by ",".
import { address, dragTo, logIn, report, visit } from "./visit.mjs";

const watchMs = Number(process.env.LOOKHAVEN_WATCH_MS ?? 6000);
/** The pointer goes so far to either side of the middle. */
const kReachPx = 100;
const kMovePx = 9;
/** More than a second of the recording, and so to another key frame. */
const kStepPx = 16;

/** Runs in the page, before its own scripts. */
function observe() {
  window.seen = { times: [], asked: 0, waits: 0 };
  const drawImage = CanvasRenderingContext2D.prototype.drawImage;
  CanvasRenderingContext2D.prototype.drawImage = function (image, ...place) {
    drawImage.call(this, image, ...place);
    if (this.canvas.closest(".stage-picture")) window.seen.times.push(performance.now());
  };
  const ask = window.fetch;
  window.fetch = function (input, init) {
    const answer = ask.call(this, input, init);
    if (String(input).includes("method=At")) {
      window.seen.asked += 1;
      window.seen.waits += 1;
      const ended = () => (window.seen.waits -= 1);
      answer.then(ended, ended);
    }
    return answer;
  };
}

await visit(async (page) => {
  await page.setViewportSize({ width: 1440, height: 900 });
  await page.addInitScript(observe);
  await page.goto(`${address}#events`);
  await logIn(page);
  let zoomed = 0;
  for (const [event, middleS] of process.env.EVENTS.split(",").map((one) => one.split("@"))) {
    await page.evaluate((to) => void (location.hash = to), `#event=${event}`);
    await page.locator(`.transport a[href*="event=${event}"]`).waitFor({ timeout: 15_000 });
    await page.keyboard.press(" ");
    await page.locator('.stage-picture.has-picture[data-state="paused"]').first().waitFor();
    // The recording fills some 200 pixels.
    for (; zoomed < 12; zoomed += 1) await page.locator(".timeline-lanes").press("+");
    const axis = await page.locator(".timeline-axis").boundingBox();
    const y = axis.y + 10;
    const secondAt = (px) => dragTo(page, axis, px);
    await page.mouse.move(axis.x + 100, y);
    await page.mouse.down();
    const [here, there] = [await secondAt(100), await secondAt(500)];
    const middle = 100 + ((Number(middleS) - here) * 400) / (there - here);
    const forget = () => page.evaluate(() => Object.assign(window.seen, { times: [], asked: 0, sinceMs: performance.now() }));
    const seen = () => page.evaluate(() => ({ ...window.seen, ms: performance.now() - window.seen.sinceMs }));

    await secondAt(middle - kReachPx - kStepPx);
    await page.waitForTimeout(1_000);
    await page.waitForFunction(() => window.seen.waits === 0);
    await forget();
    let steps = 0;
    for (let px = -kReachPx; px <= kReachPx; px += kStepPx) {
      await page.mouse.move(axis.x + middle + px, y);
      steps += 1;
      await page.waitForFunction((count) => window.seen.times.length >= count, steps);
    }
    const stepped = await seen();
    await report("stepped", { steps, pictures: stepped.times.length, asked: stepped.asked });

    await forget();
    const end = Date.now() + watchMs;
    let moves = 0;
    for (let px = 0; Date.now() < end; px = (px + kMovePx) % (4 * kReachPx)) {
      await page.mouse.move(axis.x + middle - kReachPx + Math.abs(px - 2 * kReachPx), y);
      moves += 1;
      await page.evaluate(() => new Promise((resolve) => requestAnimationFrame(resolve)));
    }
    const { times, asked, ms } = await seen();
    await page.mouse.up();
    const gapsMs = times.slice(1).map((at, index) => at - times[index]);
    await report("dragged", { moves, pictures: times.length, asked, ms, gapsMs });
  }
});
