// SPDX-License-Identifier: Apache-2.0
//
// The maps' screen in a real browser: no way out of its editor loses changes unasked.

import { hasBrowser } from "../../support/browser";
import { ServedClient } from "../../support/served_client";

describe.skipIf(!hasBrowser)("in Chromium", () => {
  const client = new ServedClient();

  test("changes that are not saved are asked about on every way out, and stay where the user does", async () => {
    client.server.hasSession = true;
    const place = { id: 1, hxId: 0, name: "Entrance", x: 5, y: 5, direction: 0, textPos: 0, iconCenterX: 0, iconCenterY: 0 };
    const map = { hideItemName: false, smallItemSize: false, items: [{ type: 0, ...place }] };
    client.server.answers = {
      Emaps: { emap: [{ id: 1, name: "Ground floor" }, { id: 2, name: "Upper floor" }] },
      Play: { ...map, emap: "", emapType: "png" },
      Items: { ...map, name: "Ground floor", revision: 1 },
      Devices: { camera: [], emap: [], door: [], io: [], pos: [] },
      States: { door: [], io: [] },
    };
    const page = await client.open(`${client.address}#events`, 1440, 900);
    await page.run(() => (location.hash = "#map=1"));
    await page.until(() => document.querySelector(".map-item") !== null);
    await page.press("e");
    await page.until(() => document.querySelector(".map-editor .map-item") !== null);
    await page.run(() => {
      document.body.dataset["asked"] = "0";
      window.confirm = () => {
        document.body.dataset["asked"] = String(Number(document.body.dataset["asked"]) + 1);
        return document.body.dataset["leave"] === "yes";
      };
      document.querySelector<HTMLElement>(".map-editor .map-item")!.focus();
    });
    await page.press("ArrowRight");
    const waysOut = [
      () => document.querySelector<HTMLElement>(".nav-link")!.click(),
      () => history.back(),
      () => document.querySelector<HTMLElement>(".log-out")!.click(),
      () => void (location.hash = "#map=2"),
      () => {
        const maps = document.querySelector<HTMLSelectElement>(".map-names")!;
        maps.value = "2";
        maps.dispatchEvent(new Event("change"));
      },
    ];
    for (const [index, leave] of waysOut.entries()) {
      await page.run(leave);
      await page.until((asked) => document.body.dataset["asked"] === asked && location.hash === "#map=1", String(index + 1));
      const left = () => [document.querySelector<HTMLSelectElement>(".map-names")!.value, document.querySelector<HTMLElement>(".map-editor .map-item")!.style.getPropertyValue("--x")];
      expect(await page.run(left)).toEqual(["1", "6"]);
    }
    await page.run(() => {
      document.body.dataset["leave"] = "yes";
      history.back();
    });
    await page.until(() => location.hash === "#events" && document.querySelector(".events") !== null);
    await client.leave(page);
  }, 40_000);
});
