// SPDX-License-Identifier: Apache-2.0
//
// Up to which report the user of an account has looked; the browser keeps it for all its tabs.

export interface LastLook {
  /** The id of that report in the server's stream; empty where it is not known. */
  readonly place: string;
  /** Some of what was reported before may never have been shown. */
  readonly mayBeMore: boolean;
}

const kNever: LastLook = { place: "", mayBeMore: false };

/** The server refuses any other. */
const kPlace = /^\d{1,9}-\d{1,15}$/;

export class LastLookStore {
  readonly #key: string;
  #look: LastLook;

  constructor(userId: number) {
    this.#key = `lookhaven.look.${userId}`;
    this.#look = this.#read() ?? kNever;
  }

  get look(): LastLook {
    return this.#look;
  }

  set look(look: LastLook) {
    if (look.place === this.#look.place && look.mayBeMore === this.#look.mayBeMore) return;
    this.#look = look;
    try {
      localStorage.setItem(this.#key, JSON.stringify(look));
    } catch {
      // The browser lets no page keep anything: then it is known until the page is left.
    }
  }

  /** Calls `changed` when another tab has changed it, until `signal` is aborted. */
  listen(changed: () => void, signal: AbortSignal): void {
    const take = ({ key }: StorageEvent) => {
      const look = key === this.#key ? this.#read() : null;
      if (!look) return;
      this.#look = look;
      changed();
    };
    addEventListener("storage", take, { signal });
  }

  #read(): LastLook | null {
    try {
      const { place, mayBeMore } = JSON.parse(localStorage.getItem(this.#key) ?? "{}") as Partial<LastLook>;
      return typeof place === "string" && kPlace.test(place) ? { place, mayBeMore: mayBeMore === true } : null;
    } catch {
      return null;
    }
  }
}
