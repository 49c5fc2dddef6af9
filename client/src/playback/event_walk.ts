// SPDX-License-Identifier: Apache-2.0
//
// The events before and after the one that is open, as the user has filtered them; known before they are asked for, so
// that the controls can say what comes next.

import type { Footage } from "../wire/footage";
import type { EventCursor, Recordings } from "../wire/recordings";
import { ServerError } from "../wire/server";

export type Direction = -1 | 1;

interface Neighbours {
  cursor: string;
  before: Footage | null;
  after: Footage | null;
}

export class EventWalk {
  readonly #recordings: Recordings;
  readonly #cursorNow: () => EventCursor | null;
  readonly #changed: () => void;
  #known: Neighbours | null = null;
  #looking = "";

  /** `cursorNow` says where the user is, null when nowhere; `changed` is called when more is known. */
  constructor(recordings: Recordings, cursorNow: () => EventCursor | null, changed: () => void) {
    this.#recordings = recordings;
    this.#cursorNow = cursorNow;
    this.#changed = changed;
  }

  /** What comes in that direction; null where nothing does, undefined while that is not known. */
  peek(by: Direction): Footage | null | undefined {
    const cursor = this.#cursorNow();
    if (!cursor || this.#known?.cursor !== JSON.stringify(cursor)) return undefined;
    return by > 0 ? this.#known.after : this.#known.before;
  }

  /** Call it when the cursor may have changed: looks up what is not known of it. */
  refresh(): void {
    const cursor = this.#cursorNow();
    const key = JSON.stringify(cursor);
    if (!cursor || key === this.#looking) return;
    this.#looking = key;
    const both = [this.#recordings.next(cursor, true), this.#recordings.next(cursor, false)] as const;
    void Promise.all(both).then(
      ([before, after]) => {
        if (key !== this.#looking) return;
        this.#known = { cursor: key, before, after };
        this.#changed();
      },
      // A step will ask again, and say what is wrong.
      () => undefined,
    );
  }

  /**
   * As peek, but waits for the answer; nothing at the end is asked for again, since recording continues. Rejects with a
   * ServerError.
   */
  async find(by: Direction): Promise<Footage | null> {
    const known = this.peek(by);
    if (known) return known;
    const cursor = this.#cursorNow();
    if (!cursor) throw new ServerError(0, 0, "There are no cameras.");
    return this.#recordings.next(cursor, by < 0);
  }
}
