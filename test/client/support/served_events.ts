// SPDX-License-Identifier: Apache-2.0
//
// The events' screen of the built client, in front of an archive that a test knows.

import type { Page } from "playwright-core";
import { ServedClient } from "./served_client";

/** Of each recording. */
const kFrames = 3_000;

/** Make one in a describe block, as a ServedClient. */
export class ServedEvents {
  readonly client = new ServedClient();
  readonly archive = this.client.server.archive;
  /** Two days ago at noon of the browser's zone: an hour of two cameras, in recordings of five minutes. */
  readonly noon = Math.floor(new Date(Date.now() - 2 * 86_400_000).setHours(12, 0, 0, 0) / 1000);

  constructor() {
    const { client, archive, noon } = this;
    beforeAll(() => {
      archive.framesPerSecond = 10;
      client.server.cameras.push({ id: 1, name: "Entrance <b>", video_type: 1 }, { id: 2, name: "Parking", video_type: 1 });
      for (let piece = 0; piece < 12; piece += 1) {
        const start = noon + piece * 300;
        archive.recorded.push({ id: 10 + piece, camera: 1, start, stop: start + 300, frames: kFrames });
        archive.recorded.push({ id: 40 + piece, camera: 2, start, stop: start + 300, frames: kFrames, reason: 3 });
      }
      archive.recorded.push({ id: 90, camera: 2, start: noon, stop: noon + 30, frames: 300, kind: "pos", text: "2 Tea <b>\nTotal 5" });
    });
  }

  async open(hash: string, widthPx: number, heightPx: number, players = 1): Promise<Page> {
    this.archive.playersPerSession = players;
    this.archive.asked.length = 0;
    this.client.server.hasSession = true;
    return this.client.open(`${this.client.address}${hash}`, widthPx, heightPx);
  }
}

/** Waits for a picture on the stage that is in that state. */
export const state = (page: Page, wanted: string) => page.waitForSelector(`.stage-picture[data-state=${wanted}]`);

/** The times under the pictures. */
export const captions = (page: Page) => page.locator(".stage-time").allTextContents();

/** As if nothing had been clicked, so that keys go to the screen. */
export const noFocus = (page: Page) => page.evaluate(() => (document.activeElement as HTMLElement).blur());

export const hashOf = (page: Page) => new URL(page.url()).hash;
