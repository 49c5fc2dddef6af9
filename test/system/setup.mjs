// SPDX-License-Identifier: Apache-2.0
//
// One visit that changes without a shell what the demo has: another camera of the network with its picture first and a
// plan by the hour, groups, maps, settings. CAMERA is the camera's address.
import { address, folder, logIn, report, visit } from "./visit.mjs";

await visit(async (page, complaints) => {
  await page.goto(`${address}#settings=cameras`);
  await logIn(page);
  await page.getByRole("link", { name: "Add a camera" }).click();
  await page.getByLabel("Address", { exact: true }).fill(process.env.CAMERA);
  await page.getByRole("button", { name: "Test connection" }).click();
  await page.locator(".probe-picture").waitFor({ timeout: 30_000 });
  await page.screenshot({ path: `${folder}/tried.png` });
  await report("tried", {
    facts: await page.locator(".probe-facts").textContent(),
    size: await page.locator(".probe-picture").evaluate(({ width, height }) => [width, height]),
  });

  await page.getByLabel("Name").fill("Loading bay");
  await page.getByText("By the hour").click();
  for (const [mode, days] of [["Never", ["Mo", "Tu", "We", "Th", "Fr"]], ["On alert", ["Sa", "Su"]]]) {
    await page.locator(".plan").getByText(mode, { exact: true }).click();
    for (const day of days) await page.locator(".plan-day", { hasText: day }).click();
  }
  await page.getByLabel("Seconds before an alert").fill("7");
  await page.getByRole("button", { name: "Add the camera" }).click();
  await page.locator(".camera-row", { hasText: "Loading bay" }).waitFor();
  await page.evaluate(() => void (location.hash = "#"));
  await page.locator('.tile[data-state="live"]', { hasText: "Loading bay" }).waitFor({ timeout: 20_000 });
  await report("on the wall");

  await page.evaluate(() => void (location.hash = "#settings=cameras"));
  await page.locator(".camera-row .row-link", { hasText: "Loading bay" }).click();
  await page.getByRole("button", { name: "New group…" }).click();
  await page.getByRole("dialog", { name: "New group" }).getByLabel("Name").fill("Deliveries");
  await page.getByRole("dialog", { name: "New group" }).getByRole("button", { name: "Add", exact: true }).click();
  await page.getByLabel("Deliveries").waitFor({ state: "attached" });
  await page.getByRole("button", { name: "Save", exact: true }).click();
  await page.getByText("The camera is saved.").waitFor();
  await page.evaluate(() => void (location.hash = "#settings=groups"));
  await page.locator(".record-row", { hasText: "Deliveries" }).waitFor();
  await report("group", { row: await page.locator(".record-row", { hasText: "Deliveries" }).innerText() });

  const dialog = (name) => page.getByRole("dialog", { name });
  const row = (name) => page.locator(".emap-row", { has: page.getByRole("heading", { name, exact: true }) });
  await page.evaluate(() => void (location.hash = "#settings=maps"));
  await row("Upper floor").locator("img").waitFor();
  await page.setViewportSize({ width: 390, height: 844 });
  const narrow = await page.evaluate(() => document.querySelector(".settings-page").scrollWidth);
  await page.screenshot({ path: `${folder}/maps-phone.png` });
  await page.setViewportSize({ width: 1280, height: 800 });
  await page.getByRole("button", { name: "Rename Upper floor" }).click();
  await dialog("Rename Upper floor").getByLabel("Name").fill("Attic");
  await dialog("Rename Upper floor").getByRole("button", { name: "Rename" }).click();
  await row("Attic").waitFor();
  await page.getByRole("button", { name: "Remove Attic" }).click();
  const removal = await dialog("Remove Attic?").innerText();
  await dialog("Remove Attic?").getByRole("button", { name: "Cancel" }).click();
  await report("maps", { narrow, removal });

  await page.evaluate(() => void (location.hash = "#settings=system"));
  await page.locator(".health-summary").waitFor({ timeout: 30_000 });
  await page.getByLabel("Recordings side by side").fill("5");
  await page.getByRole("button", { name: "Save", exact: true }).click();
  await page.getByText("The settings are saved.").waitFor();
  await page.screenshot({ path: `${folder}/system.png`, fullPage: true });
  await report("system", { text: await page.locator(".settings-content").innerText() });

  await page.evaluate(() => void (location.hash = "#settings=audit"));
  await page.locator(".audit-entry").first().waitFor();
  await report("audit", { entries: await page.locator(".audit-what").allInnerTexts(), complaints });
});
