// SPDX-License-Identifier: Apache-2.0
//
// The built client in a browser, in front of a server that does what a test wants.

import { existsSync } from "node:fs";
import { chromium, type Browser, type Page } from "playwright-core";
import { FakeServer } from "./fake_server";

const executablePath = "/usr/bin/chromium";
/** A name for this machine that a browser does not trust as it does 127.0.0.1. */
const kUntrustedName = "--host-resolver-rules=MAP lan.test 127.0.0.1";

export const hasBrowser = existsSync(executablePath);

/**
 * Make one in a describe block: it starts before the tests there and ends after them. After each, its pages are closed,
 * nobody prefers anything, no stream may be left, and nothing may have been complained of.
 */
export class ServedClient {
  readonly server = new FakeServer();
  address = "";
  #browser!: Browser;
  readonly #complaints: string[] = [];

  constructor() {
    beforeAll(async () => {
      this.#browser = await chromium.launch({ executablePath, args: ["--disable-gpu", "--disable-quic", kUntrustedName] });
      this.address = await this.server.start();
      const page = await this.#browser.newPage({ viewport: { width: 64, height: 36 } });
      this.server.jpeg = this.server.archive.picture = await page.screenshot({ type: "jpeg" });
      await page.close();
    }, 60_000);
    afterEach(async () => {
      for (const context of this.#browser.contexts()) await context.close();
      this.server.setup.preferences.clear();
      await vi.waitFor(() => expect([...this.server.streams, ...this.server.archive.streams]).toEqual([]), 5000);
      expect(this.#complaints.splice(0), "of scripts and of the content security policy").toEqual([]);
    });
    afterAll(async () => {
      await this.#browser.close();
      this.server.close();
    });
  }

  async open(address: string, width: number, height: number): Promise<Page> {
    const page = await this.#browser.newPage({ viewport: { width, height } });
    page.setDefaultTimeout(12_000);
    page.on("pageerror", (error) => this.#complaints.push(String(error)));
    page.on("console", (message) => {
      if (message.type() === "error" && !message.text().startsWith("Failed to load resource")) this.#complaints.push(message.text());
    });
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
