// SPDX-License-Identifier: Apache-2.0
//
// A sequence of saved layouts on the wall in a real browser: what it shows, and what holds it.

import type { Page } from "playwright-core";
import { layout, openMenu, press, SavedWall, shows, tiles } from "../../support/saved_wall";
import { hasBrowser } from "../../support/served_client";

describe.skipIf(!hasBrowser)("in a browser", () => {
  const wall = new SavedWall();

  test("a sequence goes from layout to layout; a camera in both keeps its picture and its stream", async () => {
    wall.saved = { "saved.layout.a": layout("Gates", [1, 2]), "saved.layout.b": layout("Yard", [3, 2]), "saved.layout.c": layout("Elsewhere", [99]) };
    const page = await wall.opened();
    const menu = await openMenu(page);
    await press(menu, "New sequence");
    const form = page.getByRole("dialog", { name: "New sequence" });
    await form.getByLabel("Name").fill("Night");
    await form.getByLabel("Seconds for each layout").fill("");
    for (const name of ["Elsewhere", "Gates", "Yard"]) await form.getByLabel(name, { exact: true }).check();
    await press(form, "Save");
    await form.getByRole("alert").filter({ hasText: "A layout is shown for 5 to 600 seconds." }).waitFor();
    await form.getByLabel("Seconds for each layout").fill("4");
    await press(form, "Save");
    expect(wall.savedAs("Night")).toBeUndefined();
    await form.getByLabel("Seconds for each layout").fill("600");
    await form.getByRole("button", { name: "Move Gates" }).press("ArrowDown");
    await press(form, "Save");
    await vi.waitFor(() => expect(wall.savedAs("Night")![1]).toEqual({ name: "Night", dwellS: 600, layouts: ["c", "b", "a"] }));

    await menu.getByRole("link", { name: /^Night/ }).click();
    await page.waitForURL(/#sequence=[0-9a-f]{8}$/);
    await shows(page, "32");
    const bar = page.getByRole("group", { name: "Sequence Night" });
    const text = () => bar.locator("p").textContent();
    expect(await text(), "the one whose cameras are not to be seen is skipped").toBe("Yard 1 of 2 · next: Gates");
    await page.waitForSelector("[data-camera='2'][data-state=live]");
    const asked: string[] = [];
    page.on("request", (request) => void (/method=Play/.test(request.url()) && asked.push(new URL(request.url()).searchParams.get("camera")!)));
    await page.evaluate(() => {
      const picture = document.querySelector<HTMLElement>("[data-camera='2'] .picture")!;
      picture.dataset["isSame"] = "true";
      // The picture may have none at no time: neither does it go, nor is it covered by a message.
      new MutationObserver(() => {
        const now = document.querySelector("[data-camera='2'] .picture[data-is-same].has-picture[data-state=live]");
        if (!now) document.body.dataset["flashed"] = "true";
      }).observe(document.querySelector(".grid")!, { subtree: true, childList: true, attributes: true });
    });
    await page.keyboard.press("n");
    await shows(page, "12");
    await page.waitForSelector("[data-camera='1'][data-state=live]");
    expect(await text()).toBe("Gates 2 of 2 · next: Yard");
    await page.keyboard.press("p");
    await shows(page, "32");
    await page.waitForSelector("[data-camera='3'][data-state=live]");
    expect([new Set(asked), await page.evaluate(() => document.body.dataset["flashed"])]).toEqual([new Set(["1", "3"]), undefined]);

    await press(bar, "Pause");
    expect(await text()).toBe("Yard paused · 1 of 2 · next: Gates");
    await press(bar, "Resume");
    await press(bar, "The next layout");
    await shows(page, "12");
    await bar.getByRole("link", { name: "Leave the sequence, stay at Gates" }).click();
    await page.waitForURL(/#layout=a$/);
    expect([await tiles(page), await bar.isVisible()]).toEqual(["12", false]);
  }, 60_000);

  test.each<[string, (page: Page) => Promise<unknown>]>([
    ["a click beside the pictures", (page) => page.click("[data-camera='1'] .tile-name")],
    ["a drag", (page) => page.dragAndDrop("[data-camera='1'] .tile-open", "[data-camera='2'] .tile-open")],
    ["a camera that is opened", (page) => page.evaluate(() => void (location.hash = "#camera=1")).then(() => page.waitForSelector(".large"))],
    ["Tab to a tile", (page) => page.focus("[data-camera='1'] .tile-open")],
    ["another grid", (page) => page.click("[data-layout='2']")],
  ])("a sequence pauses at %s", async (_what, touch) => {
    wall.saved = {
      "saved.layout.a": layout("Gates", [1, 2]),
      "saved.layout.b": layout("Yard", [3, 4]),
      "saved.sequence.s": { name: "Night", dwellS: 600, layouts: ["a", "b"] },
    };
    const page = await wall.opened("#sequence=s");
    await shows(page, "12");
    expect(await page.textContent(".sequence-next")).toBe("1 of 2 · next: Yard");
    await touch(page);
    await page.locator(".sequence-next", { hasText: "paused" }).waitFor({ state: "attached" });
  }, 40_000);

  test("a sequence goes on by itself, but not while the page is hidden", async () => {
    wall.saved = {
      "saved.layout.a": layout("Gates", [1, 2]),
      "saved.layout.b": layout("Yard", [3, 4]),
      "saved.sequence.s": { name: "Night", dwellS: 20, layouts: ["a", "b"] },
    };
    const page = await wall.opened("#sequence=s");
    await page.clock.install();
    await page.reload();
    await shows(page, "12");
    const hide = (isHidden: boolean) =>
      page.evaluate((value) => {
        Object.defineProperty(document, "hidden", { value, configurable: true });
        document.dispatchEvent(new Event("visibilitychange"));
      }, isHidden);
    await page.clock.runFor(21_000);
    await shows(page, "34");
    await hide(true);
    await page.clock.runFor(60_000);
    expect(await tiles(page)).toBe("34");
    await hide(false);
    await page.clock.runFor(21_000);
    await shows(page, "12");
  }, 40_000);
});
