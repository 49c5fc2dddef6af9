// SPDX-License-Identifier: Apache-2.0
//
// The built client in a real browser: which connections it holds, what it says of a silent camera, keyboard and phone.

import { Browser, hasBrowser, type Page } from "./browser";
import { FakeServer } from "./fake_server";

describe.skipIf(!hasBrowser)("in Chromium", () => {
  const server = new FakeServer();
  let browser: Browser;
  let address: string;

  beforeAll(async () => {
    browser = new Browser();
    address = await server.start();
    const page = await browser.open(address, 100, 100);
    const picture = await page.run(() => {
      const canvas = Object.assign(document.createElement("canvas"), { width: 640, height: 360 });
      return canvas.toDataURL("image/jpeg").split(",")[1]!;
    });
    server.jpeg = Buffer.from(picture, "base64");
    await page.send("Page.close", {});
  }, 30_000);

  afterAll(async () => {
    await browser.close();
    server.close();
  });

  async function loggedIn(cameras: number, widthPx = 1440, heightPx = 900): Promise<Page> {
    server.hasSession = false;
    server.stalled.clear();
    server.cameras.length = 0;
    for (let id = 1; id <= cameras; id += 1)
      server.cameras.push({ id, name: `Camera <b>${id}</b>`, video_type: id === 2 ? 3 : 1 });
    const page = await browser.open(address, widthPx, heightPx);
    await page.until(() => document.querySelector(".login") !== null);
    await page.run(() => {
      addEventListener("securitypolicyviolation", (event) => (document.title += ` ${event.violatedDirective}`));
      document.querySelectorAll("input").forEach((input) => (input.value = "x"));
    });
    await page.press("Enter");
    await page.until(() => document.querySelector(".tile[data-state=live]") !== null);
    return page;
  }

  const open = (streams: string[]) => vi.waitFor(() => expect([...server.streams].sort()).toEqual(streams), 5000);

  async function leave(page: Page): Promise<void> {
    await page.send("Page.close", {});
    await open([]);
  }

  test("four tiles stream and the others poll in turns; what is not seen has no connection", async () => {
    const page = await loggedIn(9);
    await open(["1/1", "3/1", "4/1", "5/1"]);
    await page.until(() => document.querySelectorAll(".tile[data-state=live]").length === 8);
    await vi.waitFor(() => expect(server.polls).toBeGreaterThan(7), 5000);
    expect(server.mostPollsAtOnce).toBe(1);
    await page.click("[data-camera='3'] .tile-open");
    await open(["3/usual"]);
    await page.press("Escape");
    await open(["1/1", "3/1", "4/1", "5/1"]);
    await page.click("[data-layout='2']");
    await open(["1/1", "3/1", "4/1"]);
    await page.run(() => document.querySelector(".grid")!.scrollTo(0, 1e6));
    await open(["7/1", "8/1", "9/1"]);
    await page.run(() => {
      Object.defineProperty(document, "hidden", { value: true });
      document.dispatchEvent(new Event("visibilitychange"));
    });
    await open([]);
    await leave(page);
  }, 40_000);

  test("a silent camera is told from a live one, and comes back", async () => {
    const page = await loggedIn(3);
    await page.until(() => document.querySelector("[data-camera='3']")!.getAttribute("data-state") === "live");
    server.stalled.add(3);
    await page.until(() =>
      /^No signal since \d\d:\d\d:\d\d$/.test(
        document.querySelector("[data-camera='3'] .message-sentence")!.textContent!,
      ),
    );
    expect(await page.run(() => document.querySelector(".wall-count")!.textContent)).toBe(
      "3 cameras · 1 without signal",
    );
    expect(await page.run(() => document.querySelector("[data-camera='1']")!.getAttribute("data-state"))).toBe("live");
    server.stalled.clear();
    await page.until(() => document.querySelector("[data-camera='3']")!.getAttribute("data-state") === "live");
    await leave(page);
  }, 40_000);

  test("all can be done with keys; a snapshot opens over the picture and closes without leaving it", async () => {
    const page = await loggedIn(4);
    await page.run(() => document.querySelector<HTMLElement>("[data-camera='1'] .tile-open")!.focus());
    await page.press("ArrowDown");
    await page.press("Enter");
    const shown = () => document.querySelector(".large-name")?.textContent ?? "";
    await vi.waitFor(async () => expect(await page.run(shown)).toBe("Camera <b>3</b>"));
    await page.press("s");
    await page.until(
      () => document.querySelector<HTMLAnchorElement>("dialog a")?.download.startsWith("Camera-b-3-b_") ?? false,
    );
    await page.press("Escape");
    await page.until(() => !document.querySelector("dialog")!.open);
    await page.press("ArrowLeft");
    expect(await page.run(shown)).toBe("Camera <b>2</b>");
    await page.until(
      () => document.querySelector(".large .message-sentence")!.textContent === "Live view is not available yet",
    );
    await page.press("Escape");
    await page.until(() => document.activeElement?.closest(".tile")?.getAttribute("data-camera") === "2");
    expect(await page.run(() => document.title), "violations of the policy").toBe("Lookhaven");
    await leave(page);
  }, 40_000);

  test("logging out and a session that ends both lead to the login, with every stream closed", async () => {
    const page = await loggedIn(4);
    await page.click("[aria-label='Log out admin']");
    await page.until(() => document.querySelector(".login") !== null);
    await open([]);
    await page.send("Page.close", {});
    const other = await loggedIn(4);
    server.hasSession = false;
    await other.until(
      () => document.querySelector(".login-message")?.textContent === "Your session has ended. Please log in again.",
    );
    await leave(other);
  }, 40_000);

  test("a phone shows one column, and nothing too small for a finger", async () => {
    const page = await loggedIn(4, 390, 844);
    const columns = () =>
      new Set([...document.querySelectorAll(".tile")].map((tile) => tile.getBoundingClientRect().left)).size;
    expect(await page.run(columns)).toBe(1);
    const small = () =>
      [...document.querySelectorAll("button, a")]
        .filter((control) => control.getClientRects().length > 0)
        .filter((control) => Math.min(control.clientWidth, control.clientHeight) < 44)
        .map((control) => control.ariaLabel);
    expect(await page.run(small)).toEqual([]);
    await page.click(".tile-open");
    await page.until(() => document.querySelector(".large[data-state=live]") !== null);
    expect(await page.run(small)).toEqual([]);
    expect(await page.run(() => document.documentElement.scrollWidth)).toBe(390);
    await leave(page);
  }, 40_000);
});
