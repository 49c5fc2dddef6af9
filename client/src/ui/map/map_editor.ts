// SPDX-License-Identifier: Apache-2.0
//
// Places, turns and removes what is on a map, and saves all of it at once.

import type { EditedMap, Emaps, MapItem, Placeable } from "../../wire/emaps";
import { asServerError } from "../../wire/server";
import { iconButton } from "../widgets/button";
import { element } from "../widgets/dom";
import type { KeyList } from "../widgets/keys_dialog";
import { notify } from "../widgets/notice";
import { conflictBar } from "./conflict_bar";
import { EditHistory } from "./edit_history";
import { makeDraggable } from "./item_drag";
import { newItem, titleOf, type MapItemView } from "./map_item";
import { kTurnDegrees, MapItemForm, turned } from "./map_item_form";
import { MapView } from "./map_view";

const kFarStep = 10;

export const kEditorKeys: KeyList = [
  ["Left Right Up Down", "Move the item by a pixel of the map; with Shift by ten"],
  ["[ ]", "Turn the item"],
  ["Delete", "Remove the item"],
  ["Ctrl+Z Ctrl+Y", "Undo or redo"],
  ["Ctrl+S", "Save"],
];

export class MapEditor {
  readonly root: HTMLElement;
  readonly #emaps: Emaps;
  readonly #history: EditHistory<EditedMap>;
  readonly #view: MapView<MapItem>;
  readonly #form: MapItemForm;
  readonly #onDone: () => void;
  readonly #devices = element("select", { class: "input", "aria-label": "Device to add" });
  readonly #add = element("button", { type: "button", class: "button" }, "Add");
  readonly #hideNames = element("input", { type: "checkbox" });
  readonly #smallItems = element("input", { type: "checkbox" });
  readonly #save = element("button", { type: "button", class: "button primary" }, "Save");
  readonly #undo = iconButton("undo", "Undo", () => this.#step("undo"), "Ctrl Z");
  readonly #redo = iconButton("redo", "Redo", () => this.#step("redo"), "Ctrl Y");
  readonly #conflict: HTMLElement;
  readonly #onKey = (event: KeyboardEvent) => this.#pressKey(event);
  readonly #onLeave = (event: BeforeUnloadEvent) => this.isChanged && event.preventDefault();
  /** The revision of the map on the server that the changes are based on. */
  #revision: number;
  /** The save under way; the next one builds on the revision that it makes. */
  #saving = Promise.resolve();
  #placeable: Placeable[] = [];
  #selected = -1;

