// SPDX-License-Identifier: Apache-2.0
//
// All maps with their pictures: add, rename and remove them; what is placed on them is the map editor's.

import { EmapSetup, type EmapRecord } from "../../../wire/emap_setup";
import { Emaps } from "../../../wire/emaps";
import { Semaphore } from "../../../wire/semaphore";
import { asServerError } from "../../../wire/server";
import { settingsAddress } from "../../route";
import { button, linkButton } from "../../widgets/button";
import { element } from "../../widgets/dom";
import { notify } from "../../widgets/notice";
import { emptyState, LoadedPage, type PageContext } from "../page";
import { askToAdd, askToRemove, askToRename, askToReplace } from "./map_dialogs";
import { MapRow, type MapRowActions } from "./map_row";

const kMaxConcurrentPictures = 2;
const kNone = "There are no maps yet. A map is a floor plan or a site plan on which cameras and devices are placed.";

export class MapsPage extends LoadedPage<EmapRecord[]> {
  readonly #setup: EmapSetup;
  readonly #emaps: Emaps;
  readonly #list = element("ul", { class: "settings-list" });
  readonly #pictures = new Semaphore(kMaxConcurrentPictures);
  readonly #actions: MapRowActions = {
    rename: (map) => void this.#after(askToRename(this.root, this.#setup, map), "The map is renamed."),
    replace: (map) => void this.#after(askToReplace(this.root, this.#setup, map), `${map.name} has another picture.`),
    remove: (map) => void this.#after(askToRemove(this.root, this.#setup, map), `${map.name} is removed.`),
  };
  #rows: MapRow[] = [];

  constructor(context: PageContext) {
    const devices = linkButton("Devices", settingsAddress("devices"));
    const add = button("Add a map…", () => this.#add(), "primary");
    super(context, "Maps", element("div", { class: "form-buttons" }, devices, add));
    this.#setup = new EmapSetup(context.server);
    this.#emaps = new Emaps(context.server);
    void this.start(
      () => this.#setup.list(),
      (maps) => this.#showMaps(maps),
    );
  }

  override close(): void {
    super.close();
    for (const row of this.#rows) row.close();
  }

  #add(): void {
    void this.#after(askToAdd(this.root, this.#setup), "The map is added. Place cameras on it next.");
  }

  /** Shows what there is once the dialog is closed, which may be more than the user has done. */
  async #after(dialog: Promise<boolean>, sentence: string): Promise<void> {
    if (await dialog) notify(sentence);
    try {
      const maps = await this.#setup.list();
      if (!this.closed.aborted) this.#showMaps(maps);
    } catch (error) {
      notify(asServerError(error).message);
    }
  }

  #showMaps(maps: readonly EmapRecord[]): void {
    for (const row of this.#rows.filter(({ id }) => !maps.some((map) => map.id === id))) row.close();
    if (maps.length === 0) {
      this.#rows = [];
      return this.show(emptyState("map", kNone, button("Add the first map…", () => this.#add(), "primary")));
    }
    this.#rows = maps.map((map) => {
      const row = this.#rows.find(({ id }) => id === map.id) ?? new MapRow(map, this.#actions);
      if (row.show(map)) {
        const load = () => row.loadPicture(this.#emaps, this.closed);
        void this.#pictures.run(this.closed, load).catch(() => undefined);
      }
      return row;
    });
    // Elements that are moved lose the focus.
    const roots = this.#rows.map(({ root }) => root);
    if (roots.some((root, at) => this.#list.children[at] !== root) || this.#list.children.length !== roots.length) {
      this.#list.replaceChildren(...roots);
    }
    if (!this.#list.isConnected) this.show(this.#list);
  }
}
