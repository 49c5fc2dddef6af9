// SPDX-License-Identifier: Apache-2.0
//
// What was reported since the user looked, and at which cameras just now.

import type { RawMark } from "./footage";
import type { Camera } from "./server";

/** How long a camera's picture has its frame. */
export const kFrameMs = 10_000;

export interface News {
  /** How many the user has not seen yet. */
  count: number;
  /** The connection was lost for so long that there may be others. */
  mayBeMore: boolean;
}

const kNoNews: News = { count: 0, mayBeMore: false };

export class Alerts {
  readonly #listeners = new Set<() => void>();
  readonly #freshListeners = new Set<(mark: RawMark) => void>();
  readonly #latest = new Map<number, { kind: RawMark["kind"]; untilMs: number }>();
  #news = kNoNews;

  get news(): News {
    return this.#news;
  }

  /** `isFresh`: it happens now, rather than having been missed. */
  note(mark: RawMark, isFresh: boolean): void {
    this.#news = { ...this.#news, count: this.#news.count + 1 };
    if (isFresh) {
      this.#latest.set(mark.camera_id, { kind: mark.kind, untilMs: performance.now() + kFrameMs });
      for (const happened of this.#freshListeners) happened(mark);
    }
    this.#tell();
  }

  /** Nobody knows what was reported before now. */
  noteGap(): void {
    this.#news = { ...this.#news, mayBeMore: true };
    this.#tell();
  }

  /** The user looks at the events; returns what is new. */
  look(): News {
    const news = this.#news;
    this.#news = kNoNews;
    if (news.count > 0 || news.mayBeMore) this.#tell();
    return news;
  }

  /** What the camera's picture has a frame for; null for none, and for a paired host's camera. */
  kindAt({ id, server }: Pick<Camera, "id" | "server">): RawMark["kind"] | null {
    const latest = server ? undefined : this.#latest.get(id);
    return latest && performance.now() < latest.untilMs ? latest.kind : null;
  }

  /** Of another account nothing is known. */
  forget(): void {
    this.#latest.clear();
    this.look();
  }

  /** Calls `changed` after each change of the news, until `signal` is aborted. */
  listen(changed: () => void, signal: AbortSignal): void {
    this.#listeners.add(changed);
    signal.addEventListener("abort", () => this.#listeners.delete(changed));
  }

  /** Calls `happened` for each that happens now, until `signal` is aborted. */
  listenFresh(happened: (mark: RawMark) => void, signal: AbortSignal): void {
    this.#freshListeners.add(happened);
    signal.addEventListener("abort", () => this.#freshListeners.delete(happened));
  }

  #tell(): void {
    for (const changed of this.#listeners) changed();
  }
}
