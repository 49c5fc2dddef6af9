// SPDX-License-Identifier: Apache-2.0
//
// One visit that sets up without a shell: a camera of the network with its picture first and a plan, and an account
// that sees it alone, without its sound. CAMERA is the camera's address.
import { address, folder, logIn, password, report, visit } from "./chromium.mjs";

const kWord = "a long night";

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
  const row = (name) => page.locator(".emap-row", { hasText: name });
  const chosen = (name, mimeType, bytes) => ({ name, mimeType, buffer: Buffer.from(bytes) });
  const plan = '<svg xmlns="http://www.w3.org/2000/svg" width="400" height="200"><rect width="400" height="200" fill="red"/></svg>';
  await page.evaluate(() => void (location.hash = "#settings=maps"));
  await page.getByRole("button", { name: "Add a map…" }).click();
  await dialog("Add a map").getByLabel("Picture").setInputFiles(chosen("Loading dock.png", "image/png", "no picture"));
  await dialog("Add a map").getByRole("button", { name: "Add", exact: true }).click();
  const refusal = dialog("Add a map").getByRole("alert").filter({ hasText: "PNG" });
  await refusal.waitFor();
  const refused = await refusal.textContent();
  await dialog("Add a map").getByLabel("Picture").setInputFiles(chosen("plan.svg", "image/svg+xml", plan));
  await dialog("Add a map").getByRole("button", { name: "Add", exact: true }).click();
  await row("Loading dock").locator("img").waitFor({ timeout: 20_000 });
  await page.waitForFunction(() => [...document.querySelectorAll(".emap-row img")].every((image) => image.naturalWidth > 0));
  const size = await row("Loading dock").locator("img").evaluate((image) => [image.naturalWidth, image.naturalHeight]);
  await page.screenshot({ path: `${folder}/maps.png` });
  await page.setViewportSize({ width: 390, height: 844 });
  const narrow = await page.evaluate(() => document.querySelector(".settings-page").scrollWidth);
  await page.screenshot({ path: `${folder}/maps-phone.png` });
  await page.setViewportSize({ width: 1280, height: 800 });
  await page.getByRole("button", { name: "Rename Loading dock" }).click();
  await dialog("Rename Loading dock").getByLabel("Name").fill("Dock");
  await dialog("Rename Loading dock").getByRole("button", { name: "Rename" }).click();
  await row("Dock").waitFor();
  await page.getByRole("button", { name: "Remove Upper floor" }).click();
  const removal = await dialog("Remove Upper floor?").innerText();
  await dialog("Remove Upper floor?").getByRole("button", { name: "Cancel" }).click();
  await page.getByRole("link", { name: "Place cameras on Dock" }).click();
  await page.locator(".map-editor").waitFor();
  await report("maps", { refused, size, narrow, removal, hash: new URL(page.url()).hash });

  await page.evaluate(() => void (location.hash = "#settings=accounts&open=new"));
  await page.getByLabel("Name").fill("night");
  await page.getByLabel("Password", { exact: true }).fill(kWord);
  await page.getByLabel("Repeat password").fill(kWord);
  for (const right of ["Live", "Sound", "Playback"]) await page.getByLabel(`All cameras: ${right}`).click();
  for (const right of ["Live", "Playback"]) await page.getByLabel(`Loading bay: ${right}`).check();
  await page.getByRole("button", { name: "Add the account" }).click();
  await page.getByLabel("Your own password").fill(password);
  await page.getByRole("button", { name: "Add", exact: true }).click();
  await page.locator(".record-row", { hasText: "night" }).waitFor();
  await page.screenshot({ path: `${folder}/accounts.png` });
  await report("account", { word: kWord, row: await page.locator(".record-row", { hasText: "night" }).innerText() });

  await page.evaluate(() => void (location.hash = "#settings=system"));
  await page.locator(".health-summary").waitFor({ timeout: 30_000 });
  await page.getByLabel("Recordings side by side").fill("5");
  await page.getByRole("button", { name: "Save", exact: true }).click();
  await page.getByText("The settings are saved.").waitFor();
  await page.screenshot({ path: `${folder}/system.png`, fullPage: true });
  await report("system", { text: await page.locator(".settings-content").innerText() });

  await page.evaluate(() => void (location.hash = "#settings=audit"));
  await page.locator(".audit-entry").first().waitFor();
  await report("audit", { entries: await page.locator(".audit-what").allInnerTexts() });

  await page.getByRole("button", { name: "Account admin" }).click();
  await page.getByRole("button", { name: "Log out" }).click();
  await page.locator(".login-form").waitFor();
  await page.getByLabel("Account", { exact: true }).fill("night");
  await page.getByLabel("Password").fill(kWord);
  await page.getByRole("button", { name: "Log in" }).click();
  await page.evaluate(() => void (location.hash = "#"));
  await page.locator('.tile[data-state="live"]').waitFor({ timeout: 20_000 });
  await report("night", {
    tiles: await page.locator(".tile").count(),
    links: await page.locator(".nav-link").allInnerTexts(),
    complaints,
  });
});
