// SPDX-License-Identifier: Apache-2.0
//
// The alerts and POS transactions that were reported since the user last looked, and the cameras that have new ones.
//
// Why so        The stream of reports continues where the user last looked, also after the page was left. So what is
//               new is counted again from the store, and is the same in all tabs of a browser; where the user looks in
//               one of them, the others hear of it.

import type { Camera } from "./camera";
import type { RawMark } from "./footage";
import type { LastLookStore } from "./last_look";

/** How long a camera's picture has its frame. */
export const kFrameMs = 10_000;

export interface News {
  /** How many the user has not seen yet. */
  count: number;
  /** There may be others: reports were missed for so long that the server does not tell them any more. */
  mayBeMore: boolean;
}

export class Alerts {
  readonly #listeners = new Set<() => void>();
  readonly #freshListeners = new Set<(mark: RawMark) => void>();
  readonly #latest = new Map<number, { kind: RawMark["kind"]; untilMs: number }>();
  #looks: Pick<LastLookStore, "look" | "listen"> | null = null;
  /** The ids of those that the user has not seen. */
  #unseen = new Set<number>();
  /** Where the stream of reports is. */
  #place = "";
  #isCaughtUp = false;

  get news(): News {
    return { count: this.#unseen.size, mayBeMore: this.#looks?.look.mayBeMore ?? false };
  }

  /** Where the stream of reports is to begin: up to there the user has looked. */
  get start(): string {
    return this.#looks?.look.place ?? "";
  }

  /** Whether all that was reported before the session began has been told. */
  get isCaughtUp(): boolean {
    return this.#isCaughtUp;
  }

  /** A session begins, whose user has looked so far; until `signal` is aborted. */
  begin(looks: Pick<LastLookStore, "look" | "listen">, signal: AbortSignal): void {
    this.#looks = looks;
    this.#place = "";
    this.#isCaughtUp = false;
    this.#unseen.clear();
    this.#latest.clear();
    looks.listen(() => this.#followLook(), signal);
    this.#tell();
  }

  /** The stream begins at `place`, and does not tell what was reported before. */
  beginAt(place: string): void {
    if (this.#looks) this.#looks.look = { place, mayBeMore: this.start !== "" };
    this.#tell();
  }

  /** The stream has come to this place; what it tells there follows. */
  set place(place: string) {
    this.#place = place;
  }

  /** The stream has told what was missed. */
  catchUp(): void {
    if (this.#isCaughtUp) return;
    this.#isCaughtUp = true;
    this.#tell();
  }

  /** `isFresh`: it happens now, rather than having been missed. */
  note(mark: RawMark, isFresh: boolean): void {
    if (mark.id > idAt(this.start)) this.#unseen.add(mark.id);
    if (isFresh) {
      this.#latest.set(mark.camera_id, { kind: mark.kind, untilMs: performance.now() + kFrameMs });
      for (const happened of this.#freshListeners) happened(mark);
    }
    this.#tell();
  }

  /** The user looks at the events; returns what was new. */
  look(): News {
    const news = this.news;
    // Another tab may have been told more.
    const place = idAt(this.#place) > idAt(this.start) ? this.#place : this.start;
    if (this.#looks) this.#looks.look = { place, mayBeMore: false };
    this.#unseen.clear();
    if (news.count > 0 || news.mayBeMore) this.#tell();
    return news;
  }

  /** What the camera's picture has a frame for; null for none, and for a paired host's camera. */
  kindAt({ id, server }: Pick<Camera, "id" | "server">): RawMark["kind"] | null {
    const latest = server ? undefined : this.#latest.get(id);
    return latest && performance.now() < latest.untilMs ? latest.kind : null;
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

  /** The user has looked in another tab. */
  #followLook(): void {
    const seen = idAt(this.start);
    for (const id of [...this.#unseen]) if (id <= seen) this.#unseen.delete(id);
    this.#tell();
  }

  #tell(): void {
    for (const changed of this.#listeners) changed();
  }
}

/** The id of the report at that place of the stream. */
function idAt(place: string): number {
  return parseInt(place, 10) || 0;
}
