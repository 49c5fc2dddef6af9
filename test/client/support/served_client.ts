// SPDX-License-Identifier: Apache-2.0
//
// The built client in a browser, in front of a server that does what a test wants.

import { Browser, type Page } from "./browser";
import { FakeServer } from "./fake_server";

/** Make one in a describe block: it starts before the tests there and ends after them. */
export class ServedClient {
  readonly server = new FakeServer();
  address = "";
  #browser!: Browser;

  constructor() {
    beforeAll(async () => {
      this.#browser = new Browser();
      this.address = await this.server.start();
      const page = await this.#browser.open(this.address, 100, 100);
      this.server.jpeg = this.server.archive.picture = Buffer.from(await page.run(paintJpeg), "base64");
      await page.send("Page.close", {});
    }, 60_000);
    afterAll(async () => {
      await this.#browser.close();
      this.server.close();
    });
  }

  /** A page whose title tells violations of the content security policy. */
  async open(address: string, widthPx: number, heightPx: number): Promise<Page> {
    const page = await this.#browser.open(address, widthPx, heightPx);
    await page.until(() => document.querySelector(".login, .screen") !== null);
    await page.run(() =>
      addEventListener("securitypolicyviolation", (event) => (document.title += ` ${event.violatedDirective}`)),
    );
    return page;
  }

  /** Closes the page, and waits until no stream is left. */
  async leave(page: Page): Promise<void> {
    expect(await page.run(() => document.title), "violations of the policy").toBe("Lookhaven");
    await page.send("Page.close", {});
    await vi.waitFor(() => expect([...this.server.streams, ...this.server.archive.streams]).toEqual([]), 5000);
  }
}

/** What a finger cannot hit: controls that are shown below 44 pixels. Runs in the page. */
export function smallControls(selector: string): (string | null)[] {
  return [...document.querySelectorAll(selector)]
    .filter((control) => control.getClientRects().length > 0)
    .filter((control) => Math.min(control.clientWidth, control.clientHeight) < 44)
    .map((control) => control.ariaLabel ?? control.textContent);
}

/** A black picture as base64. Runs in the page. */
function paintJpeg(): string {
  const canvas = Object.assign(document.createElement("canvas"), { width: 64, height: 36 });
  return canvas.toDataURL("image/jpeg").split(",")[1]!;
}
