// SPDX-License-Identifier: Apache-2.0
//
// Touch gestures on a page, of which playwright has taps alone. Chromium only.

import type { Page } from "playwright-core";

type Point = { x: number; y: number };

export async function middleOf(page: Page, selector: string): Promise<Point> {
  const { x, y, width, height } = (await page.locator(selector).boundingBox())!;
  return { x: x + width / 2, y: y + height / 2 };
}

export class Fingers {
  private constructor(readonly send: (type: "touchStart" | "touchMove" | "touchEnd", touchPoints: Point[]) => Promise<unknown>) {}

  static async of(page: Page): Promise<Fingers> {
    const session = await page.context().newCDPSession(page);
    return new Fingers((type, touchPoints) => session.send("Input.dispatchTouchEvent", { type, touchPoints }));
  }

  /** Moves two fingers apart, to five times their distance, around the middle of what is there. */
  async spread(page: Page, selector: string): Promise<void> {
    const { x, y } = await middleOf(page, selector);
    const at = (px: number) => [-px, px].map((off) => ({ x: x + off, y }));
    await this.send("touchStart", at(20));
    for (let px = 30; px <= 100; px += 10) await this.send("touchMove", at(px));
    await this.send("touchEnd", []);
  }
}
