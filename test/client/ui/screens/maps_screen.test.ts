// SPDX-License-Identifier: Apache-2.0
//
// The maps' screen in a real browser: no way out of its editor loses changes unasked, and an output that is on is
// no alarm.

import { hasBrowser, isFirefox, ServedClient } from "../../support/served_client";

describe.skipIf(!hasBrowser)("in a browser", () => {
  const client = new ServedClient();

  // Playwright cannot read what a request of Firefox sends.
  test.skipIf(isFirefox)("changes that are not saved are asked about on every way out, and stay where the user does", async () => {
    client.server.hasSession = true;
    client.server.cameras.push({ id: 1, name: "Entrance", video_type: 1 });
    const place = { id: 1, hxId: 0, name: "Entrance", x: 5, y: 5, direction: 0, textPos: 0, iconCenterX: 0, iconCenterY: 0 };
    const map = { hideItemName: false, smallItemSize: false, items: [{ type: 0, ...place }] };
    client.server.answers = {
      Emaps: { emap: [{ id: 1, name: "Ground floor" }, { id: 2, name: "Upper floor" }] },
      Items: { ...map, name: "Ground floor", revision: 1 },
      Devices: { camera: [], emap: [], door: [], io: [], pos: [] },
      States: { door: [], io: [0, 1].map((portIdx) => ({ id: 7, hxId: 0, portIdx, state: "on", since: 1, camera: 0 })) },
    };
    const ports = [3, 1].map((portType, portIdx) => ({ ...place, type: 3, id: 7, x: 40 + 40 * portIdx, portIdx, portType }));
    client.server.emap = { ...map, items: [...map.items, ...ports], emap: "", emapType: "png" };
    const page = await client.open(`${client.address}#events`, 1440, 900);
    await page.evaluate(() => (location.hash = "#map=1"));
    await page.waitForSelector("[data-kind=io][data-state=on]");
    const colours = page.locator("[data-kind=io] .map-icon").evaluateAll((icons) => icons.map((one) => getComputedStyle(one).backgroundColor));
    expect((await colours).map((one) => one === "rgb(240, 178, 78)"), "an output that is on is no alarm").toEqual([true, false]);
    await page.click(".map-item");
    await page.locator(".large").getByRole("button", { name: /^Last 30 seconds of / }).click();
    await page.waitForSelector(".stage-caption");
    for (const shown of [".large", ".map-item"]) {
      await page.goBack();
      await page.waitForSelector(shown);
    }
    await page.keyboard.press("e");
    await page.focus(".map-editor .map-item");
    await page.keyboard.press("ArrowRight");
    let [asked, leaves] = [0, false];
    page.on("dialog", async (dialog) => {
      asked += 1;
      await (leaves ? dialog.accept() : dialog.dismiss());
    });
    const waysOut = [
      () => page.click(".nav-link"),
      () => page.evaluate(() => history.back()),
      () => page.evaluate(() => location.reload()),
      () => page.click(".account").then(() => page.click(".log-out")),
      () => page.evaluate(() => void (location.hash = "#map=2")),
      () => page.selectOption(".map-names", "2"),
    ];
    for (const [index, leave] of waysOut.entries()) {
      await leave();
      await vi.waitFor(() => expect([asked, new URL(page.url()).hash]).toEqual([index + 1, "#map=1"]), 12_000);
      const x = await page.locator(".map-editor .map-item").evaluate(({ style }) => style.getPropertyValue("--x"));
      expect([await page.inputValue(".map-names"), x]).toEqual(["1", "6"]);
    }
    // A session that ends asks nobody.
    client.server.hasSession = false;
    await page.keyboard.press("Control+s");
    await page.getByLabel("Account", { exact: true }).fill("x");
    await page.getByLabel("Password").fill("x");
    await page.keyboard.press("Enter");
    await page.locator(".map-editor .map-item[style*='--x: 6']").click();
    const revisions: number[] = [];
    let savedName = "";
    await page.route(/SaveItems/, (route) => {
      const saved = route.request().postDataJSON() as { revision: number; items: { name: string }[] };
      revisions.push(saved.revision);
      savedName = saved.items[0]!.name;
      return route.fulfill({ json: { success: true, data: { revision: 2 } } });
    });
    await page.keyboard.press("Control+s");
    await page.keyboard.press("Control+s");
    await page.getByText("The map is saved.").waitFor();
    expect(revisions, "a second request would be taken for someone else's change").toEqual([1]);
    // A field that is being typed in has told nobody of its change.
    const askedBefore = asked;
    await page.locator(".map-form [type=text]").press("End");
    await page.keyboard.press("?");
    await page.evaluate(() => history.back());
    await vi.waitFor(() => expect([asked, new URL(page.url()).hash]).toEqual([askedBefore + 1, "#map=1"]), 12_000);
    await page.keyboard.press("Control+s");
    await vi.waitFor(() => expect(savedName).toBe("Entrance?"));
    await page.keyboard.press("!");
    leaves = true;
    await page.evaluate(() => history.back());
    await page.waitForSelector(".events");
    expect(new URL(page.url()).hash).toBe("#events");
  }, 40_000);
});
