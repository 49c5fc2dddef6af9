// SPDX-License-Identifier: Apache-2.0
//
// One map in the list of maps: its picture, what is on it, and what can be done with it.

import type { EmapRecord } from "../../../wire/emap_setup";
import type { Emaps } from "../../../wire/emaps";
import { editedMapAddress } from "../../route";
import { counted } from "../../widgets/amounts";
import { button, linkButton } from "../../widgets/button";
import { element, setText } from "../../widgets/dom";
import { icon } from "../../widgets/icons";

export interface MapRowActions {
  rename(map: EmapRecord): void;
  replace(map: EmapRecord): void;
  remove(map: EmapRecord): void;
}

export class MapRow {
  readonly root: HTMLLIElement;
  readonly #picture = element("div", { class: "emap-row-picture" }, icon("map"));
  readonly #name = element("h3");
  readonly #facts = element("p", { class: "quiet" });
  readonly #named: [control: HTMLElement, does: string][];
  #map: EmapRecord;
  /** The address of the picture that is shown. */
  #url = "";

  constructor(map: EmapRecord, actions: MapRowActions) {
    this.#map = map;
    const edit = linkButton("Place cameras", editedMapAddress(map.id));
    const rename = button("Rename…", () => actions.rename(this.#map));
    const replace = button("Replace picture…", () => actions.replace(this.#map));
    const remove = button("Remove…", () => actions.remove(this.#map));
    this.#named = [
      [edit, "Place cameras on"],
      [rename, "Rename"],
      [replace, "Replace picture of"],
      [remove, "Remove"],
    ];
    this.root = element(
      "li",
      { class: "card emap-row", "data-map": String(map.id) },
      this.#picture,
      element("div", { class: "emap-row-name" }, this.#name, this.#facts),
      element("div", { class: "emap-row-buttons" }, edit, rename, replace, remove),
    );
    this.show(map);
  }

  get id(): number {
    return this.#map.id;
  }

  /** Whether the picture has to be loaded again. */
  show(map: EmapRecord): boolean {
    const isOther = map.picture !== this.#map.picture || this.#url === "";
    this.#map = map;
    setText(this.#name, map.name);
    const links = map.linkedFrom.map(({ name }) => name).join(", ");
    setText(this.#facts, [counted(map.items, "item"), links && `linked from ${links}`].filter(Boolean).join(" · "));
    for (const [control, does] of this.#named) control.setAttribute("aria-label", `${does} ${map.name}`);
    return isOther && map.picture !== "";
  }

  /** Where that fails, an icon stands for the picture. */
  async loadPicture(emaps: Emaps, signal: AbortSignal): Promise<void> {
    const { picture } = await emaps.open(this.id);
    if (!picture || signal.aborted) return;
    this.close();
    this.#url = URL.createObjectURL(picture);
    const image = element("img", { alt: "", src: this.#url });
    image.addEventListener("error", () => this.#picture.replaceChildren(icon("map")));
    this.#picture.replaceChildren(image);
  }

  close(): void {
    URL.revokeObjectURL(this.#url);
    this.#url = "";
  }
}
