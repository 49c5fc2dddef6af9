// SPDX-License-Identifier: Apache-2.0
//
// Which cameras and which kinds of events the timeline and the list show; kept for the next visit.

import { kEventKinds, kindOf, type EventKind } from "../../playback/coverage";
import type { Camera } from "../../wire/camera";
import type { Footage } from "../../wire/footage";
import type { Preferences } from "../../wire/preferences";
import type { CameraGroup } from "../../wire/recordings";
import { element } from "../widgets/dom";
import { icon } from "../widgets/icons";
import { kKindNames } from "./event_list";

/** As many as the timeline shows without scrolling; the user may choose more. */
const kDefaultCameras = 8;
const kMaxCameras = 32;
/** Preferences each of its own, so that what a link asks for is not stored with what the user changes of it. */
const kNames = { cameras: "events.cameras", kinds: "events.kinds", isKeptOnly: "events.keptOnly" } as const;

/** What is listed. */
export interface FilterChoice {
  cameras: readonly number[];
  kinds: readonly EventKind[];
  isKeptOnly: boolean;
}

/** All of what is listed: `words` are those that a text must have, none if empty. */
export interface ListChoice extends FilterChoice {
  words: string;
}

export class EventFilter {
  readonly root: HTMLElement;
  readonly #preferences: Preferences;
  readonly #changed: () => void;
  readonly #groupRow = element("div", { class: "groups", role: "group", "aria-label": "Camera groups" });
  readonly #cameraRow = element("div", { class: "cameras" });
  readonly #summary = element("summary", {}, "Cameras");
  #cameras: readonly Camera[] = [];
  #chosen = new Set<number>();
  #kinds = new Set<EventKind>(kEventKinds);
  #isKeptOnly = false;
  readonly #boxes = new Map<EventKind | "kept", HTMLInputElement>();

  /** `search` is a part of it that has a place of its own. */
  constructor(preferences: Preferences, changed: () => void, search: HTMLElement) {
    this.#preferences = preferences;
    this.#changed = changed;
    const cameras = preferences.get(kNames.cameras);
    this.#kinds = new Set(kEventKinds.filter((kind) => isKindChosen(preferences, kind)));
    if (Array.isArray(cameras)) this.#chosen = new Set(cameras.filter((id) => typeof id === "number"));
    this.#isKeptOnly = preferences.get(kNames.isKeptOnly) === true;
    const kinds = kEventKinds.map((kind) => {
      const box = element("input", { type: "checkbox", checked: this.#kinds.has(kind) });
      box.addEventListener("change", () => {
        if (box.checked) this.#kinds.add(kind);
        else this.#kinds.delete(kind);
        this.#save("kinds");
      });
      this.#boxes.set(kind, box);
      return element("label", { class: "chip" }, box, element("span", { class: "row-swatch", "data-kind": kind }), kKindNames[kind]);
    });
    const picker = element("details", { class: "camera-picker" }, this.#summary, this.#groupRow, this.#cameraRow);
    const kindRow = element("div", { class: "chips", role: "group", "aria-label": "Kinds of events" }, ...kinds, this.#keptChip());
    this.root = element("section", { class: "filter", "aria-label": "Filter" }, picker, kindRow, search);
  }

  get cameras(): Camera[] {
    return this.#cameras.filter(({ id }) => this.#chosen.has(id));
  }

  get choice(): FilterChoice {
    return { cameras: [...this.#chosen], kinds: [...this.#kinds], isKeptOnly: this.#isKeptOnly };
  }

  /** Shows what a link asks for; the user's own choice comes back at the next visit. */
  follow({ cameras, kinds, isKeptOnly }: FilterChoice): void {
    this.#chosen = new Set(cameras.slice(0, kMaxCameras));
    this.#kinds = new Set(kinds);
    this.#isKeptOnly = isKeptOnly;
    for (const [kind, box] of this.#boxes) box.checked = kind === "kept" ? isKeptOnly : this.#kinds.has(kind);
    this.setCameras(this.#cameras);
    this.#changed();
  }

  get kinds(): ReadonlySet<EventKind> {
    return this.#kinds;
  }

  /** Whether the list shows it, if it is of one of the cameras. */
  admits(footage: Footage): boolean {
    return this.#kinds.has(kindOf(footage)) && (footage.isKept || !this.#isKeptOnly);
  }

  setCameras(cameras: readonly Camera[]): void {
    this.#cameras = cameras;
    if (!cameras.some(({ id }) => this.#chosen.has(id))) {
      this.#chosen = new Set(cameras.slice(0, kDefaultCameras).map(({ id }) => id));
    }
    this.#showCameras();
  }

  setGroups(groups: readonly CameraGroup[]): void {
    const all = { name: "All", cameras: this.#cameras.map(({ id }) => id) };
    this.#groupRow.replaceChildren(
      ...[all, ...groups].map(({ name, cameras }) => {
        const button = element("button", { type: "button", class: "chip" }, name);
        button.addEventListener("click", () => this.#choose(cameras));
        return button;
      }),
    );
  }

  /** Adds a camera of which something is to be played. */
  include(camera: number): void {
    if (this.#chosen.has(camera) || !this.#cameras.some(({ id }) => id === camera)) return;
    this.#chosen = new Set([...this.#chosen, camera].slice(0, kMaxCameras));
    this.#showCameras();
    // Not stored: it may be a link's.
    this.#changed();
  }

  #choose(cameras: readonly number[]): void {
    this.#chosen = new Set(cameras.slice(0, kMaxCameras));
    this.#showCameras();
    this.#save("cameras");
  }

  #keptChip(): HTMLElement {
    const box = element("input", { type: "checkbox", checked: this.#isKeptOnly });
    box.addEventListener("change", () => {
      this.#isKeptOnly = box.checked;
      this.#save("isKeptOnly");
    });
    this.#boxes.set("kept", box);
    return element("label", { class: "chip", title: "Only recordings that are kept" }, box, icon("kept"), "Kept");
  }

  #showCameras(): void {
    this.#summary.textContent = `Cameras · ${this.cameras.length} of ${this.#cameras.length}`;
    this.#cameraRow.replaceChildren(
      ...this.#cameras.map(({ id, name }) => {
        const box = element("input", { type: "checkbox", checked: this.#chosen.has(id) });
        box.addEventListener("change", () => {
          if (box.checked) this.#chosen.add(id);
          else this.#chosen.delete(id);
          this.#summary.textContent = `Cameras · ${this.cameras.length} of ${this.#cameras.length}`;
          this.#save("cameras");
        });
        return element("label", { class: "camera-choice" }, box, element("span", {}, name));
      }),
    );
  }

  #save(what: keyof FilterChoice): void {
    this.#preferences.set(kNames[what], this.choice[what]);
    this.#changed();
  }
}

/** Whether the user has chosen to see this kind, as far as is kept. */
export function isKindChosen(preferences: Preferences, kind: EventKind): boolean {
  const kinds = preferences.get(kNames.kinds);
  return !Array.isArray(kinds) || kinds.includes(kind);
}
