// SPDX-License-Identifier: Apache-2.0
//
// Saved layouts of the wall in a real browser: their menu, their addresses, what is refused.

import { layout, openMenu, press, SavedWall, shows } from "../../support/saved_wall";
import { hasBrowser, smallControls } from "../../support/served_client";

describe.skipIf(!hasBrowser)("in a browser", () => {
  const wall = new SavedWall();

  test("the wall is saved, changed, overwritten, given another name and deleted; its address leads to it", async () => {
    const page = await wall.opened();
    await page.click("[data-layout='2']");
    let menu = await openMenu(page);
    await press(menu, "Save the wall as a layout");
    const form = page.getByRole("dialog", { name: "Save the layout" });
    await press(form, "Save");
    await form.getByRole("alert").filter({ hasText: "Please give the layout a name." }).waitFor();
    await form.getByLabel("Name").fill(" Gates ");
    await form.getByText("Camera 2").click();
    await form.getByText("Camera 4").click();
    await page.keyboard.press("Enter");
    await page.waitForURL(/#layout=[0-9a-f]{8}$/);
    await shows(page, "13");
    const [name, value] = wall.savedAs("Gates")!;
    expect(value).toEqual({ name: "Gates", grid: "2", cameras: [1, 3] });
    expect(page.url()).toMatch(`#layout=${name.slice("saved.layout.".length)}`);
    await vi.waitFor(() => expect([...wall.server.streams].sort()).toEqual(["1/1", "3/1"]), 5000);

    // A name is taken once.
    menu = await openMenu(page);
    await press(menu, "Save the wall as a layout");
    await form.getByLabel("Name").fill("gates");
    await press(form, "Save");
    await form.getByRole("alert").filter({ hasText: "There is a layout of this name already." }).waitFor();
    await press(form, "Cancel");
    await page.keyboard.press("Escape");

    // What is changed is neither saved nor the user's own until it is overwritten.
    await page.focus("[data-camera='1'] .tile-open");
    await page.keyboard.press("Shift+ArrowRight");
    await page.click("[data-layout='first']");
    await page.getByRole("link", { name: "Gates (changed)" }).waitFor();
    await page.keyboard.press("l");
    await menu.getByRole("link", { name: /^Gates/ }).click();
    await shows(page, "13");
    await page.focus("[data-camera='1'] .tile-open");
    await page.keyboard.press("Shift+ArrowRight");
    menu = await openMenu(page);
    await press(menu, "Overwrite Gates with the wall");
    await press(page.getByRole("dialog", { name: "Overwrite Gates?" }), "Overwrite");
    await vi.waitFor(() => expect(wall.savedAs("Gates")![1]).toEqual({ name: "Gates", grid: "2", cameras: [3, 1] }));
    await press(menu, "Change Gates");
    const change = page.getByRole("dialog", { name: "Change Gates" });
    await change.getByLabel("Name").fill("Doors");
    await change.getByText("Camera 2").click();
    await press(change, "Save");
    await shows(page, "312");
    await page.keyboard.press("Escape");
    await page.reload();
    await shows(page, "312");
    expect(await page.getAttribute("[data-layout='2']", "aria-pressed")).toBe("true");
    await page.click("[data-camera='3'] .tile-open");
    await page.keyboard.press("Escape");
    await page.waitForURL(`**/#layout=${name.slice("saved.layout.".length)}`);
    await page.getByRole("link", { name: "All", exact: true }).click();
    await shows(page, "1234");

    menu = await openMenu(page);
    await press(menu, "Delete Doors");
    await press(page.getByRole("dialog", { name: "Delete Doors?" }), "Cancel");
    expect(wall.savedAs("Doors")).toBeDefined();
    await press(menu, "Delete Doors");
    await press(page.getByRole("dialog", { name: "Delete Doors?" }), "Delete");
    await page.getByText("Doors is deleted.").waitFor();
    expect(wall.saved).toEqual({ "wall.layout": "2" });
    await page.keyboard.press("Escape");
    await page.goBack();
    await page.getByText("This layout does not exist or was deleted.").waitFor();
    await page.getByRole("link", { name: "Show all cameras" }).click();
    await shows(page, "1234");
  }, 60_000);

  test("of two tabs that save, neither loses what the other has saved", async () => {
    const pages = [await wall.opened("#group=1"), await wall.opened()];
    for (const [at, page] of pages.entries()) {
      const menu = await openMenu(page);
      await press(menu, "Save the wall as a layout");
      await page.getByLabel("Name").fill(`Layout ${at}`);
      await page.keyboard.press("Enter");
      await page.waitForURL(/#layout=/);
    }
    expect([wall.savedAs("Layout 0")?.[1], wall.savedAs("Layout 1")?.[1]]).toEqual([layout("Layout 0", [1, 2]), layout("Layout 1", [1, 2, 3, 4])]);
    const menu = await openMenu(pages[0]!);
    await menu.getByRole("link", { name: /^Layout 1/ }).click();
    await shows(pages[0]!, "1234");
    // A link of one opens in the other, which has not looked since.
    wall.saved = { ...wall.saved, "saved.layout.z": layout("New", [4]) };
    await pages[1]!.evaluate(() => void (location.hash = "#layout=z"));
    await shows(pages[1]!, "4");
  }, 60_000);

  test("a layout whose answer was lost is saved once when that is tried again", async () => {
    const page = await wall.opened();
    let lost = 0;
    await page.route(/SetPreferences/, async (route) => {
      const answer = await route.fetch();
      if (wall.savedAs("Gates") && (lost += 1) === 1) await route.abort();
      else await route.fulfill({ response: answer });
    });
    const menu = await openMenu(page);
    await press(menu, "Save the wall as a layout");
    await page.getByLabel("Name").fill("Gates");
    await page.keyboard.press("Enter");
    await page.getByRole("alert").filter({ hasText: "The server does not answer." }).waitFor();
    await page.keyboard.press("Enter");
    await page.waitForURL(/#layout=/);
    expect(Object.values(wall.saved)).toEqual([layout("Gates", [1, 2, 3, 4])]);
  }, 40_000);

  test("what cannot be saved is refused with a sentence; what is damaged is not listed", async () => {
    wall.saved = {
      "saved.layout.a": layout("<b>Gates</b>", [1]),
      "saved.layout.b": { name: ["x"], cameras: "y" },
      "saved.layout.c": null,
      "saved.sequence.s": { name: "Night", dwellS: "x", layouts: { length: 9 } },
      "saved.sequence.t": { name: "Empty", dwellS: 5, layouts: ["gone"] },
      "wall.order": { length: -1 },
      other: "x".repeat(16_000),
    };
    const page = await wall.opened();
    const menu = await openMenu(page);
    expect(await menu.getByRole("link").allInnerTexts()).toEqual(["<b>Gates</b>\n1 camera · all cameras on the screen", "Empty\n0 layouts · 5 s each"]);
    await press(menu, "Save the wall as a layout");
    await page.getByLabel("Name").fill("x".repeat(64));
    await page.keyboard.press("Enter");
    await page.getByRole("alert").filter({ hasText: "The account has no room for this. Delete a layout or a sequence first." }).waitFor();
    await page.keyboard.press("Escape");
    await menu.getByRole("link", { name: /^Empty/ }).click();
    await page.getByText("This sequence has no layouts that can be shown.").waitFor();
  }, 40_000);

  test.each([
    [390, 844],
    [1100, 800],
  ])("at %i × %i the menu, its forms and the sequence's line are whole, and large enough for a finger on a phone", async (width, height) => {
    const long = "A layout with a name as long as the longest that there can be,123";
    const many = Array.from({ length: 20 }, (_, at) => [`saved.layout.${at}`, layout(`${at} ${long}`.slice(0, 64), [1, 2])]);
    wall.saved = { ...Object.fromEntries(many), "saved.sequence.s": { name: long.slice(0, 64), dwellS: 600, layouts: ["3", "4"] } };
    const page = await wall.opened("#sequence=s", width, height);
    const isWhole = async () => {
      if (width < 640) expect(await page.evaluate(smallControls, ".front button, .front a, dialog[open] button, dialog[open] a")).toEqual([]);
      const cut = await page.evaluate(() => {
        const shown = [...document.querySelectorAll(".bar > *, .nav > *, .sequence-bar > *, dialog[open] :is(button, a, input, label)")];
        const boxes = shown.map((one) => one.getBoundingClientRect()).filter((box) => box.width > 0);
        return boxes.some(({ left, right }) => left < 0 || right > innerWidth) || document.documentElement.scrollWidth > innerWidth;
      });
      expect(cut, "cut off").toBe(false);
      const hidden = await page.locator(".wall .bar-status").evaluate((status) => {
        const before = status.textContent;
        status.textContent = "16 of 64 cameras · 12 without signal";
        const hiddenPx = status.scrollHeight - status.clientHeight;
        status.textContent = before;
        return hiddenPx;
      });
      expect(hidden, "of the status").toBe(0);
    };
    await shows(page, "12");
    await isWhole();
    const menu = await openMenu(page);
    await isWhole();
    await press(menu, "New sequence");
    await isWhole();
    await press(page.getByRole("dialog", { name: "New sequence" }), "Cancel");
    await press(menu, "Save the wall as a layout");
    await isWhole();
  }, 40_000);
});
