// SPDX-License-Identifier: Apache-2.0
//
// Finds the recording of a camera at a given time, and the one after it.

import type { Footage } from "../wire/footage";
import type { Recordings } from "../wire/recordings";
import type { FootageCache } from "./footage_cache";

/** Recordings this close to each other play as one. */
export const kMaxGapS = 3;
/** How far ahead the next recording is looked for in what is known, before the server is asked. */
const kLookAheadS = 600;

export class FootageLookup {
  readonly #recordings: Recordings;
  readonly #cache: FootageCache;

  constructor(recordings: Recordings, cache: FootageCache) {
    this.#recordings = recordings;
    this.#cache = cache;
  }

  /** What is known so far; null for nothing. */
  at(camera: number, atMs: number): Footage | null {
    return this.#events(camera, atMs / 1000, atMs / 1000).findLast((event) => covers(event, atMs)) ?? null;
  }

  /**
   * Learns what the cameras have at that time and for a while after; with `refresh` also what was still being recorded.
   */
  load(cameras: readonly number[], atMs: number, refresh = false): Promise<void> {
    return this.#cache.load(cameras, atMs / 1000 - 1, atMs / 1000 + kLookAheadS, refresh);
  }

  /** What of the same camera follows a recording without a gap; null where nothing does. */
  async following(current: Footage): Promise<Footage | null> {
    await this.load([current.camera], current.stop * 1000, true);
    const next = this.#after(current.camera, current.stop, current);
    return next && next.start <= current.stop + kMaxGapS ? next : null;
  }

  /** What one of the cameras has first after a time, beside what is `current`; null where nothing comes. */
  async next(cameras: readonly number[], fromS: number, current: Footage | null): Promise<Footage | null> {
    await this.load(cameras, fromS * 1000, true);
    const candidates = cameras.flatMap((camera) => this.#after(camera, fromS, current) ?? []);
    const known = candidates.sort((one, other) => one.start - other.start)[0];
    if (known) return known;
    const place = { atS: Math.floor(fromS), id: current?.id };
    return this.#recordings.next({ cameras, kinds: ["continuous", "alarm"], ...place }, false).catch(() => null);
  }

  #after(camera: number, fromS: number, current: Footage | null): Footage | undefined {
    const isNext = ({ id, start, stop }: Footage) => id !== current?.id && stop > fromS && start >= (current?.start ?? fromS);
    return this.#events(camera, fromS - 1, fromS + kLookAheadS).find(isNext);
  }

  #events(camera: number, fromS: number, toS: number): Footage[] {
    return this.#cache.get(camera, fromS, toS).footage.filter(({ kind, isSaved }) => kind === "event" && isSaved);
  }
}

export function covers({ start, stop, isGrowing }: Footage, atMs: number): boolean {
  return start * 1000 <= atMs && atMs < stop * 1000 + (isGrowing ? kMaxGapS * 1000 : 0);
}
