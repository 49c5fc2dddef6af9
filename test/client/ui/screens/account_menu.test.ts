// SPDX-License-Identifier: Apache-2.0
//
// What everybody has of an account of their own, in a real browser: its sessions, and what it prefers.

import type { Page } from "playwright-core";
import { hasBrowser, ServedClient, smallControls } from "../../support/served_client";

describe.skipIf(!hasBrowser)("in a browser", () => {
  const client = new ServedClient();
  const { server } = client;
  const { setup } = server;

  beforeAll(() => {
    for (const id of [1, 2, 3, 4]) server.cameras.push({ id, name: `Camera ${id}`, video_type: 1 });
    server.isManager = false;
  });

  const openAs = (user: number, width = 1024, height = 768) => {
    server.hasSession = true;
    setup.userId = user;
    return client.open(client.address, width, height);
  };
  const choose = async (page: Page, item: string) => {
    await page.click("button.account");
    await page.getByRole("button", { name: item, exact: true }).click();
  };
  const layout = (page: Page, name: string) => page.waitForSelector(`[data-layout='${name}'][aria-pressed=true]`);

  test("one's own sessions: one is ended, then all others, but not this one; on a phone, too", async () => {
    const session = { started: 1_772_352_000, lastUse: 1_772_352_930 };
    const from = (key: string, address: string, current = false) => ({ ...session, key, address, current });
    setup.session.push(from("a", "192.0.2.1", true), from("b", "192.0.2.2"), from("c", ""), from("d", "192.0.2.4"));
    setup.asked.length = 0;
    const page = await openAs(1, 390, 844);
    await choose(page, "Your sessions");
    const dialog = page.getByRole("dialog", { name: "Your sessions" });
    await dialog.getByRole("button", { name: "End the session from unknown" }).waitFor();
    expect(await dialog.locator("tbody tr").count()).toBe(4);
    expect(await dialog.getByRole("row", { name: /192\.0\.2\.1/ }).innerText()).toMatch(/this session$/);
    expect(await page.evaluate(smallControls, "dialog[open] button")).toEqual([]);
    expect(await page.evaluate(() => document.documentElement.scrollWidth)).toBe(390);
    await dialog.getByRole("button", { name: "End the session from 192.0.2.2" }).click();
    await page.getByText("The session from 192.0.2.2 is ended.").waitFor();
    await dialog.getByRole("button", { name: "End all others" }).click();
    await page.getByRole("dialog", { name: "End 2 sessions?" }).getByRole("button", { name: "End them" }).click();
    await page.getByText("2 sessions ended.").waitFor();
    await vi.waitFor(async () => expect(await dialog.locator("tbody tr").allInnerTexts()).toEqual([expect.stringMatching(/192\.0\.2\.1/)]));
    expect(await dialog.getByRole("button", { name: "End all others" }).isDisabled()).toBe(true);
    expect(setup.asked, "the caller's own").toEqual([["EndSessions", { key: "b" }], ["EndSessions", {}]]);
    await page.keyboard.press("Escape");
    await dialog.waitFor({ state: "detached" });
  }, 40_000);

  test("what an account prefers follows it to another browser, and stays apart from another's in the same one", async () => {
    const page = await openAs(1);
    await page.click("[data-layout='2']");
    await choose(page, "Log out");
    await page.waitForSelector(".login-form");
    expect(setup.preferences.get(1), "told before the session ended").toEqual({ "wall.layout": "2" });
    setup.userId = 2;
    for (const input of await page.locator("input").all()) await input.fill("x");
    await page.keyboard.press("Enter");
    await layout(page, "auto");
    await page.click("[data-layout='3']");
    await page.goto("about:blank");
    await vi.waitFor(() => expect(setup.preferences.get(2), "told by a page that is left").toEqual({ "wall.layout": "3" }));
    await layout(await openAs(1), "2");
    await layout(await openAs(2), "3");
  }, 40_000);
});