  /**
   * `draft` is what an earlier editor of this map left unsaved. `onDone` is called when the user wants to see the map
   * again.
   */
  constructor(emaps: Emaps, map: EditedMap, draft: EditedMap | null, picture: Blob | null, onDone: () => void) {
    this.#emaps = emaps;
    this.#onDone = onDone;
    this.#history = new EditHistory(map);
    if (draft) this.#history.add(draft);
    this.#revision = (draft ?? map).revision;
    this.#view = new MapView<MapItem>({ choose: (view) => this.#select(view), point: () => undefined });
    this.#form = new MapItemForm(
      (item) => this.#change(item),
      () => this.#showButtons(),
      () => this.#remove(),
    );
    this.#conflict = conflictBar(
      () => void this.#takeTheirs(),
      () => void this.save(true),
    );
    this.root = element("div", { class: "map-editor" }, this.#toolbar(), this.#conflict, this.#body());
    this.#add.addEventListener("click", () => this.#place());
    this.#save.addEventListener("click", () => void this.save());
    for (const box of [this.#hideNames, this.#smallItems]) box.addEventListener("change", () => this.#setFlags());
    // Before the view pans by the same keys.
    document.addEventListener("keydown", this.#onKey, true);
    addEventListener("beforeunload", this.#onLeave);
    void this.#view.showPicture(picture);
    void this.#loadDevices();
    this.#show();
  }

  get isChanged(): boolean {
    return this.#history.isChanged || this.#form.isTyped;
  }

  /** The map with all changes, and the revision that they are based on. */
  get draft(): EditedMap {
    this.#form.commit();
    return { ...this.#history.current, revision: this.#revision };
  }

  close(): void {
    document.removeEventListener("keydown", this.#onKey, true);
    removeEventListener("beforeunload", this.#onLeave);
    this.#view.close();
    this.root.remove();
  }

  /** Where someone else has changed the map, asks the user, unless `overwrite`. */
  save(overwrite = false): Promise<void> {
    this.#form.commit();
    this.#saving = this.#saving.then(() => (overwrite || this.isChanged ? this.#saveNow(overwrite) : undefined));
    return this.#saving;
  }

  async #saveNow(overwrite: boolean): Promise<void> {
    this.#save.setAttribute("aria-busy", "true");
    const saving = this.#history.current;
    try {
      const base = overwrite ? (await this.#emaps.edit(saving.id)).revision : this.#revision;
      this.#revision = await this.#emaps.save({ ...saving, revision: base });
      this.#history.markSaved(saving);
      this.#conflict.hidden = true;
      notify("The map is saved.");
    } catch (error) {
      const { status, message } = asServerError(error);
      if (status === 409) this.#conflict.hidden = false;
      else notify(`The map is not saved. ${message}`);
    } finally {
      this.#save.removeAttribute("aria-busy");
      this.#showButtons();
    }
  }

  #toolbar(): HTMLElement {
    const done = element("button", { type: "button", class: "button" }, "Done");
    done.addEventListener("click", () => this.#onDone());
    const zoom = [
      iconButton("zoomOut", "Zoom out", () => this.#view.zoom(0.8), "-"),
      iconButton("zoomIn", "Zoom in", () => this.#view.zoom(1.25), "+"),
    ];
    const flag = (box: HTMLInputElement, label: string) => element("label", { class: "map-flag" }, box, label);
    return element(
      "div",
      { class: "map-tools", role: "toolbar", "aria-label": "Edit the map" },
      this.#undo,
      this.#redo,
      ...zoom,
      flag(this.#hideNames, "Hide names"),
      flag(this.#smallItems, "Small icons"),
      element("span", { class: "bar-gap" }),
      this.#save,
      done,
    );
  }

  #body(): HTMLElement {
    const hint = element("p", { class: "quiet" }, "Drag an item, or use the arrow keys. [ and ] turn it.");
    const side = element(
      "div",
      { class: "map-side" },
      element("div", { class: "map-add" }, this.#devices, this.#add),
      this.#form.root,
      hint,
    );
    return element("div", { class: "map-editor-body" }, this.#view.root, side);
  }

  /** Undo brings the user's own items back. */
  async #takeTheirs(): Promise<void> {
    try {
      const theirs = await this.#emaps.edit(this.#history.current.id);
      this.#revision = theirs.revision;
      this.#history.add(theirs);
      this.#history.markSaved(theirs);
      this.#conflict.hidden = true;
      this.#selected = -1;
      this.#show();
    } catch (error) {
      notify(asServerError(error).message);
    }
  }

  async #loadDevices(): Promise<void> {
    try {
      this.#placeable = await this.#emaps.placeable();
    } catch (error) {
      notify(asServerError(error).message);
    }
    const label = (one: Placeable) => titleOf(newItem(one)) + (one.server ? ` (server ${one.server})` : "");
    this.#devices.replaceChildren(
      ...this.#placeable
        .filter((one) => one.kind !== "emap" || one.id !== this.#history.current.id)
        .map((one) => element("option", { value: String(this.#placeable.indexOf(one)) }, label(one))),
    );
    this.#add.disabled = this.#devices.options.length === 0;
  }

  #place(): void {
    const device = this.#placeable[Number(this.#devices.value)];
    if (!device) return;
    const box = this.#view.root.getBoundingClientRect();
    const at = this.#view.pictureAt(box.left + box.width / 2, box.top + box.height / 2);
    this.#setItems([...this.#items, { ...newItem(device), ...at }]);
    this.#selectAt(this.#items.length - 1);
  }

  get #items(): MapItem[] {
    return this.#history.current.items;
  }

  #setItems(items: MapItem[]): void {
    this.#history.add({ ...this.#history.current, items });
    this.#show();
  }

  #setFlags(): void {
    const flags = { hideNames: this.#hideNames.checked, smallItems: this.#smallItems.checked };
    this.#history.add({ ...this.#history.current, ...flags });
    this.#show();
  }

  #change(item: MapItem): void {
    this.#setItems(this.#items.with(this.#selected, item));
  }

  #remove(): void {
    if (this.#selected < 0) return;
    const left = this.#items.filter((_, at) => at !== this.#selected);
    this.#selected = -1;
    this.#setItems(left);
  }

  #step(direction: "undo" | "redo"): void {
    this.#history[direction]();
    if (this.#selected >= this.#items.length) this.#selected = -1;
    this.#show();
  }

  #select(view: MapItemView): void {
    this.#selectAt(this.#view.views.indexOf(view));
  }

  #selectAt(at: number): void {
    this.#selected = at;
    this.#view.views.forEach(({ root }, one) => root.setAttribute("aria-pressed", String(one === at)));
    this.#form.show(this.#items[at] ?? null);
    this.#view.views[at]?.root.focus();
  }

  #show(): void {
    const { items, hideNames, smallItems } = this.#history.current;
    const hadFocus = this.#view.root.contains(document.activeElement);
    this.#view.showItems(items, { hideNames, smallItems });
    this.#view.views.forEach((view, at) => makeDraggable(view, this.#view, () => this.#drop(view, at)));
    this.#hideNames.checked = hideNames;
    this.#smallItems.checked = smallItems;
    this.#form.show(items[this.#selected] ?? null);
    this.#view.views.forEach(({ root }, at) => root.setAttribute("aria-pressed", String(at === this.#selected)));
    if (hadFocus) (this.#view.views[this.#selected]?.root ?? this.#view.root).focus();
    this.#showButtons();
  }

  #showButtons(): void {
    this.#undo.disabled = !this.#history.canUndo;
    this.#redo.disabled = !this.#history.canRedo;
    this.#save.disabled = !this.isChanged;
  }

  #drop(view: MapItemView, at: number): void {
    const { x, y } = this.#items[at]!;
    this.#selected = at;
    if (view.item.x !== x || view.item.y !== y) this.#setItems(this.#items.with(at, view.item));
    this.#selectAt(at);
  }

  #pressKey(event: KeyboardEvent): void {
    const key = event.key.toLowerCase();
    const isTyping = event.target instanceof HTMLInputElement && event.target.type !== "checkbox";
    if (event.ctrlKey || event.metaKey) {
      if (key === "s") void this.save();
      else if (isTyping) return;
      else if (key === "z" && !event.shiftKey) this.#step("undo");
      else if (key === "y" || (key === "z" && event.shiftKey)) this.#step("redo");
      else return;
      return event.preventDefault();
    }
    const at = this.#view.views.findIndex(({ root }) => root === document.activeElement);
    const item = this.#items[at];
    if (!item || event.altKey) return;
    this.#selected = at;
    const step = event.shiftKey ? kFarStep : 1;
    if (key === "delete" || key === "backspace") this.#remove();
    else if (key === "[") this.#change(turned(item, -kTurnDegrees));
    else if (key === "]") this.#change(turned(item, kTurnDegrees));
    else if (key === "arrowleft") this.#change({ ...item, x: Math.max(0, item.x - step) });
    else if (key === "arrowright") this.#change({ ...item, x: item.x + step });
    else if (key === "arrowup") this.#change({ ...item, y: Math.max(0, item.y - step) });
    else if (key === "arrowdown") this.#change({ ...item, y: item.y + step });
    else return;
    event.preventDefault();
  }
}
