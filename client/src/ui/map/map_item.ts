// SPDX-License-Identifier: Apache-2.0
//
// One thing on a map: a button with its icon, its name beside it, and of a camera the direction it looks in.

import type { ItemKind, MapItem } from "../../wire/emaps";
import { element, setText } from "../widgets/dom";
import { icon, type IconName } from "../widgets/icons";

const kIcons: Record<ItemKind, IconName> = { camera: "camera", emap: "map", door: "door", io: "io", pos: "pos" };
const kWords: Record<ItemKind, string> = {
  camera: "Camera",
  emap: "Map",
  door: "Door",
  io: "Port",
  pos: "Till",
};
const kTextPlaces = ["below", "above", "left", "right"];

/** "Door" */
export function wordFor({ kind, port }: MapItem): string {
  return kind === "camera" && port >= 0 ? "Port" : kWords[kind];
}

/** "Door: Front door" */
export function titleOf(item: MapItem): string {
  return item.name ? `${wordFor(item)}: ${item.name}` : wordFor(item);
}

export class MapItemView {
  readonly root: HTMLButtonElement;
  readonly #name = element("span", { class: "map-name" });
  #state = "";

  constructor(public item: MapItem) {
    // A camera's port is a contact or relay of it, not a second camera.
    const looks = item.kind === "camera" && item.port < 0;
    this.root = element(
      "button",
      { type: "button", class: "map-item", "data-kind": looks || item.kind !== "camera" ? item.kind : "io" },
      ...(looks ? [element("span", { class: "map-cone" })] : []),
      element("span", { class: "map-icon" }, icon(looks || item.kind !== "camera" ? kIcons[item.kind] : "io")),
      this.#name,
    );
    this.show(item);
  }

  /** Places it anew; the device stays the same. */
  show(item: MapItem): void {
    this.item = item;
    this.root.style.setProperty("--x", String(item.x - item.iconCenterX));
    this.root.style.setProperty("--y", String(item.y - item.iconCenterY));
    this.root.style.setProperty("--turn", `${item.direction}deg`);
    this.root.dataset["text"] = kTextPlaces[item.textPos] ?? "below";
    setText(this.#name, item.name);
    this.#label();
  }

  /** What the device was last said to be: "open", "on"; empty: unknown. */
  set state(state: string) {
    this.#state = state;
    this.root.dataset["state"] = state;
    this.#label();
  }

  get state(): string {
    return this.#state;
  }

  #label(): void {
    const label = titleOf(this.item) + (this.#state ? `, ${this.#state}` : "");
    if (this.root.getAttribute("aria-label") !== label) this.root.setAttribute("aria-label", label);
  }
}
