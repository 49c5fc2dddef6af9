// SPDX-License-Identifier: Apache-2.0
//
// The menu of saved layouts and sequences, opened from the wall's bar.

import type { Camera } from "../../wire/camera";
import { savedAddress } from "../route";
import { button, iconButton } from "../widgets/button";
import { element } from "../widgets/dom";
import { notify } from "../widgets/notice";
import { newId, type SavedKind, type SavedLayout, type SavedLayouts, type Sequence } from "./saved_layouts";
import { askForLayout, askForSequence, askToDelete, askToOverwrite } from "./wall_dialogs";
import { layoutInWords, sequenceInWords } from "./wall_dialogs";

const kDefaultDwellS = 15;

export interface WallMenuActions {
  /** As it is now. */
  wall(): Pick<SavedLayout, "grid" | "cameras">;
  /** All of the account, in the wall's order. */
  cameras(): readonly Camera[];
  /** Ids of what is shown. */
  open(): Record<SavedKind, string | null>;
  /** What is shown was chosen once more. */
  reopen(): void;
}

export class WallMenu {
  readonly button: HTMLButtonElement;
  readonly root = element("dialog", { class: "card wall-menu", "aria-label": "Layouts and sequences" });
  readonly #content = element("div", { class: "wall-menu-content" });
  readonly #saved: SavedLayouts;
  readonly #actions: WallMenuActions;
  /** What is listed, as text to compare. */
  #shown = "";
  /** The control that had the focus last. */
  #control = "";

  constructor(saved: SavedLayouts, actions: WallMenuActions) {
    this.#saved = saved;
    this.#actions = actions;
    this.button = iconButton("savedLayouts", "Layouts and sequences", () => void this.show(), "L");
    this.button.setAttribute("aria-haspopup", "dialog");
    this.root.append(this.#content);
    this.root.addEventListener("focusin", ({ target }) => {
      this.#control = (target as HTMLElement).dataset["control"] ?? this.#control;
    });
    this.root.addEventListener("click", (event) => event.target === this.root && this.root.close());
  }

  /** At once with what is known, then with what other tabs and browsers have saved. */
  async show(): Promise<void> {
    if (this.root.open) return;
    this.#render();
    this.root.showModal();
    const first = this.#content.querySelector<HTMLElement>("[data-control]");
    (this.#content.querySelector<HTMLElement>("[aria-current]") ?? first)?.focus();
    await this.#saved.refresh();
  }

  /** Lists what is there now, where the menu is open. */
  update(): void {
    if (!this.root.open || this.#asText() === this.#shown) return;
    const hadFocus = this.#content.contains(document.activeElement);
    this.#render();
    if (hadFocus) this.#focus();
  }

  #asText(): string {
    return JSON.stringify([this.#saved.layouts, this.#saved.sequences, this.#actions.open()]);
  }

  #render(): void {
    this.#shown = this.#asText();
    const { layouts, sequences } = this.#saved;
    const open = this.#actions.open();
    const save = button("Save the wall as a layout", () => void this.#saveNew());
    save.dataset["control"] = "save";
    const unnamed = () => ({ id: newId(), name: "", dwellS: kDefaultDwellS, layouts: [] });
    const add = button("New sequence", () => void this.#changeSequence(unnamed()));
    add.dataset["control"] = "add";
    add.disabled = layouts.length === 0;
    this.#content.replaceChildren(
      element(
        "header",
        { class: "wall-menu-head" },
        element("h2", {}, "Layouts"),
        iconButton("close", "Close", () => this.root.close(), "Esc"),
      ),
      list(layouts.map((one) => this.#row("layout", one, layoutInWords(one), open.layout))),
      save,
      element("h2", {}, "Sequences"),
      list(sequences.map((one) => this.#row("sequence", one, sequenceInWords(one), open.sequence))),
      add,
    );
    if (layouts.length === 0) add.before(element("p", { class: "quiet" }, "A sequence shows saved layouts in turn."));
  }

  /** Controls are made again when what they are for has changed. */
  #focus(): void {
    const controls = [...this.#content.querySelectorAll<HTMLElement>("[data-control]")];
    const named = (name: string) => controls.find((one) => one.dataset["control"] === name);
    (named(this.#control) ?? named("save"))?.focus();
  }

  #row(kind: SavedKind, one: SavedLayout | Sequence, words: string, open: string | null): HTMLElement {
    const { id, name } = one;
    const texts = [element("span", {}, name), element("span", { class: "quiet" }, words)];
    const link = element("a", { class: "wall-menu-link", href: savedAddress(kind, id) }, ...texts);
    if (id === open) link.setAttribute("aria-current", "true");
    link.addEventListener("click", (event) => {
      if (event.ctrlKey || event.metaKey || event.shiftKey) return;
      this.root.close();
      if (id === open) this.#actions.reopen();
    });
    const isLayout = "grid" in one;
    const overwrite = () => void this.#overwrite(one as SavedLayout);
    const change = () => void (isLayout ? this.#changeLayout(one) : this.#changeSequence(one as Sequence));
    const controls = [
      link,
      ...(isLayout ? [iconButton("overwrite", `Overwrite ${name} with the wall`, overwrite)] : []),
      iconButton("edit", `Change ${name}`, change),
      iconButton("remove", `Delete ${name}`, () => void this.#delete(kind, one)),
    ];
    controls.forEach((control, at) => (control.dataset["control"] = `${id}-${at}`));
    return element("li", {}, ...controls);
  }

  async #saveNew(): Promise<void> {
    const layout = { id: newId(), name: "", ...this.#actions.wall() };
    const isSaved = await askForLayout(this.root, this.#saved, layout, this.#actions.cameras());
    this.#finish(isSaved, "The layout is saved.");
    if (!isSaved) return;
    this.root.close();
    location.hash = savedAddress("layout", layout.id);
  }

  async #changeLayout(layout: SavedLayout): Promise<void> {
    this.#finish(await askForLayout(this.root, this.#saved, layout, this.#actions.cameras()), "The layout is saved.");
  }

  async #overwrite(layout: SavedLayout): Promise<void> {
    const now = { ...layout, ...this.#actions.wall() };
    this.#finish(await askToOverwrite(this.root, this.#saved, layout, now), `${layout.name} is what the wall shows.`);
  }

  async #changeSequence(sequence: Sequence): Promise<void> {
    this.#finish(await askForSequence(this.root, this.#saved, sequence), "The sequence is saved.");
  }

  async #delete(kind: SavedKind, one: SavedLayout | Sequence): Promise<void> {
    this.#finish(await askToDelete(this.root, this.#saved, kind, one), `${one.name} is deleted.`);
  }

  #finish(isDone: boolean, sentence: string): void {
    this.#focus();
    if (isDone) notify(sentence);
  }
}

function list(rows: HTMLElement[]): HTMLElement {
  if (rows.length === 0) return element("p", { class: "quiet" }, "None yet.");
  return element("ul", { class: "wall-menu-list" }, ...rows);
}
