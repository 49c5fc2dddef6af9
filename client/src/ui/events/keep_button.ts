// SPDX-License-Identifier: Apache-2.0
//
// The padlock at the player: says whether what plays is kept, why and by whom, and lets a manager change it.

import type { Exports } from "../../wire/exports";
import { isSameFootage, type Footage } from "../../wire/footage";
import type { Recordings } from "../../wire/recordings";
import { asServerError, ServerError } from "../../wire/server";
import { iconButton } from "../widgets/button";
import { element, setText } from "../widgets/dom";
import { icon } from "../widgets/icons";
import { notify } from "../widgets/notice";

const kMaxNoteCharacters = 120;
const kEffect = "A kept recording is not deleted, whatever the limits of its mount, until it is released.";

export class KeepButton {
  readonly root = iconButton("notKept", "Keep this recording", () => this.#open());
  readonly dialog = element("dialog", { class: "card dialog", "aria-labelledby": "keep-title" });
  readonly #recordings: Recordings;
  readonly #exports: Exports;
  readonly #isManager: boolean;
  readonly #changed: (footage: Footage) => void;
  readonly #note = element("input", { class: "input", id: "keep-note", maxlength: String(kMaxNoteCharacters), autocomplete: "off" });
  readonly #error = element("p", { class: "alarm", role: "alert" });
  /** What plays, as it was looked up; null until that is known. */
  #footage: Footage | null = null;
  #asked: Footage | null = null;
  /** Why it could not be looked up; empty where it could. */
  #failure = "";

  /** `changed` is called with what was kept or released. */
  constructor(recordings: Recordings, exports: Exports, isManager: boolean, changed: (footage: Footage) => void) {
    this.#recordings = recordings;
    this.#exports = exports;
    this.#isManager = isManager;
    this.#changed = changed;
    this.root.append(icon("kept"));
    this.root.classList.add("keep-button");
    this.dialog.addEventListener("click", (event) => event.target === this.dialog && this.dialog.close());
    this.#showState();
  }

  show(footage: Footage | null): void {
    if (footage ? isSameFootage(footage, this.#asked) : !this.#asked) return;
    this.#asked = footage;
    this.#footage = null;
    this.#failure = "";
    this.#showState();
    if (footage) void this.#lookUp(footage);
  }

  async #lookUp(footage: Footage): Promise<void> {
    const found = await this.#recordings.find(footage).catch(asServerError);
    if (!isSameFootage(footage, this.#asked)) return;
    this.#failure = found instanceof ServerError ? found.message : "";
    this.#footage = found instanceof ServerError ? null : found;
    this.#showState();
  }

  #showState(): void {
    const { isKept = false, note = "", keeper = "" } = this.#footage ?? {};
    const told = `Kept${keeper && ` by ${keeper}`}${note && `: ${note}`}`;
    const label = isKept ? told : "Keep this recording";
    // An account that may not change it sees it where there is something to see.
    this.root.hidden = !this.#isManager && !isKept;
    this.root.disabled = !this.#footage || !this.#isManager;
    this.root.dataset["kept"] = String(isKept);
    this.root.setAttribute("aria-label", label);
    this.root.title = this.#failure || label;
  }

  #open(): void {
    const footage = this.#footage;
    if (!footage) return;
    this.#note.value = footage.note;
    setText(this.#error, "");
    const head = element(
      "header",
      { class: "dialog-head" },
      element("h2", { id: "keep-title" }, footage.isKept ? "Kept recording" : "Keep this recording"),
      element("span", { class: "bar-gap" }),
      iconButton("close", "Close", () => this.dialog.close(), "Esc"),
    );
    const form = element(
      "form",
      { class: "keep-form" },
      element("p", { class: "quiet" }, kEffect),
      element("label", { for: "keep-note" }, "Note"),
      this.#note,
      this.#error,
      this.#buttons(footage),
    );
    form.addEventListener("submit", (event) => {
      event.preventDefault();
      void this.#change(footage, true);
    });
    this.dialog.replaceChildren(head, form);
    this.dialog.showModal();
    this.#note.focus();
  }

  #buttons(footage: Footage): HTMLElement {
    const keep = element("button", { type: "submit", class: "button primary" }, footage.isKept ? "Save note" : "Keep");
    const release = element("button", { type: "button", class: "button", hidden: !footage.isKept }, "Release");
    release.addEventListener("click", () => void this.#change(footage, false));
    return element("div", { class: "keep-buttons" }, release, keep);
  }

  async #change(footage: Footage, isKept: boolean): Promise<void> {
    try {
      await this.#exports.keep(footage, isKept, this.#note.value.trim());
      this.dialog.close();
      notify(isKept ? "The recording is kept." : "The recording is no longer kept.");
    } catch (error) {
      setText(this.#error, asServerError(error).message);
    }
    this.#changed(footage);
    await this.#lookUp(footage);
  }
}
