// SPDX-License-Identifier: Apache-2.0
//
// Which cameras and which kinds of events the timeline and the list show; kept for the next visit.

import { kEventKinds, type EventKind } from "../../playback/coverage";
import type { Group } from "../../wire/recordings";
import type { Camera } from "../../wire/server";
import { element } from "../widgets/dom";
import { kKindNames } from "./event_list";

/** Lanes that still are a timeline; whoever wants more chooses them. */
const kFirstCameras = 8;
const kMostCameras = 32;
const kKey = "lookhaven.events";

interface Kept {
  cameras?: number[];
  kinds?: EventKind[];
}

export class EventFilter {
  readonly root: HTMLElement;
  readonly #changed: () => void;
  readonly #groupRow = element("div", { class: "groups", role: "group", "aria-label": "Camera groups" });
  readonly #cameraRow = element("div", { class: "cameras" });
  readonly #summary = element("summary", {}, "Cameras");
  #cameras: readonly Camera[] = [];
  #chosen = new Set<number>();
  #kinds = new Set<EventKind>(kEventKinds);

  constructor(changed: () => void) {
    this.#changed = changed;
    const kept = read();
    if (kept.kinds) this.#kinds = new Set(kEventKinds.filter((kind) => kept.kinds!.includes(kind)));
    if (kept.cameras) this.#chosen = new Set(kept.cameras);
    const kinds = kEventKinds.map((kind) => {
      const box = element("input", { type: "checkbox", checked: this.#kinds.has(kind) });
      box.addEventListener("change", () => {
        if (box.checked) this.#kinds.add(kind);
        else this.#kinds.delete(kind);
        this.#keep();
      });
      return element("label", { class: "chip" }, box, element("span", { class: "row-swatch", "data-kind": kind }), kKindNames[kind]);
    });
    const cameras = element("details", { class: "camera-picker" }, this.#summary, this.#groupRow, this.#cameraRow);
    const kindRow = element("div", { class: "chips", role: "group", "aria-label": "Kinds of events" }, ...kinds);
    this.root = element("section", { class: "filter", "aria-label": "Filter" }, cameras, kindRow);
  }

  get cameras(): Camera[] {
    return this.#cameras.filter(({ id }) => this.#chosen.has(id));
  }

  get kinds(): ReadonlySet<EventKind> {
    return this.#kinds;
  }

  setCameras(cameras: readonly Camera[]): void {
    this.#cameras = cameras;
    if (!cameras.some(({ id }) => this.#chosen.has(id))) {
      this.#chosen = new Set(cameras.slice(0, kFirstCameras).map(({ id }) => id));
    }
    this.#showCameras();
  }

  setGroups(groups: readonly Group[]): void {
    const all = { name: "All", cameras: this.#cameras.map(({ id }) => id) };
    this.#groupRow.replaceChildren(
      ...[all, ...groups].map(({ name, cameras }) => {
        const button = element("button", { type: "button", class: "chip" }, name);
        button.addEventListener("click", () => this.#choose(cameras));
        return button;
      }),
    );
  }

  /** Adds a camera that something is to be played of. */
  include(camera: number): void {
    if (this.#chosen.has(camera) || !this.#cameras.some(({ id }) => id === camera)) return;
    this.#choose([...this.#chosen, camera]);
  }

  #choose(cameras: readonly number[]): void {
    this.#chosen = new Set(cameras.slice(0, kMostCameras));
    this.#showCameras();
    this.#keep();
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
          this.#keep();
        });
        return element("label", { class: "camera-choice" }, box, element("span", {}, name));
      }),
    );
  }

  #keep(): void {
    localStorage.setItem(kKey, JSON.stringify({ cameras: [...this.#chosen], kinds: [...this.#kinds] } satisfies Kept));
    this.#changed();
  }
}

function read(): Kept {
  try {
    return (JSON.parse(localStorage.getItem(kKey) ?? "{}") as Kept | null) ?? {};
  } catch {
    return {};
  }
}
