// SPDX-License-Identifier: Apache-2.0
//
// A visit to a recording of H.264 with sound, which is played as it was recorded: heard, paused, stepped through, twice
// as fast; then to one of Motion JPEG. H264_EVENT and MJPEG_EVENT are their ids.
//
// Why so        What is drawn and heard is observed where it leaves the page: decoded video is drawn as such, pictures
//               are drawn as bitmaps.
import { observeSound } from "./sound.mjs";
import { address, folder, logIn, report, visit } from "./visit.mjs";

/** Runs in the page, before its own scripts. */
function observe() {
  const seen = (window.seen = { video: 0, pictures: 0 });
  const drawImage = CanvasRenderingContext2D.prototype.drawImage;
  CanvasRenderingContext2D.prototype.drawImage = function (image, ...place) {
    drawImage.call(this, image, ...place);
    if (this.canvas.closest(".stage-picture")) seen[image instanceof VideoFrame ? "video" : "pictures"] += 1;
  };
}

await visit(async (page, complaints) => {
  const settled = (state) => page.locator(`.stage-picture[data-state="${state}"]`).waitFor({ timeout: 15_000 });
  const untilFrame = (least) =>
    page.waitForFunction((wanted) => Number(/^frame (\d+)/.exec(document.querySelector(".transport-frame").textContent)?.[1]) >= wanted, least);
  const forget = () =>
    page.evaluate(() => {
      window.sound.peak = 0;
      Object.assign(window.seen, { video: 0, pictures: 0 });
    });
  const shown = () =>
    page.evaluate(() => ({
      picture: document.querySelector(".stage-picture canvas").toDataURL("image/jpeg", 0.95).split(",")[1],
      told: Number(/^frame (\d+)/.exec(document.querySelector(".transport-frame").textContent)[1]) - 1,
      caption: document.querySelector(".stage-time").textContent,
      ...window.seen,
    }));
  const open = async (event) => {
    await page.evaluate((to) => void (location.hash = to), `#event=${event}`);
    await page.locator(`.transport a[href*="event=${event}"]`).waitFor({ timeout: 15_000 });
    await settled("playing");
  };
  const pause = async () => {
    await page.keyboard.press(" ");
    await settled("paused");
  };

  await page.addInitScript(observeSound);
  await page.addInitScript(observe);
  await page.goto(`${address}#event=${process.env.H264_EVENT}`);
  await logIn(page);
  await settled("playing");
  await untilFrame(25);
  await pause();
  await report("paused", await shown());

  await forget();
  await page.keyboard.press("ArrowRight");
  await page.waitForFunction(() => window.seen.pictures > 0);
  await settled("paused");
  await report("stepped", await shown());

  await forget();
  await page.keyboard.press(" ");
  await settled("playing");
  await page.getByRole("button", { name: "Sound" }).click();
  await page.locator('.transport button[aria-pressed="true"][aria-label="Sound"]').waitFor();
  await page.waitForFunction(() => window.sound.peak > 0.01 && window.seen.video > 50, null, { timeout: 20_000 });
  await page.screenshot({ path: `${folder}/heard.png` });
  await pause();
  await report("heard", await shown());

  await page.getByLabel("Rate").selectOption("2");
  await forget();
  await page.keyboard.press(" ");
  await settled("playing");
  await page.waitForFunction(() => window.sound.peak > 0.01 && window.seen.video > 25, null, { timeout: 20_000 });
  await pause();
  await report("twice as fast", await shown());

  await page.getByLabel("Rate").selectOption("4");
  await page.keyboard.press(" ");
  await settled("playing");
  await forget();
  await page.waitForFunction(() => window.seen.pictures > 10);
  await pause();
  await report("four times as fast", await shown());

  await page.getByLabel("Rate").selectOption("1");
  await open(process.env.MJPEG_EVENT);
  await forget();
  await untilFrame(10);
  await pause();
  await report("motion jpeg", { ...(await shown()), complaints });
});
