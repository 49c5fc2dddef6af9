// SPDX-License-Identifier: Apache-2.0
//
// One visit to an installation without an account, on a phone: by a one-time address to an account, a first camera, and
// storage. TOKEN is valid, OLD is not; CAMERA is the camera's address. At each step, what axe-core finds.
import { address, folder, report, violations, visit } from "./chromium.mjs";

await visit(async (page, complaints) => {
  await page.setViewportSize({ width: 390, height: 844 });
  const look = async (step) => {
    await page.screenshot({ path: `${folder}/${step.replace(" ", "-")}.png` });
    await report(step, { violations: await violations(page), complaints });
  };
  const button = (name) => page.getByRole("button", { name }).click();

  await page.goto(address);
  await page.getByText("lookhaven setup-address").waitFor();
  await look("no account");

  await page.goto(`${address}#setup=${process.env.OLD}`);
  await page.getByLabel("Account").fill("ada");
  await page.getByLabel("Password (").fill("correct horse");
  await page.getByLabel("Repeat").fill("correct horse");
  await button("Create the account");
  await page.getByRole("alert").filter({ hasText: "replaced by a newer one" }).waitFor();
  await look("replaced");

  await page.evaluate((token) => void (location.hash = `#setup=${token}`), process.env.TOKEN);
  await button("Create the account");
  await page.locator(".setup-steps [aria-current=step]", { hasText: "First camera" }).waitFor();
  await page.getByLabel("Address", { exact: true }).fill(process.env.CAMERA);
  await look("account");

  await button("Test connection");
  await page.locator(".probe-picture").waitFor({ timeout: 30_000 });
  await page.getByLabel("Name").fill("Gate");
  await button("Add the camera");
  await page.locator(".camera-row", { hasText: "Gate" }).waitFor();
  await look("camera");

  await page.getByRole("link", { name: "Next: storage" }).click();
  await page.locator(".record-card", { hasText: "default" }).waitFor();
  await look("storage");

  await page.getByRole("link", { name: "Finish" }).click();
  await page.locator('.tile[data-state="live"]', { hasText: "Gate" }).waitFor({ timeout: 20_000 });
  await look("wall");
});
