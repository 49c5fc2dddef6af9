// SPDX-License-Identifier: Apache-2.0
//
// One visit to every screen: what axe-core finds on a desk and on a phone, what the page is called, what has the focus.
// Pictures of each are taken, at more sizes, where they are kept.
import { address, folder, logIn, report, violations, visit } from "./visit.mjs";

const isKept = "LOOKHAVEN_KEEP_SCREENSHOTS" in process.env;
const sizes = { desk: [1440, 900], laptop: [1024, 768], side: [844, 390], phone: [390, 844] };

await visit(async (page, complaints) => {
  /** Waits for the selector, then looks at what is shown. */
  const look = async (name, selector, judged = ["desk", "phone"]) => {
    await page.locator(selector).first().waitFor({ timeout: 20_000 });
    const facts = { title: await page.title(), focus: await page.evaluate(() => document.activeElement.textContent) };
    const all = [];
    for (const [size, [width, height]] of Object.entries(sizes)) {
      if (!isKept && !judged.includes(size)) continue;
      await page.setViewportSize({ width, height });
      await page.waitForTimeout(300);
      if (isKept) await page.screenshot({ path: `${folder}/${name}-${size}.png` });
      if (!judged.includes(size)) continue;
      all.push(...(await violations(page)).map((found) => `${size}: ${found}`));
    }
    await page.setViewportSize({ width: 1440, height: 900 });
    await report(name, { ...facts, violations: all, complaints });
  };
  const go = (hash) => page.evaluate((to) => void (location.hash = to), hash);

  await page.goto(address);
  await look("log-in", ".login-form");
  await logIn(page);
  await look("wall", '[data-camera="1"][data-state="live"]');
  await page.keyboard.press("?");
  await look("keys", "dialog[open] kbd", ["desk"]);
  await page.keyboard.press("Escape");
  // The second camera is left out.
  const cameras = await page.locator(".tile").count();
  const shows = (count) => page.waitForFunction((wanted) => document.querySelectorAll(".tile").length === wanted, count);
  await page.keyboard.press("l");
  await page.getByRole("button", { name: "Save the wall as a layout" }).click();
  await page.getByLabel("Name").fill("All but one");
  await page.locator("dialog .chip").nth(1).click();
  await look("save-layout", "dialog[open] .chip");
  await page.keyboard.press("Enter");
  await shows(cameras - 1);
  await go("#");
  await shows(cameras);
  await page.reload();
  await shows(cameras);
  await page.keyboard.press("l");
  await page.getByRole("button", { name: "New sequence" }).click();
  await page.getByLabel("Name").fill("Night");
  await page.getByRole("checkbox", { name: "All but one" }).check();
  await look("new-sequence", "dialog[open] .sequence-layouts");
  await page.keyboard.press("Enter");
  await page.getByText("The sequence is saved.").waitFor();
  await look("layouts", ".wall-menu[open]");
  await page.getByRole("link", { name: /^All but one/ }).click();
  await shows(cameras - 1);
  await look("layout", '[data-camera="1"][data-state="live"]');
  await page.keyboard.press("l");
  await page.getByRole("link", { name: /^Night/ }).click();
  await look("sequence", ".sequence-bar");
  await page.click("button.account");
  await page.getByRole("button", { name: "Your sessions" }).click();
  await look("sessions", "dialog[open] .plain-table", ["phone"]);
  await page.keyboard.press("Escape");
  await page.keyboard.press("Tab");
  await go("#camera=1");
  await look("large", '.large[data-state="live"]');
  await page.keyboard.press("s");
  await look("snapshot", "dialog[open] canvas", ["desk"]);
  await page.keyboard.press("Escape");
  await go("#events");
  await look("events", ".row");
  await page.locator(".row-open:enabled").first().click();
  await look("playing", '.stage-picture[data-state="playing"]');
  for (const panel of ["Calendar", "Timeline", "Filter"]) {
    await page.setViewportSize({ width: 390, height: 844 });
    await page.getByRole("button", { name: panel, exact: true }).click();
    await look(panel.toLowerCase(), ".events-body", ["phone"]);
  }
  await go("#map=1");
  await look("map", ".map-item");
  await page.keyboard.press("e");
  await page.locator(".map-editor .map-item").first().click();
  await look("editor", ".map-form");
  for (const [name, hash, selector] of [
    ["cameras", "cameras", ".camera-row"],
    ["camera", "cameras&open=1", ".form"],
    ["new-camera", "cameras&open=new", ".form"],
    ["groups", "groups", ".record-row"],
    ["group", "groups&open=1", ".form"],
    ["maps", "maps", ".emap-row img"],
    ["devices", "devices", ".device-row"],
    ["accounts", "accounts", ".record-row"],
    ["account", "accounts&open=2", ".rights"],
    ["storage", "storage", ".record-card"],
    ["mount", "storage&open=1", ".form"],
    ["hosts", "hosts", ".record-card details"],
    ["system", "system", ".health-summary"],
    ["audit", "audit", ".audit-entry, .settings-state"],
  ]) {
    await go(`#settings=${hash}`);
    await look(name, selector);
  }
});
