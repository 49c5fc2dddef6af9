// SPDX-License-Identifier: Apache-2.0
//
// The built client in a browser, in front of a server that does what a test wants.

import { mkdtempSync, rmSync } from "node:fs";
import { tmpdir } from "node:os";
import { join } from "node:path";
import type { Browser, Page } from "playwright-core";
import { complaintsOf, launchBrowser } from "../../support/browsers.mjs";
import { FakeServer } from "./fake_server";

export { hasBrowser, isFirefox } from "../../support/browsers.mjs";

/**
 * Make one in a describe block: it starts before the tests there and ends after them. After each, its pages are closed,
 * nobody prefers anything, no stream may be left, and nothing may have been complained of.
 */
export class ServedClient {
  readonly server = new FakeServer();
  address = "";
  readonly downloads = mkdtempSync(join(tmpdir(), "client-"));
  #browser!: Browser;
  readonly #complaints: string[][] = [];

  constructor() {
    beforeAll(async () => {
      this.#browser = await launchBrowser(this.downloads);
      this.address = await this.server.start();
      const page = await this.#browser.newPage({ viewport: { width: 64, height: 36 } });
      this.server.jpeg = this.server.archive.picture = await page.screenshot({ type: "jpeg" });
      await page.close();
    }, 60_000);
    afterEach(async () => {
      for (const context of this.#browser.contexts()) await context.close();
      this.server.setup.preferences.clear();
      await vi.waitFor(() => expect([...this.server.streams, ...this.server.archive.streams]).toEqual([]), 5000);
      expect(this.#complaints.splice(0).flat(), "of scripts and of the content security policy").toEqual([]);
    });
    afterAll(async () => {
      await this.#browser.close();
      this.server.close();
      rmSync(this.downloads, { recursive: true });
    }, 60_000);
  }

  async open(address: string, width: number, height: number): Promise<Page> {
    const page = await this.#browser.newPage({ viewport: { width, height } });
    page.setDefaultTimeout(12_000);
    this.#complaints.push(complaintsOf(page));
    await page.goto(address);
    await page.waitForSelector(".login, .screen");
    return page;
  }
}

/** What a finger cannot hit: controls that are shown below 44 pixels. Runs in the page. */
export function smallControls(selector: string): (string | null)[] {
  return [...document.querySelectorAll(selector)]
    .filter((control) => control.getClientRects().length > 0)
    .filter((control) => Math.min(control.clientWidth, control.clientHeight) < 44)
    .map((control) => control.ariaLabel ?? control.textContent);
}
