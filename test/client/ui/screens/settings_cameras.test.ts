// SPDX-License-Identifier: Apache-2.0
//
// The list of cameras in a real browser: its order is changed by keys and by dragging, and nobody's is lost unseen.

import { cameraRecord } from "../../support/fake_setup";
import { hasBrowser, ServedClient } from "../../support/served_client";

describe.skipIf(!hasBrowser)("in a browser", () => {
  const client = new ServedClient();
  const { setup } = client.server;

  beforeEach(() => {
    client.server.hasSession = client.server.isManager = true;
    setup.asked.length = 0;
    setup.orderRevision = 1;
    setup.camera.splice(0, Infinity, cameraRecord(1, "Entrance"), cameraRecord(2, "Gate"));
  });

  const open = (section: string) => client.open(`${client.address}#settings=${section}`, 1024, 768);

  test("the order of the cameras changes with keys and by dragging, and is stored once", async () => {
    const page = await open("cameras");
    await page.getByRole("button", { name: "Move Entrance" }).focus();
    for (const key of ["ArrowDown", "ArrowUp", "ArrowDown"]) await page.keyboard.press(key);
    await vi.waitFor(() => expect(setup.asked).toEqual([["Camera.Order", { id: [2, 1], revision: 1 }]]), 5000);
    await page.getByRole("button", { name: "Move Entrance" }).hover();
    await page.mouse.down();
    await page.locator("[data-camera='2'] canvas").hover({ force: true, position: { x: 5, y: 5 } });
    await page.mouse.up();
    await vi.waitFor(() => expect(setup.asked[1]).toEqual(["Camera.Order", { id: [1, 2], revision: 2 }]), 5000);
  }, 20_000);

  test("an order that somebody else has changed meanwhile is shown beside one's own, and the user chooses", async () => {
    const page = await open("cameras");
    const shown = () => page.locator(".camera-row .row-link").allTextContents();
    for (const choice of ["Discard mine", "Overwrite with mine"]) {
      await page.getByRole("button", { name: "Move Entrance" }).focus();
      await page.keyboard.press("ArrowDown");
      setup.orderRevision += 5;
      setup.camera.push(cameraRecord(3 + setup.camera.length, "Yard"));
      const panel = page.getByRole("alert").filter({ hasText: "Someone else has changed this order of cameras" });
      await panel.waitFor();
      expect(await panel.getByRole("row").last().innerText()).toMatch(/^Order\tGate, Entrance(, Yard)?\tEntrance, Gate(, Yard)?, a new camera$/);
      expect(setup.asked).toEqual([]);
      await page.getByRole("button", { name: choice }).click();
      await panel.waitFor({ state: "detached" });
      if (choice === "Discard mine") await vi.waitFor(async () => expect(await shown()).toEqual(["Entrance", "Gate", "Yard"]));
    }
    await vi.waitFor(() => expect(setup.asked).toEqual([["Camera.Order", { id: [2, 1, 5, 6], revision: 11 }]]));
    await vi.waitFor(async () => expect(await shown()).toEqual(["Gate", "Entrance", "Yard", "Yard"]));
  }, 20_000);
});
