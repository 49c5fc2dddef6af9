// SPDX-License-Identifier: Apache-2.0
//
// Drives Chromium through one visit: node browser.mjs <address> <password> <folder for pictures>. Writes a line of JSON
// after each step and waits for a line before the next, so that the caller can look at the server in between.
import { createInterface } from "node:readline";
import { chromium } from "playwright-core";

const [address, password, folder] = process.argv.slice(2);
const lines = createInterface({ input: process.stdin })[Symbol.asyncIterator]();

async function report(step, facts = {}) {
  console.log(JSON.stringify({ step, ...facts }));
  await lines.next();
}

const browser = await chromium.launch({
  executablePath: "/usr/bin/chromium",
  args: ["--no-sandbox", "--disable-gpu", "--disable-quic", "--no-first-run"].concat([
    "--disable-background-networking",
    "--disable-component-update",
    "--disable-sync",
  ]),
});
try {
  const context = await browser.newContext({ ignoreHTTPSErrors: true, viewport: { width: 1280, height: 800 } });
  const page = await context.newPage();
  const complaints = [];
  page.on("pageerror", (error) => complaints.push(String(error)));
  // Answers of the server are judged by what the page makes of them; this is about scripts and the content policy.
  page.on("console", (message) => {
    if (message.type() === "error" && !message.text().startsWith("Failed to load resource")) complaints.push(message.text());
  });

  await page.goto(address);
  await page.getByLabel("Account").fill("admin");
  await page.getByLabel("Password").fill("wrong");
  await page.getByRole("button", { name: "Log in" }).click();
  await page.getByRole("alert").filter({ hasText: "wrong" }).waitFor();
  await page.getByLabel("Password").fill(password);
  await page.getByRole("button", { name: "Log in" }).click();

  const tile = page.locator('[data-camera="1"]');
  await page.locator('[data-camera="1"][data-state="live"]').waitFor({ timeout: 15_000 });
  await page.locator('[data-camera="4"][data-state="live"]').waitFor({ timeout: 15_000 });
  await page.screenshot({ path: `${folder}/wall.png` });
  // The clock of the test pattern shows tenths at least; three pictures a second apart, so that one repeated by chance is not taken
  // for standing still.
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
  const saving = page.waitForEvent("download");
  await dialog.getByRole("link", { name: "Download" }).click();
  const download = await saving;
  await download.saveAs(`${folder}/snapshot.jpg`);
  await report("snapshot", { file: download.suggestedFilename() });
  await dialog.getByRole("button", { name: "Close" }).click();

  await page.getByRole("button", { name: /^Entrance.*open large/ }).click();
  await page.waitForURL(/#camera=1/);
  await page.waitForTimeout(1500);
  await page.screenshot({ path: `${folder}/large.png` });
  await page.keyboard.press("Escape");

  await page.getByRole("button", { name: "Log out admin" }).click();
  await page.getByRole("button", { name: "Log in" }).waitFor();
  await report("logged out", { complaints });
} finally {
  await browser.close();
}
