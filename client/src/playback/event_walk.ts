// SPDX-License-Identifier: Apache-2.0
//
// The events before and after the one that is open, as the user has filtered them; known before they are asked for, so that
// the controls can say what comes next.

import type { Footage } from "../wire/footage";
import type { EventPlace, Recordings } from "../wire/recordings";
import { ServerError } from "../wire/server";

export type Direction = -1 | 1;

interface Neighbours {
  place: string;
  before: Footage | null;
  after: Footage | null;
}

export class EventWalk {
  readonly #recordings: Recordings;
  readonly #placeNow: () => EventPlace | null;
  readonly #changed: () => void;
  #known: Neighbours | null = null;
  #looking = "";

  /** `placeNow` says where the user is, null when nowhere; `changed` is called when more is known. */
  constructor(recordings: Recordings, placeNow: () => EventPlace | null, changed: () => void) {
    this.#recordings = recordings;
    this.#placeNow = placeNow;
    this.#changed = changed;
  }

  /** What comes in that direction; null where nothing does, undefined while that is not known. */
  peek(by: Direction): Footage | null | undefined {
    const place = this.#placeNow();
    if (!place || this.#known?.place !== JSON.stringify(place)) return undefined;
    return by > 0 ? this.#known.after : this.#known.before;
  }

  /** Call it when the place may have changed: looks up what is not known of it. */
  refresh(): void {
    const place = this.#placeNow();
    const key = JSON.stringify(place);
    if (!place || key === this.#looking) return;
    this.#looking = key;
    const both = [this.#recordings.next(place, true), this.#recordings.next(place, false)] as const;
    void Promise.all(both).then(
      ([before, after]) => {
        if (key !== this.#looking) return;
        this.#known = { place: key, before, after };
        this.#changed();
      },
      // A step will ask again, and say what is wrong.
      () => undefined,
    );
  }

  /** As peek, but waits for the answer; nothing at the end is asked for anew, since recording goes on. Rejects with a ServerError. */
  async find(by: Direction): Promise<Footage | null> {
    const known = this.peek(by);
    if (known) return known;
    const place = this.#placeNow();
    if (!place) throw new ServerError(0, 0, "There are no cameras.");
    return this.#recordings.next(place, by < 0);
  }
}
