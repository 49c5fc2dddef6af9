// SPDX-License-Identifier: Apache-2.0
//
// The first account in a real browser: nothing that was typed is lost, and nobody gets stuck.

import type { Page } from "playwright-core";
import { hasBrowser, ServedClient, smallControls } from "../../support/served_client";

describe.skipIf(!hasBrowser)("in a browser", () => {
  const client = new ServedClient();
  const { server } = client;

  beforeEach(() => {
    server.hasSession = server.hasAccount = server.isAway = false;
    server.setupToken = "beef";
  });

  const open = (hash: string) => client.open(client.address + hash, 390, 844);
  const make = (page: Page) => page.getByRole("button", { name: "Create the account" }).click();
  const says = (page: Page, words: string) => page.getByRole("alert").filter({ hasText: words }).waitFor();
  const typed = (page: Page) => page.locator("input").evaluateAll((fields) => fields.map((field) => (field as HTMLInputElement).value));

  test("from an address that has expired to the wall, each step in its turn", async () => {
    const page = await open("#setup=dead");
    const [name, password, again] = [page.getByLabel("Account"), page.getByLabel("Password ("), page.getByLabel("Repeat")];
    expect(await page.evaluate(smallControls, ".setup-form :is(input, button)")).toEqual([]);
    await name.waitFor();
    await page.keyboard.type("-ada");
    await make(page);
    await says(page, "A name has");
    await name.fill("ada");
    await password.fill("short");
    await make(page);
    await says(page, "at least 8");
    await password.fill("correct horse");
    await again.fill("correct house");
    await make(page);
    await says(page, "not the same");
    await again.fill("correct horse");
    server.isAway = true;
    await page.keyboard.press("Enter");
    await says(page, "does not answer");
    server.isAway = false;
    await make(page);
    await says(page, "has expired");
    await page.evaluate(() => void (location.hash = "#setup=beef"));
    expect(await typed(page)).toEqual(["ada", "correct horse", "correct horse"]);
    await make(page);
    const steps = page.getByRole("navigation", { name: "Set up" });
    await steps.locator("[aria-current=step]", { hasText: "First camera" }).waitFor();
    expect(page.url()).toBe(`${client.address}#settings=cameras&open=new`);
    await page.getByLabel("Address", { exact: true }).waitFor();
    expect(await page.evaluate(smallControls, ".setup-steps a")).toEqual([]);
    await page.getByRole("link", { name: "All cameras" }).click();
    await steps.getByRole("link", { name: "Next: storage" }).waitFor();
    await page.goBack();
    await steps.getByRole("link", { name: "Skip this step" }).click();
    await steps.locator("[aria-current=step]", { hasText: "Storage" }).waitFor();
    await steps.getByRole("link", { name: "Finish" }).click();
    await page.locator(".wall").waitFor();
    await page.evaluate(() => void (location.hash = "#settings"));
    await page.locator(".settings-link").first().waitFor();
    expect(await steps.count()).toBe(0);
  }, 40_000);

  test("without an address the command is told, and no log-in offered that cannot work", async () => {
    const page = await open("#events");
    await page.getByText("lookhaven setup-address").waitFor();
    expect(await page.locator("input").count()).toBe(0);
    await page.getByRole("button", { name: "Check again" }).click();
    await page.getByText("There is still no account.").waitFor();
    await page.evaluate(() => void (location.hash = "#setup=beef"));
    await page.getByLabel("Account").waitFor();
    await page.evaluate(() => void (location.hash = "#"));
    expect(await page.getByLabel("Account").count(), "what may be typed already stays").toBe(1);
  }, 40_000);

  test.each([
    ["another was faster", false],
    ["the address was used before", true],
  ])("there is an account where %s, and a log-in", async (_, isBefore) => {
    server.hasAccount = isBefore;
    const page = await open("#setup=beef");
    if (!isBefore) {
      await page.getByLabel("Account").fill("ada");
      await page.getByLabel("Password (").fill("correct horse");
      await page.getByLabel("Repeat").fill("correct horse");
      server.hasAccount = true;
      await make(page);
    }
    await says(page, "There is an account already");
    expect(page.url()).toBe(client.address);
    await page.getByLabel("Account").fill("admin");
    await page.getByLabel("Password").fill("secret");
    await page.getByRole("button", { name: "Log in" }).click();
    await page.locator(".wall").waitFor();
  }, 40_000);

  test("a log-in shows by itself when a server that was away has come back", async () => {
    server.hasAccount = server.isAway = true;
    const page = await open("");
    await page.getByText("does not answer").waitFor();
    server.isAway = false;
    await page.getByRole("button", { name: "Log in" }).waitFor();
  }, 40_000);
});
