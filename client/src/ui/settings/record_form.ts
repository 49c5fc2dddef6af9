// SPDX-License-Identifier: Apache-2.0
//
// The form of one record: knows whether it was changed, saves it, and where someone else has changed the record meanwhile,
// shows both and lets the user choose.

import { asServerError } from "../../wire/server";
import { element } from "../widgets/dom";
import { conflictPanel, type Descriptions } from "./conflict_panel";
import { isSame, merged } from "./merge";
import { button } from "./page";

/** What a form held when it was closed, and the record that it was made from. Passwords are not kept. */
export interface Draft {
  settings: unknown;
  base: unknown;
}

export interface Revised {
  revision: number;
}

export interface RecordFormParts<Settings extends object, Stored extends Revised> {
  content: HTMLElement[];
  /** The record, or null for a new one, whose form begins with `initial`. */
  stored: Stored | null;
  initial: Settings;
  settingsOf(stored: Stored): Settings;
  read(): Settings;
  show(settings: Settings): void;
  /** Fields that are never shown, such as passwords, hold something. */
  hasSecrets(): boolean;
  /** Stores `settings`, made from `base`; null: the user has changed their mind. Rejects with a ServerError. */
  save(settings: Settings, base: Stored | null): Promise<Stored | null>;
  /** A sentence where the form cannot be saved as it is. */
  problem(settings: Settings): string;
  describe: Descriptions<Settings>;
  onSaved(stored: Stored): void;
  /** "camera" */
  noun: string;
  submit: string;
  leave(): void;
}

export class RecordForm<Settings extends object, Stored extends Revised> {
  readonly root: HTMLFormElement;
  readonly #parts: RecordFormParts<Settings, Stored>;
  readonly #message = element("p", { class: "form-message", role: "alert" });
  readonly #submit: HTMLButtonElement;
  readonly #conflict = element("div", { class: "form-conflict-place" });
  /** What the changes are made from. */
  #base: Stored | null;
  #initial: Settings;

  constructor(parts: RecordFormParts<Settings, Stored>, draft: Draft | null) {
    this.#parts = parts;
    this.#base = parts.stored;
    this.#initial = parts.stored ? parts.settingsOf(parts.stored) : parts.initial;
    this.#submit = element("button", { type: "submit", class: "button primary" }, parts.submit);
    const buttons = element("div", { class: "form-buttons" }, this.#submit, button("Cancel", parts.leave), this.#message);
    this.root = element("form", { class: "form", novalidate: true }, ...parts.content, this.#conflict, buttons);
    this.root.addEventListener("submit", (event) => {
      event.preventDefault();
      void this.#save();
    });
    this.root.addEventListener("input", () => (this.#message.textContent = ""));
    parts.show(this.#initial);
    // A field may show less than was stored, such as fewer digits.
    this.#initial = parts.read();
    if (draft) this.#restore(draft);
  }

  get isChanged(): boolean {
    return this.#parts.hasSecrets() || !isSame(this.#parts.read(), this.#initial);
  }

  get draft(): Draft | null {
    return this.isChanged ? { settings: this.#parts.read(), base: this.#base } : null;
  }

  #restore({ settings, base }: Draft): void {
    if (base) {
      this.#base = base as Stored;
      this.#parts.show(this.#parts.settingsOf(this.#base));
      this.#initial = this.#parts.read();
    }
    this.#parts.show(settings as Settings);
    this.#message.textContent =
      "Your changes from before the session ended are here. They are not saved yet; passwords must be typed again.";
  }

  async #save(): Promise<void> {
    if (this.#submit.getAttribute("aria-busy") === "true") return;
    const settings = this.#parts.read();
    const invalid = [...this.root.elements].find((field) => field instanceof HTMLInputElement && !field.validity.valid);
    const problem = this.#parts.problem(settings) || (invalid ? "Please check the marked field." : "");
    this.#message.textContent = problem;
    if (problem) return void (invalid as HTMLElement | undefined)?.focus();
    this.#submit.setAttribute("aria-busy", "true");
    try {
      const stored = await this.#parts.save(settings, this.#base);
      if (!stored) return;
      const typed = this.#parts.read();
      this.#take(stored);
      // The server may have been slow.
      if (!isSame(typed, settings)) this.#parts.show(merged(settings, typed, this.#initial));
      this.#parts.onSaved(stored);
    } catch (error) {
      const { status, data, message } = asServerError(error);
      if (status === 409 && this.#base && isStored<Stored>(data)) this.#showConflict(data);
      else this.#message.textContent = `Not saved. ${message}`;
    } finally {
      this.#submit.removeAttribute("aria-busy");
    }
  }

  #take(stored: Stored): void {
    this.#base = stored;
    this.#parts.show(this.#parts.settingsOf(stored));
    this.#initial = this.#parts.read();
    this.#conflict.replaceChildren();
  }

  #showConflict(theirs: Stored): void {
    const mine = this.#parts.read();
    const now = this.#parts.settingsOf(theirs);
    const panel = conflictPanel(this.#parts.noun, this.#initial, mine, now, this.#parts.describe, {
      keepMine: () => {
        const both = merged(this.#initial, this.#parts.read(), now);
        this.#take(theirs);
        this.#parts.show(both);
        void this.#save();
      },
      takeTheirs: () => this.#take(theirs),
    });
    this.#conflict.replaceChildren(panel);
    panel.querySelector("button")?.focus();
  }
}

function isStored<Stored extends Revised>(data: unknown): data is Stored {
  return typeof data === "object" && data !== null && "revision" in data;
}
