// SPDX-License-Identifier: Apache-2.0
//
// The pictures of a playhead that is dragged: of each camera the newest that was asked for, and few requests at once.
//
// Why so        A pointer asks for sixty times a second, and each picture is a process on the server. What was not
//               begun before the next time was asked for is never fetched. The leading camera comes first; the others
//               get theirs when the pointer rests. Pictures that come in another order are left out, so that they only
//               go the way of the pointer.

import type { Footage } from "../wire/footage";
import type { Recordings, Still } from "../wire/recordings";

const kMaxAtOnce = 3;
/** Few, so that browsers keep what they have seen. */
export const kStillWidths = [320, 640, 960, 1280] as const;

export interface ScrubRequest {
  camera: number;
  /** Null where the camera has nothing then. */
  footage: Footage | null;
  atMs: number;
  widthPx: number;
}

/** `show` gets null where there is no picture. */
export type ShowStill = (camera: number, still: Still | null) => Promise<void>;

export class ScrubStills {
  readonly #recordings: Recordings;
  readonly #show: ShowStill;
  #wanted: ScrubRequest[] = [];
  #running = 0;
  #asked = 0;
  /** By camera, the number of the request that was answered last. */
  readonly #shown = new Map<number, number>();
  #end = new AbortController();

  constructor(recordings: Recordings, show: ShowStill) {
    this.#recordings = recordings;
    this.#show = show;
  }

  /** Asks for one time of several cameras, the leading one first. */
  request(wanted: readonly ScrubRequest[]): void {
    this.#wanted = [...wanted];
    this.#pump();
  }

  /** Nothing that was asked for is shown any more. */
  stop(): void {
    this.#end.abort();
    this.#end = new AbortController();
    this.#wanted = [];
    this.#shown.clear();
  }

  #pump(): void {
    while (this.#wanted.length > 0 && this.#running < kMaxAtOnce) void this.#fetch(this.#wanted.shift()!);
  }

  async #fetch({ camera, footage, atMs, widthPx }: ScrubRequest): Promise<void> {
    const signal = this.#end.signal;
    const number = (this.#asked += 1);
    this.#running += 1;
    // Where one fails the picture before stays.
    const still = footage ? await this.#recordings.still(footage, atMs, widthPx, signal).catch(() => undefined) : null;
    this.#running -= 1;
    this.#pump();
    if (signal.aborted || still === undefined || number < (this.#shown.get(camera) ?? 0)) return;
    this.#shown.set(camera, number);
    await this.#show(camera, still);
  }
}
