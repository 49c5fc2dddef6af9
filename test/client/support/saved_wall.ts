// SPDX-License-Identifier: Apache-2.0
//
// A wall of four cameras in a browser, and what its account has saved.

import type { Locator, Page } from "playwright-core";
import { ServedClient } from "./served_client";

export const layout = (name: string, cameras: number[], grid = "auto") => ({ name, grid, cameras });
export const press = (within: Locator | Page, name: string) => within.getByRole("button", { name, exact: true }).click();

/** Make one in a describe block. */
export class SavedWall extends ServedClient {
  constructor() {
    super();
    beforeEach(() => {
      this.server.hasSession = true;
      this.server.cameras.length = 0;
      for (const id of [1, 2, 3, 4]) this.server.cameras.push({ id, name: `Camera ${id}`, video_type: 1 });
    });
  }

  get saved(): Record<string, unknown> {
    return this.server.setup.preferences.get(this.server.setup.userId) ?? {};
  }

  set saved(values: Record<string, unknown>) {
    this.server.setup.preferences.set(this.server.setup.userId, values);
  }

  savedAs(name: string): [key: string, value: unknown] | undefined {
    return Object.entries(this.saved).find(([, value]) => (value as { name?: string }).name === name);
  }

  async opened(hash = "", width = 1440, height = 900): Promise<Page> {
    const page = await this.open(this.address + hash, width, height);
    await page.waitForSelector(".tile[data-state=live], .wall-message p");
    return page;
  }
}

/** The ids of the cameras on the wall, in order. */
export function tiles(page: Page): Promise<string> {
  return page.locator(".tile").evaluateAll((all) => all.map((tile) => (tile as HTMLElement).dataset["camera"]).join(""));
}

export function shows(page: Page, expected: string): Promise<void> {
  return vi.waitFor(async () => expect(await tiles(page)).toBe(expected), 5000);
}

export async function openMenu(page: Page): Promise<Locator> {
  await press(page, "Layouts and sequences");
  return page.getByRole("dialog", { name: "Layouts and sequences" });
}
