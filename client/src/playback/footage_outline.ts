// SPDX-License-Identifier: Apache-2.0
//
// The outline of weeks: what was recorded and reported of the cameras, as fine as the screen's pixels.
//
// Why so        Months of events are more than a page can fetch and draw in time. The server joins what is smaller than
//               a pixel, so that one answer has what is shown and as much again around it, to be dragged into view.

import type { LaneOutline, Recordings } from "../wire/recordings";
import { ServerError } from "../wire/server";
import { RequestQueue } from "./request_queue";

/** The most steps that the server takes in one request. */
const kMaxSteps = 20_000;
/** The most that it takes for all cameras of a request together. */
const kMaxCameraSteps = 400_000;
/** A span that reaches the present is fetched again after that. */
const kMaxAgeS = 30;
const kNoSuchApi = 404;

interface Outline {
  fromS: number;
  toS: number;
  stepS: number;
  lanes: ReadonlyMap<number, LaneOutline>;
}

/** What to ask for, in order to show `widthPx` pixels from `startMs` on: between half a pixel and a pixel a step. */
export function outlineOf(startMs: number, msPerPx: number, widthPx: number): { fromS: number; toS: number; stepS: number } {
  const spanS = (widthPx * msPerPx) / 1000;
  const fromS = Math.max(0, Math.floor(startMs / 1000 - spanS / 2));
  const toS = Math.ceil(startMs / 1000 + spanS * 1.5);
  let stepS = 2 ** Math.max(0, Math.floor(Math.log2(msPerPx / 1000)));
  while ((toS - fromS) / stepS > kMaxSteps) stepS *= 2;
  return { fromS, toS, stepS };
}

export class FootageOutline {
  readonly #recordings: Recordings;
  readonly #changed: () => void;
  readonly requests = new RequestQueue();
  #known: Outline | null = null;
  /** The last request; the answers to others are dropped. */
  #wanted = "";

  /** `changed` is called when more is known. */
  constructor(recordings: Recordings, changed: () => void) {
    this.#recordings = recordings;
    this.#changed = changed;
  }

  /** Fetches what is not known of the cameras as finely as that. */
  load(cameras: readonly number[], startMs: number, msPerPx: number, widthPx: number): void {
    const { fromS, toS, stepS } = outlineOf(startMs, msPerPx, widthPx);
    const endMs = startMs + widthPx * msPerPx;
    const isKnown = this.#known?.stepS === stepS && cameras.every((camera) => this.covers(camera, startMs, endMs));
    if (isKnown || cameras.length === 0) {
      this.#wanted = ""; // an answer that is still to come would replace what is known
      return;
    }
    // Nothing is recorded in the future.
    const untilS = Math.max(fromS + 1, Math.min(toS, Math.ceil(Date.now() / 1000)));
    const key = `${fromS} ${untilS} ${stepS} ${cameras.join()}`;
    this.#wanted = key;
    void this.requests.run(key, async () => {
      const lanes = await this.#fetch(fromS, untilS, stepS, cameras);
      if (this.#wanted !== key) return;
      this.#known = { fromS, toS: untilS, stepS, lanes };
      this.#changed();
    });
  }

  /** Whether all is known of the camera in that span. */
  covers(camera: number, startMs: number, endMs: number): boolean {
    const known = this.#known;
    const endS = Math.min(endMs, Date.now() - kMaxAgeS * 1000) / 1000;
    return known !== null && known.lanes.has(camera) && known.fromS <= startMs / 1000 && known.toS >= endS;
  }

  /** What is known of the camera. */
  get(camera: number): LaneOutline | null {
    return this.#known?.lanes.get(camera) ?? null;
  }

  async #fetch(fromS: number, toS: number, stepS: number, cameras: readonly number[]): Promise<Map<number, LaneOutline>> {
    const lanes = new Map<number, LaneOutline>(cameras.map((camera) => [camera, { continuous: [], alarm: [], alert: [], pos: [] }]));
    try {
      const perRequest = Math.floor(kMaxCameraSteps / Math.max(400, (toS - fromS) / stepS)); // the server takes 1,000 at most
      for (let at = 0; at < cameras.length; at += perRequest) {
        const some = await this.#recordings.outline(fromS, toS, stepS, cameras.slice(at, at + perRequest));
        for (const lane of some) lanes.set(lane.camera_id, lane);
      }
    } catch (error) {
      // The host has no event API.
      if (!(error instanceof ServerError) || error.status !== kNoSuchApi) throw error;
    }
    return lanes;
  }
}
