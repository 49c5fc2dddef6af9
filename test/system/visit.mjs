// SPDX-License-Identifier: Apache-2.0
//
// What visits in a browser have in common: node <visit>.mjs <address> <password> <folder for pictures>. A visit waits
// for a line before each step and writes a line of JSON after it, so that the caller can look at the server in between.
import { readFileSync } from "node:fs";
import { createRequire } from "node:module";
import { createInterface } from "node:readline";
import { complaintsOf, launchBrowser } from "../support/browsers.mjs";

export const [address, password, folder] = process.argv.slice(2);
const lines = createInterface({ input: process.stdin })[Symbol.asyncIterator]();

export async function report(step, facts = {}) {
  console.log(JSON.stringify({ step, ...facts }));
  await lines.next();
}

const axe = readFileSync(createRequire(import.meta.url).resolve("axe-core/axe.min.js"), "utf8");

/** What axe-core finds at what is shown. */
export async function violations(page) {
  await page.evaluate(axe);
  const found = (await page.evaluate(() => window.axe.run())).violations;
  return found.map(({ id, nodes }) => `${id}: ${nodes.map(({ target }) => target).join(" ")}`);
}

/** Gives the page, and a list that fills with what scripts and the content policy complain of. */
export async function visit(body) {
  const browser = await launchBrowser(folder);
  try {
    await lines.next();
    const context = await browser.newContext({ ignoreHTTPSErrors: true, viewport: { width: 1280, height: 800 } });
    const page = await context.newPage();
    await body(page, complaintsOf(page));
  } finally {
    await browser.close();
  }
}

/** Drags the pointer to a pixel of the timeline's axis, and gives the second of the playhead there. */
export async function dragTo(page, axis, px) {
  await page.mouse.move(axis.x + px, axis.y + 10);
  await page.evaluate(() => new Promise((resolve) => requestAnimationFrame(() => requestAnimationFrame(resolve))));
  return Number(await page.locator(".timeline-lanes").getAttribute("aria-valuenow"));
}

export async function logIn(page, word = password) {
  await page.getByLabel("Account").fill("admin");
  await page.getByLabel("Password").fill(word);
  await page.getByRole("button", { name: "Log in" }).click();
}
