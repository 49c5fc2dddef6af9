// SPDX-License-Identifier: Apache-2.0
//
// What all screens have in common, in a real browser.

import type { Page } from "playwright-core";
import { hasBrowser, ServedClient } from "../support/served_client";

/** What the window cuts off: controls, and texts that inform. Runs in the page. */
function cut(): (string | null)[] {
  const texts = ".bar-status, .bar-clock, .transport-about, .large-state";
  const isCut = (one: Element) => {
    const { left, right, top, bottom } = one.getBoundingClientRect();
    const isClipped = one.scrollWidth > one.clientWidth + 1 || one.scrollHeight > one.clientHeight + 1;
    return left < 0 || right > innerWidth || top < 0 || bottom > innerHeight || (one.matches(texts) && isClipped);
  };
  const controls = ":is(.bar, .transport) :is(a, button, select), .choice-button, .tile-bar button";
  return [...document.querySelectorAll(`${controls}, ${texts}, .stage`)]
    .filter((one) => one.getClientRects().length > 0 && !one.matches(".unseen") && isCut(one))
    .map((one) => one.ariaLabel ?? one.className);
}

/** Which frame is shown, once neither it nor the address has changed for two seconds: a step's picture comes later. */
async function settledFrame(page: Page): Promise<string> {
  const told = () => page.evaluate(() => `${document.querySelector(".transport-frame")!.textContent} at ${location.hash}`);
  for (let last = ""; ;) {
    const now = await told();
    if (now === last) return now.split(" at ")[0]!;
    last = now;
    await page.waitForTimeout(2_000);
  }
}

describe.skipIf(!hasBrowser)("in a browser", () => {
  const client = new ServedClient();
  const { server } = client;

  beforeAll(() => {
    server.cameras.push({ id: 1, name: "Entrance-of-the-".repeat(12), video_type: 1 });
    server.archive.recorded.push({ id: 1, camera: 1, start: Date.now() / 1000 - 600, stop: Date.now() / 1000 - 300, frames: 9 });
    server.archive.recorded.push({ id: 2, camera: 1, start: Date.now() / 1000 - 200, stop: Date.now() / 1000 - 100, frames: 5_000 });
    const item = { type: 0, id: 1, hxId: 0, name: "Entrance", x: 5, y: 5, direction: 0, textPos: 0, iconCenterX: 0, iconCenterY: 0 };
    server.answers = { Emaps: { emap: [{ id: 1, name: "Ground floor ".repeat(12) }] }, States: { door: [], io: [] } };
    server.emap = { hideItemName: false, smallItemSize: false, items: [item], emap: "", emapType: "png" };
    server.hasSession = true;
  });

  test.each([
    ["", "#events", ".row"],
    ["", "#maps", ".map-item"],
    ["#events", "#", ".tile[data-state=live]"],
  ])("from %s to %s while the server is away: what is there comes by itself when it returns", async (from, to, content) => {
    server.isAway = true;
    const page = await client.open(client.address + from, 1440, 900);
    const isTold = () => page.getByText("does not answer").first().waitFor();
    await isTold();
    server.isAway = false;
    await page.waitForSelector(from ? ".events" : ".wall");
    server.isAway = true;
    await page.evaluate((hash) => void (location.hash = hash), to);
    await isTold();
    server.isAway = false;
    await page.locator(content).first().waitFor({ timeout: 25_000 });
  }, 60_000);

  test.each([
    [390, 844],
    [844, 390],
    [1024, 768],
    // A window of 1440 × 900 at 200 %.
    [720, 450],
  ])("at %i × %i nothing is cut off, however long the names are", async (widthPx, heightPx) => {
    const page = await client.open(client.address, widthPx, heightPx);
    for (const [hash, content] of [
      ["", ".tile[data-state=live]"],
      ["#camera=1", ".large[data-state=live]"],
      ["#event=2", ".stage-picture[data-state=playing]"],
      ["#maps", ".map-item"],
      ["#settings", ".settings-state"],
    ] as const) {
      await page.evaluate((to) => void (location.hash = to), hash);
      await page.waitForSelector(content);
      expect(await page.evaluate(cut), hash).toEqual([]);
    }
  }, 60_000);

  const playing = (page: Page, wanted: boolean) => page.waitForSelector(`.transport[data-playing=${wanted}]`);

  test("a click leaves the keys to the screen, Tab gives them to the control; the address keeps the picture", async () => {
    const page = await client.open(`${client.address}#event=2`, 1440, 900);
    await playing(page, true);
    await page.click("[aria-label='Next frame']");
    await playing(page, false);
    await page.keyboard.press(" ");
    await playing(page, true);
    await page.keyboard.press("Tab");
    await page.focus("[aria-label='Next frame']");
    await page.keyboard.press(" ");
    await playing(page, false);
    await page.keyboard.press("?");
    await page.getByRole("dialog", { name: "Keys" }).getByText("Play or pause").waitFor();
    await page.keyboard.press("Escape");
    await page.waitForSelector(".day.playing");
    expect(await page.isDisabled("[aria-label='Next month']"), "beyond today").toBe(true);
    await page.waitForURL(/#event=2&at=\d+&/);
    const frame = await settledFrame(page);
    await page.reload();
    await page.locator(".transport-frame", { hasText: frame }).waitFor();
    await playing(page, false);
  }, 40_000);

  test.each([["#", ".grid"], ["#event=2", ".stage"], ["#camera=1", ".large .picture"]])("full screen of %s is for the pictures", async (hash, picture) => {
    const page = await client.open(client.address + hash, 1440, 900);
    await page.waitForSelector(picture);
    await page.keyboard.press("f");
    await page.waitForFunction((selector) => {
      const { top, width } = document.querySelector(selector)!.getBoundingClientRect();
      return document.fullscreenElement !== null && top === 0 && width === innerWidth;
    }, picture);
  }, 40_000);
});
