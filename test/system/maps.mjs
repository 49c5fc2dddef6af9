// SPDX-License-Identifier: Apache-2.0
//
// One visit to the maps: look at a camera from the map, follow a link, move an item and save it, also against someone
// else's change, and open a picture that would run a script.
import { address, folder, logIn, report, visit } from "./visit.mjs";

const item = (page, name) => page.locator(".map-item").filter({ hasText: name });
const place = (locator) => locator.evaluate(({ style }) => [style.getPropertyValue("--x"), style.getPropertyValue("--y")].map(Number));

async function drag(page, locator, right, down) {
  const { x, y, width, height } = await locator.boundingBox();
  await page.mouse.move(x + width / 2, y + height / 2);
  await page.mouse.down();
  await page.mouse.move(x + width / 2 + right, y + height / 2 + down, { steps: 5 });
  await page.mouse.up();
}

await visit(async (page, complaints) => {
  await page.goto(`${address}#maps`);
  await logIn(page);
  await page.locator('.map-item[data-state="closed"]').waitFor();
  await item(page, "Entrance").hover();
  await page.locator(".map-card canvas").waitFor({ timeout: 15_000 });
  await page.screenshot({ path: `${folder}/map.png` });
  await report("shown", {
    items: await page.locator(".map-item").count(),
    picture: await page.locator(".map-picture").evaluate(({ naturalWidth, naturalHeight }) => [naturalWidth, naturalHeight]),
  });

  await item(page, "Front door").click();
  await page.getByRole("button", { name: "Open its camera" }).click();
  await page.locator('.large[data-state="live"]').waitFor({ timeout: 15_000 });
  await report("camera", { hash: new URL(page.url()).hash });
  await page.keyboard.press("Escape");

  await item(page, "Upper floor").focus();
  await page.keyboard.press("Enter");
  await item(page, "Warehouse").waitFor();
  await report("link", { hash: new URL(page.url()).hash });
  await page.goBack();
  await item(page, "POS terminal").click();
  await page.locator(".map-card-transactions li").first().waitFor();
  await page.screenshot({ path: `${folder}/transactions.png` });
  await report("transactions", { transactions: await page.locator(".map-card-transactions li").allTextContents() });
  await page.keyboard.press("Escape");

  await page.getByRole("button", { name: "Edit the map" }).click();
  const terminal = page.locator(".map-editor .map-item").filter({ hasText: "POS terminal" });
  const before = await place(terminal);
  await drag(page, terminal, 60, -30);
  const dragged = await place(terminal);
  await page.keyboard.press("Control+z");
  const undone = await place(terminal);
  await page.keyboard.press("Control+y");
  await page.keyboard.press("Control+s");
  await page.getByText("The map is saved.").waitFor();
  await page.screenshot({ path: `${folder}/editor.png` });
  await report("moved", { before, dragged, undone, saved: await place(terminal) });

  // Meanwhile someone else has changed the map.
  await page.keyboard.press("ArrowRight");
  await page.getByRole("button", { name: "Save", exact: true }).click();
  await page.getByRole("alert").filter({ hasText: "Someone else" }).waitFor();
  await page.getByRole("button", { name: "Overwrite with mine" }).click();
  await page.getByRole("alert").filter({ hasText: "Someone else" }).waitFor({ state: "hidden" });
  await report("saved over", { saved: await place(terminal) });
  await page.getByRole("button", { name: "Done" }).click();

  await page.getByRole("combobox", { name: "Map" }).selectOption({ label: "Harmful" });
  await page.waitForFunction(() => document.querySelector(".map-picture")?.naturalWidth === 40);
  await page.waitForTimeout(500);
  await report("harmless", { title: await page.title(), complaints });
});
