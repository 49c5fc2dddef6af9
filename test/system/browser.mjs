// SPDX-License-Identifier: Apache-2.0
//
// One visit: log in, see camera 1 move, take a snapshot, log out.
import { download } from "../support/browsers.mjs";
import { address, folder, logIn, report, visit } from "./visit.mjs";

await visit(async (page, complaints) => {
  await page.goto(address);
  await logIn(page, "wrong");
  await page.getByRole("alert").filter({ hasText: "wrong" }).waitFor();
  await logIn(page);

  const tile = page.locator('[data-camera="1"]');
  await page.locator('[data-camera="1"][data-state="live"]').waitFor({ timeout: 15_000 });
  await page.locator('[data-camera="4"][data-state="live"]').waitFor({ timeout: 15_000 });
  await page.screenshot({ path: `${folder}/wall.png` });
  // The clock of the test pattern shows tenths at least; three pictures a second apart, so that one repeated by chance
  // is not taken for standing still.
  const shots = [];
  for (let shot = 0; shot < 3; shot += 1) {
    shots.push((await tile.locator("canvas").screenshot()).toString("base64"));
    await page.waitForTimeout(1000);
  }
  await report("streaming", {
    pictures: new Set(shots).size,
    states: await page.locator("[data-camera]").evaluateAll((tiles) => tiles.map(({ dataset }) => [dataset.camera, dataset.state])),
    protocol: await page.evaluate(() => performance.getEntriesByType("navigation")[0].nextHopProtocol),
  });

  await page.getByRole("button", { name: "Snapshot of Entrance" }).click();
  const dialog = page.getByRole("dialog", { name: "Snapshot" });
  const file = await download(page, () => dialog.getByRole("link", { name: "Download" }).click(), folder);
  await report("snapshot", { file });
  await dialog.getByRole("button", { name: "Close" }).click();

  await page.getByRole("button", { name: /^Entrance.*open large/ }).click();
  await page.waitForURL(/#camera=1/);
  await page.waitForTimeout(1500);
  await page.screenshot({ path: `${folder}/large.png` });
  await page.keyboard.press("Escape");

  await page.getByRole("button", { name: "Account admin" }).click();
  await page.getByRole("button", { name: "Log out" }).click();
  await page.getByRole("button", { name: "Log in" }).waitFor();
  await report("logged out", { complaints });
});
