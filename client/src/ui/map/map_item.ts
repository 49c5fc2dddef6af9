// SPDX-License-Identifier: Apache-2.0
//
// One item on a map: a button with its icon, its name beside it, and of a camera the direction it looks in.

import { kOutput, type ItemKind, type MapItem, type Placeable } from "../../wire/emaps";
import { element, setText } from "../widgets/dom";
import { icon, type IconName } from "../widgets/icons";

const kIcons: Record<ItemKind, IconName> = { camera: "camera", emap: "map", door: "door", io: "io", pos: "pos" };
const kKindNames: Record<ItemKind, string> = {
  camera: "Camera",
  emap: "Map",
  door: "Door",
  io: "Port",
  pos: "POS terminal",
};
const kDoorIcons: Record<string, IconName> = { open: "doorOpen", locked: "doorLocked" };
const kTextPositions = ["below", "above", "left", "right"];

/** As it is before it is placed and turned. */
export function newItem({ kind, id, server, name, port }: Placeable): MapItem {
  return { kind, id, server, name, port, x: 0, y: 0, direction: 0, textPos: 0, iconCenterX: 0, iconCenterY: 0 };
}

/** "Door" */
export function kindName({ kind, port }: MapItem): string {
  return kind === "camera" && port >= 0 ? "Port" : kKindNames[kind];
}

/** "Door: Front door" */
export function titleOf(item: MapItem): string {
  return item.name ? `${kindName(item)}: ${item.name}` : kindName(item);
}

export class MapItemView {
  readonly root: HTMLButtonElement;
  readonly #name = element("span", { class: "map-name" });
  readonly #icon = element("span", { class: "map-icon" });
  #state = "";

  constructor(public item: MapItem & { portType?: number }) {
    // A camera's port is one of its contacts or relays, not a second camera.
    const kind = item.kind === "camera" && item.port >= 0 ? "io" : item.kind;
    this.root = element(
      "button",
      { type: "button", class: "map-item", "data-kind": kind },
      ...(kind === "camera" ? [element("span", { class: "map-cone" })] : []),
      this.#icon,
      this.#name,
    );
    this.root.classList.toggle("is-output", item.portType === kOutput);
    this.#icon.append(icon(kIcons[kind]));
    this.show(item);
  }

  /** Shows it at another place; the device stays the same. */
  show(item: MapItem): void {
    this.item = item;
    this.root.style.setProperty("--x", String(item.x - item.iconCenterX));
    this.root.style.setProperty("--y", String(item.y - item.iconCenterY));
    this.root.style.setProperty("--turn", `${item.direction}deg`);
    this.root.dataset["text"] = kTextPositions[item.textPos] ?? "below";
    setText(this.#name, item.name);
    this.#label();
  }

  /** The last reported state of the device: "open", "on"; empty where unknown. */
  set state(state: string) {
    if (state === this.#state) return;
    this.#state = state;
    if (this.item.kind === "door") this.#icon.replaceChildren(icon(kDoorIcons[state] ?? kIcons.door));
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
