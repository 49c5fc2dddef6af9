// SPDX-License-Identifier: Apache-2.0
//
// One visit to installed services: node installed.mjs <address> <folder for pictures> <event>. Logs in, sees cameras 1
// and 2 move, and the recorded event play. Ends with 1, and says why, where it does not.
import { complaintsOf, launchBrowser } from "../support/browsers.mjs";

const [address, folder, event] = process.argv.slice(2);
const kLimitMs = 30_000;

/** Waits until another picture follows the one that is drawn. */
async function moves(page, canvas) {
  await canvas.waitFor({ timeout: kLimitMs });
  const before = await canvas.evaluate((element) => element.toDataURL());
  const handle = await canvas.elementHandle();
  await page.waitForFunction(([element, first]) => element.toDataURL() !== first, [handle, before], { timeout: kLimitMs });
}

const browser = await launchBrowser(folder);
try {
  const page = await (await browser.newContext({ ignoreHTTPSErrors: true })).newPage();
  const complaints = complaintsOf(page);
  await page.goto(address);
  await page.getByLabel("Account").fill("owner");
  await page.getByLabel("Password").fill("correct horse");
  await page.getByRole("button", { name: "Log in" }).click();
  for (const camera of [1, 2]) await moves(page, page.locator(`[data-camera="${camera}"][data-state="live"] canvas`));
  await page.screenshot({ path: `${folder}/wall.png` });
  await page.goto(`${address}#event=${event}`);
  await moves(page, page.locator('.stage-picture[data-state="playing"] canvas').first());
  await page.screenshot({ path: `${folder}/event.png` });
  if (complaints.length > 0) throw new Error(`complaints: ${complaints.join("; ")}`);
} finally {
  await browser.close();
}
