// SPDX-License-Identifier: Apache-2.0
//
// Touch gestures on a page, of which playwright has taps alone. Chromium only.

import type { Page } from "playwright-core";

type Point = { x: number; y: number };

export class Fingers {
  private constructor(readonly send: (type: "touchStart" | "touchMove" | "touchEnd", touchPoints: Point[]) => Promise<unknown>) {}

  static async of(page: Page): Promise<Fingers> {
    const session = await page.context().newCDPSession(page);
    return new Fingers((type, touchPoints) => session.send("Input.dispatchTouchEvent", { type, touchPoints }));
  }

  /** Moves two fingers apart, to five times their distance, around the middle of what is there. */
  async spread(page: Page, selector: string): Promise<void> {
    const { x, y, width, height } = (await page.locator(selector).boundingBox())!;
    const at = (px: number) => [-px, px].map((off) => ({ x: x + width / 2 + off, y: y + height / 2 }));
    await this.send("touchStart", at(20));
    for (let px = 30; px <= 100; px += 10) await this.send("touchMove", at(px));
    await this.send("touchEnd", []);
  }
}
