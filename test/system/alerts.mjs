// SPDX-License-Identifier: Apache-2.0
//
// A visit of somebody who is told of alerts while watching, leaves, comes back, opens a second tab and looks there.
import { address, folder, logIn, report, visit } from "./visit.mjs";

await visit(async (page, complaints) => {
  const badge = (tab, count) => tab.waitForFunction((wanted) => document.querySelector(".nav-badge:not([hidden])")?.textContent === wanted, count);
  const unseen = (tab) => tab.locator(".nav-badge[hidden]").waitFor({ state: "attached" });
  const lookOf = () => Object.entries(localStorage).filter(([key]) => key.startsWith("lookhaven.look")).join();
  const camera = page.locator('[data-camera="1"]');

  await page.goto(address);
  await logIn(page);
  await camera.first().waitFor();
  await report("watching");
  await badge(page, "2");
  await camera.locator(".picture-frame", { hasText: "Alert" }).waitFor();
  await page.screenshot({ path: `${folder}/alert.png` });
  await report("told");

  await page.goto("about:blank");
  await report("away");
  await page.goto(address);
  await badge(page, "3");
  const other = await page.context().newPage();
  await other.goto(address);
  await badge(other, "3");
  await report("back");

  await other.evaluate(() => void (location.hash = "#events"));
  const notice = await other.locator(".notice.shown").textContent();
  await unseen(page);
  const look = await page.evaluate(lookOf);
  await report("looked", { notice });
  // Reported while the events are on the screen in one of the tabs.
  await other.locator(".row", { hasText: "Fourth" }).first().waitFor({ timeout: 20_000 });
  // The list may show it before the stream of reports does, which makes it seen.
  for (const until = Date.now() + 20_000; (await page.evaluate(lookOf)) === look; await page.waitForTimeout(50)) {
    if (Date.now() > until) throw new Error("the look at it is not known to the other tab");
  }
  await other.close();
  await page.reload();
  await report("alone");
  await badge(page, "1");
  await page.goto("about:blank");
  await page.goto(`${address}#events`);
  await report("looking", { notice: await page.locator(".notice.shown").textContent(), complaints });
});
