// SPDX-License-Identifier: Apache-2.0
//
// What all screens have in common, in a real browser.

import { hasBrowser, ServedClient } from "../support/served_client";

describe.skipIf(!hasBrowser)("in Chromium", () => {
  const client = new ServedClient();
  const { server } = client;

  beforeAll(() => {
    server.cameras.push({ id: 1, name: "Entrance", video_type: 1 });
    server.archive.recorded.push({ id: 1, camera: 1, start: Date.now() / 1000 - 600, stop: Date.now() / 1000 - 300, frames: 9 });
    const item = { type: 0, id: 1, hxId: 0, name: "Entrance", x: 5, y: 5, direction: 0, textPos: 0, iconCenterX: 0, iconCenterY: 0 };
    server.answers = { Emaps: { emap: [{ id: 1, name: "Ground floor" }] }, States: { door: [], io: [] } };
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
});
