// SPDX-License-Identifier: Apache-2.0
//
// A visit to a camera with picture and sound: watched muted, then heard, then in a hidden tab, then seen again.
//
// Why so        What is drawn is measured on the canvas, not asked of the client: the light that runs along the lower
//               edge of the test pattern tells the time at which a picture was made, and sound is taken where it leaves
//               the page. LOOKHAVEN_WATCH_MS is how long each measurement takes.
import { observeSound } from "./sound.mjs";
import { address, logIn, report, visit } from "./visit.mjs";

const watchMs = Number(process.env.LOOKHAVEN_WATCH_MS ?? 6000);

/** Runs in the page, before its own scripts. */
function observe() {
  const kPeriodMs = 4000;
  const seen = (window.seen = { pictures: [] });

  /** Milliseconds modulo kPeriodMs as the light shows them; null where there is no light. */
  const paintedMs = (context) => {
    const { width, height } = context.canvas;
    const unit = Math.max(1, Math.floor(height / 90));
    const pixels = context.getImageData(0, height - unit, width, 1).data;
    const isLight = (x) => Math.min(pixels[4 * x], pixels[4 * x + 1], pixels[4 * x + 2]) > 215;
    for (let from = 0; from < width; from += 1) {
      let to = from;
      while (to < width && isLight(to)) to += 1;
      if (to - from > 3 * unit) return (from * kPeriodMs) / (width - 4 * unit);
      from = to;
    }
    return null;
  };

  const drawImage = CanvasRenderingContext2D.prototype.drawImage;
  CanvasRenderingContext2D.prototype.drawImage = function (image, ...place) {
    drawImage.call(this, image, ...place);
    if (!(image instanceof VideoFrame) || !this.canvas.closest(".large")) return;
    const painted = paintedMs(this);
    // What is drawn now, the screen shows with the next frame.
    requestAnimationFrame(() => {
      const nowMs = performance.timeOrigin + performance.now();
      const delayMs = painted === null ? null : (((nowMs - painted) % kPeriodMs) + kPeriodMs) % kPeriodMs;
      seen.pictures.push({ painted, delayMs });
    });
  };
}

async function measure(page) {
  await page.evaluate(() => {
    window.sound.peak = 0;
    Object.assign(window.seen, { pictures: [], sinceMs: performance.now() });
  });
  await page.waitForTimeout(watchMs);
  return page.evaluate(() => {
    const { pictures, sinceMs } = window.seen;
    const seconds = (performance.now() - sinceMs) / 1000;
    // The light comes back to the same place, so a picture is compared with the one before it only.
    const moments = pictures.filter(({ painted }, index) => painted !== null && painted !== pictures[index - 1]?.painted).length;
    return { seconds, peak: window.sound.peak, moments, delaysMs: pictures.map(({ delayMs }) => delayMs) };
  });
}

async function setHidden(page, hidden) {
  await page.evaluate((value) => {
    Object.defineProperty(document, "hidden", { value, configurable: true });
    document.dispatchEvent(new Event("visibilitychange"));
  }, hidden);
}

await visit(async (page, complaints) => {
  await page.addInitScript(observeSound);
  await page.addInitScript(observe);
  await page.goto(address);
  await logIn(page);
  await page.locator('[data-camera="2"][data-state="live"]').waitFor({ timeout: 30_000 });
  await page.locator('[data-camera="2"] .tile-open').click();
  const live = page.locator('.large[data-state="live"]');
  await live.waitFor({ timeout: 30_000 });
  await page.waitForTimeout(1000);
  await report("watched", await measure(page));

  await page.getByRole("button", { name: "Sound" }).click();
  await page.locator('.large button[aria-pressed="true"]').waitFor();
  await page.waitForTimeout(2000);
  await report("heard", await measure(page));

  await setHidden(page, true);
  await report("hidden");
  await setHidden(page, false);
  await live.waitFor({ timeout: 30_000 });
  await report("seen again", { complaints });
});
