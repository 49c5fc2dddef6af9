// SPDX-License-Identifier: Apache-2.0
//
// One visit to nine cameras of one moment: in step for a while and after changes of the rate, the playhead dragged, one
// closed. CAMERAS are their ids, AT is the Unix time in milliseconds to begin at.
import { address, dragTo, folder, logIn, report, violations, visit } from "./visit.mjs";

await visit(async (page, complaints) => {
  const all = (state) => page.waitForFunction((wanted) => document.querySelectorAll(`.stage-picture${wanted}`).length === 9, state);
  /** The pictures of all at one instant: nothing is drawn meanwhile. */
  const sample = () =>
    page.evaluate(() => [...document.querySelectorAll(".stage-picture canvas")].map((canvas) => canvas.toDataURL("image/jpeg", 0.95).split(",")[1]));
  const samples = async () => {
    const taken = [];
    for (let at = 0; at < 4; at += 1) {
      taken.push(await sample());
      await page.waitForTimeout(170);
    }
    return taken;
  };

  await page.setViewportSize({ width: 1440, height: 900 });
  await page.goto(`${address}#events&at=${process.env.AT}&layout=3&cameras=${process.env.CAMERAS}`);
  await logIn(page);
  await all('.has-picture[data-state="paused"]');
  await report("opened", { samples: [await sample()] });
  await page.keyboard.press(" ");
  await all('[data-state="playing"]');
  await page.waitForTimeout(3_000);
  await page.screenshot({ path: `${folder}/nine.png` });
  await report("at 1", { samples: await samples() });
  for (const [rate, keys] of [["4", "]]"], ["½", "[[["], ["1", "]"]]) {
    for (const key of keys) await page.keyboard.press(key);
    await page.waitForTimeout(1_500);
    await report(`at ${rate}`, { samples: await samples(), rate: await page.locator(".rate option:checked").textContent() });
  }

  // The active picture alone, and so little time that the recordings fill the timeline.
  await page.keyboard.press("Enter");
  for (let press = 0; press < 12; press += 1) await page.locator(".timeline-lanes").press("+");
  const axis = await page.locator(".timeline-axis").boundingBox();
  const y = axis.y + 10;
  const secondAt = (px) => dragTo(page, axis, px);
  await page.evaluate(() => {
    const time = document.querySelector(".stage-picture.is-large .stage-time");
    window.seen = new Set();
    new MutationObserver(() => window.seen.add(time.textContent)).observe(time, { childList: true, characterData: true, subtree: true });
  });
  const seen = () => page.evaluate(() => [...window.seen]);
  await page.mouse.move(axis.x + 200, y);
  await page.mouse.down();
  const [here, there] = [await secondAt(200), await secondAt(400)];
  const middle = axis.x + 200 + ((Number(process.env.AT) / 1000 + 8 - here) * 200) / (there - here);
  await page.evaluate(() => window.seen.clear());
  // The pointer does not rest until several pictures have come, or no more are expected.
  const deadline = Date.now() + 20_000;
  for (let px = 0; (await seen()).length < 5 && Date.now() < deadline; px = (px + 1) % 120) await page.mouse.move(middle - 30 + Math.abs(px - 60), y);
  const pictures = (await seen()).length;
  const told = await secondAt(middle - axis.x + 31);
  await page.waitForFunction((seconds) => {
    const shown = /(\d\d):(\d\d\.\d)$/.exec(document.querySelector(".stage-picture.is-large .stage-time").textContent);
    return shown && Math.abs(Number(shown[1]) * 60 + Number(shown[2]) - (seconds % 3600)) < 1;
  }, told);
  const large = await page.evaluate(() => document.querySelector(".stage-picture.is-large canvas").toDataURL("image/jpeg", 0.95).split(",")[1]);
  await report("dragged", { pictures, told, large, players: await page.locator('.stage-picture[data-state="playing"]').count() });
  await page.mouse.up();
  await page.locator('.is-large[data-state="playing"]').waitFor();
  await page.keyboard.press("Escape");
  await all('[data-state="playing"]');
  await report("let go", { samples: await samples() });
  await page.locator(".stage-picture").nth(4).hover();
  await page.locator(".stage-picture").nth(4).getByRole("button", { name: /^Close/ }).click();
  await page.mouse.move(axis.x, axis.y);
  await report("closed", { violations: await violations(page), complaints });
});
