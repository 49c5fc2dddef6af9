// SPDX-License-Identifier: Apache-2.0
//
// A visit that drags the timeline to and fro for LOOKHAVEN_WATCH_MS, at a zoom of days and at one of ninety days, and
// measures the page's frames: how far apart they are, and how long its scripts work for each.
import { address, logIn, report, visit } from "./visit.mjs";

const watchMs = Number(process.env.LOOKHAVEN_WATCH_MS ?? 6000);
const kMovePx = 11;
const kReachPx = 300;
/** From six hours: 1.6 times as much with each. */
const kPresses = { "2.6 days": 5, "90 days": 13 };

/** Runs in the page, before its own scripts. */
function observe() {
  window.frames_ = [];
  const request = window.requestAnimationFrame;
  const frameAt = (atMs) => {
    if (window.frames_.at(-1)?.atMs !== atMs) window.frames_.push({ atMs, workMs: 0 });
    return window.frames_.at(-1);
  };
  window.requestAnimationFrame = (callback) =>
    request((atMs) => {
      const begunMs = performance.now();
      callback(atMs);
      frameAt(atMs).workMs += performance.now() - begunMs;
    });
  const tick = (atMs) => void (frameAt(atMs), request(tick));
  request(tick);
}

await visit(async (page) => {
  await page.setViewportSize({ width: 1440, height: 900 });
  await page.addInitScript(observe);
  await page.goto(`${address}#events`);
  await logIn(page);
  const lanes = page.locator(".timeline-lanes");
  await lanes.waitFor();
  let pressed = 0;
  for (const [span, presses] of Object.entries(kPresses)) {
    for (; pressed < presses; pressed += 1) await lanes.press("-");
    await page.waitForTimeout(1_000);
    await page.locator(".progress").waitFor({ state: "hidden", timeout: 60_000 });
    const box = await lanes.boundingBox();
    const [x, y] = [box.x + box.width / 2, box.y + box.height / 2];
    const listed = await page.locator(".list-head").textContent();
    await page.mouse.move(x, y);
    await page.mouse.down();
    await page.evaluate(() => void window.frames_.splice(0));
    const end = Date.now() + watchMs;
    let moves = 0;
    for (let px = kMovePx; Date.now() < end; px = (px + kMovePx) % (4 * kReachPx), moves += 1) {
      await page.mouse.move(x + kReachPx - Math.abs(px - 2 * kReachPx), y);
    }
    const frames = await page.evaluate(() => window.frames_);
    await page.mouse.up();
    const gapsMs = frames.slice(1).map(({ atMs }, index) => atMs - frames[index].atMs);
    const workMs = frames.map((frame) => frame.workMs).filter((ms) => ms > 0.5);
    await report("dragged", { span, listed, moves, gapsMs, workMs });
  }
});
