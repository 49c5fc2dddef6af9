// SPDX-License-Identifier: Apache-2.0
//
// The field for words in the texts of alerts and POS transactions, and what was found of the chosen cameras at any
// time.

import { kEventKinds, type EventKind } from "../../playback/coverage";
import type { Footage } from "../../wire/footage";
import { kMaxFound, type Recordings } from "../../wire/recordings";
import { ServerError } from "../../wire/server";
import { element } from "../widgets/dom";

/** While somebody types. */
const kTypingMs = 300;

/** Where it looks. */
export interface SearchScope {
  cameras: readonly number[];
  kinds: ReadonlySet<EventKind>;
}

export class TextSearch {
  readonly root: HTMLElement;
  readonly #recordings: Recordings;
  readonly #scope: () => SearchScope;
  readonly #changed: () => void;
  readonly #input = element("input", {
    class: "input",
    type: "search",
    maxlength: "500",
    placeholder: "Words in alerts and receipts",
    "aria-label": "Words in the texts of alerts and POS transactions",
    spellcheck: "false",
  });
  #typing: ReturnType<typeof setTimeout> | undefined;
  #asked = "";
  #found: readonly Footage[] = [];
  #note = "";

  /** `changed` is called when there is something else to list. */
  constructor(recordings: Recordings, scope: () => SearchScope, changed: () => void) {
    this.#recordings = recordings;
    this.#scope = scope;
    this.#changed = changed;
    this.root = element("search", { class: "text-search" }, this.#input);
    this.#input.addEventListener("input", () => {
      clearTimeout(this.#typing);
      this.#typing = setTimeout(() => this.refresh(), this.isActive ? kTypingMs : 0);
    });
    this.#input.addEventListener("change", () => this.refresh());
  }

  /** Words are typed, so the list shows what they find. */
  get isActive(): boolean {
    return this.words !== "";
  }

  get words(): string {
    return this.#input.value.trim();
  }

  /** Call `refresh` to ask for them. */
  set words(words: string) {
    if (words !== this.words) this.#input.value = words;
  }

  /** Newest first. */
  get found(): readonly Footage[] {
    return this.#found;
  }

  get head(): string {
    const count = this.#found.length;
    return `${count}${count === kMaxFound ? " or more" : ""} found · all time`;
  }

  /** Why there is nothing, or not all. */
  get note(): string {
    return this.#note;
  }

  /** Asks where the words, the cameras or the kinds are others than those last asked for. */
  refresh(): void {
    clearTimeout(this.#typing);
    const words = this.words;
    const { cameras, kinds } = this.#scope();
    const wanted = kEventKinds.filter((kind) => kind === "alert" || kind === "pos").filter((kind) => kinds.has(kind));
    const asked = words && JSON.stringify([words, cameras, wanted]);
    if (asked === this.#asked) return;
    this.#asked = asked;
    const unable = cameras.length === 0 ? kNoCamera : wanted.length === 0 ? kNoKind : "";
    if (!words || unable) return this.#show([], unable);
    this.#show([], "Searching…");
    const only = wanted.length === 1 ? wanted[0] : undefined;
    this.#recordings.search(words, cameras, only).then(
      (found) => asked === this.#asked && this.#show(found, noteOf(found)),
      (error: unknown) => {
        if (asked !== this.#asked) return;
        this.#show([], error instanceof ServerError ? error.message : String(error));
        this.#asked = "";
      },
    );
  }

  close(): void {
    clearTimeout(this.#typing);
    this.#asked = "";
  }

  #show(found: readonly Footage[], note: string): void {
    this.#found = found;
    this.#note = note;
    this.#changed();
  }
}

const kNoCamera = "No camera is chosen. Choose some under “Cameras”.";
const kNoKind = "Only alerts and POS transactions have a text. Choose one of these kinds.";

function noteOf(found: readonly Footage[]): string {
  if (found.length === 0) return "Nothing found. Every word must occur in the text as a whole.";
  return found.length === kMaxFound ? `The newest ${kMaxFound} are listed. Type more words to find older ones.` : "";
}
