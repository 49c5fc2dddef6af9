// SPDX-License-Identifier: Apache-2.0
//
// The form of one record: knows whether it was changed, saves it, and where someone else has changed the record
// meanwhile, shows both and lets the user choose.

import { asServerError } from "../../wire/server";
import { button } from "../widgets/button";
import { element } from "../widgets/dom";
import { conflictPanel, type Descriptions } from "./conflict_panel";
import type { Draft } from "./draft";
import { isSame, merged } from "./merge";

export interface Revised {
  revision: number;
}

/** The fields of a form, and all that they hold as one value. */
export interface FormFields<Settings> {
  readonly content: readonly HTMLElement[];
  value: Settings;
  /** Fields that are never shown, such as passwords, hold something. */
  readonly hasSecrets: boolean;
  /** A sentence where the form cannot be saved as it is. */
  problem(settings: Settings): string;
}

export interface RecordFormParts<Settings extends object, Stored extends Revised> {
  fields: FormFields<Settings>;
  /** The record, or null for a new one, whose form begins with `initial`. */
  stored: Stored | null;
  initial: Settings;
  settingsOf(stored: Stored): Settings;
  /** Stores `settings`, made from `base`; null: the user has changed their mind. Rejects with a ServerError. */
  save(settings: Settings, base: Stored | null): Promise<Stored | null>;
  describe: Descriptions<Settings>;
  /** `hadSecrets`: fields that are never shown held something when it was saved. */
  onSaved(stored: Stored, hadSecrets: boolean): void;
  /** "camera" */
  noun: string;
  submit: string;
  leave(): void;
}

export class RecordForm<Settings extends object, Stored extends Revised> {
  readonly root: HTMLFormElement;
  readonly #parts: RecordFormParts<Settings, Stored>;
  readonly #fields: FormFields<Settings>;
  readonly #message = element("p", { class: "form-message", role: "alert" });
  readonly #submit: HTMLButtonElement;
  readonly #conflict = element("div", { class: "form-conflict-place" });
  /** Asked for while it was being saved. */
  #isToBeSavedAgain = false;
  /** What the changes are made from. */
  #base: Stored | null;
  #initial: Settings;

  constructor(parts: RecordFormParts<Settings, Stored>, draft: Draft | null) {
    this.#parts = parts;
    this.#fields = parts.fields;
    this.#base = parts.stored;
    this.#initial = parts.stored ? parts.settingsOf(parts.stored) : parts.initial;
    this.#submit = element("button", { type: "submit", class: "button primary" }, parts.submit);
    const buttons = element("div", { class: "form-buttons" }, this.#submit, button("Cancel", parts.leave), this.#message);
    this.root = element("form", { class: "form", novalidate: true }, ...parts.fields.content, this.#conflict, buttons);
    this.root.addEventListener("submit", (event) => {
      event.preventDefault();
      void this.#save();
    });
    this.root.addEventListener("input", () => (this.#message.textContent = ""));
    this.#fields.value = this.#initial;
    // A field may show less than was stored, such as fewer digits.
    this.#initial = this.#fields.value;
    if (draft) this.#restore(draft);
  }

  get isChanged(): boolean {
    return this.#fields.hasSecrets || !isSame(this.#fields.value, this.#initial);
  }

  get draft(): Draft | null {
    return this.isChanged ? { settings: this.#fields.value, base: this.#base } : null;
  }

  #restore({ settings, base }: Draft): void {
    if (base) {
      this.#base = base as Stored;
      this.#fields.value = this.#parts.settingsOf(this.#base);
      this.#initial = this.#fields.value;
    }
    this.#fields.value = settings as Settings;
    this.#message.textContent =
      "Your changes from before the session ended are here. They are not saved yet; passwords must be typed again.";
  }

  async #save(): Promise<void> {
    if (this.#submit.getAttribute("aria-busy") === "true") {
      this.#isToBeSavedAgain = true;
      return;
    }
    this.#isToBeSavedAgain = false;
    const settings = this.#fields.value;
    const invalid = [...this.root.elements].find((field) => field instanceof HTMLInputElement && !field.validity.valid);
    const problem = this.#fields.problem(settings) || (invalid ? "Please check the marked field." : "");
    this.#message.textContent = problem;
    if (problem) return void (invalid as HTMLElement | undefined)?.focus();
    const { hasSecrets } = this.#fields;
    this.#submit.setAttribute("aria-busy", "true");
    try {
      const stored = await this.#parts.save(settings, this.#base);
      if (!stored) return;
      const typed = this.#fields.value;
      this.#take(stored);
      // The server may have been slow.
      if (!isSame(typed, settings)) this.#fields.value = merged(settings, typed, this.#initial);
      this.#parts.onSaved(stored, hasSecrets);
    } catch (error) {
      const { status, data, message } = asServerError(error);
      if (status === 409 && this.#base && isStored<Stored>(data)) this.#showConflict(data);
      else this.#message.textContent = `Not saved. ${message}`;
    } finally {
      this.#submit.removeAttribute("aria-busy");
    }
    if (this.#isToBeSavedAgain && this.isChanged) await this.#save();
  }

  #take(stored: Stored): void {
    this.#base = stored;
    this.#fields.value = this.#parts.settingsOf(stored);
    this.#initial = this.#fields.value;
    this.#conflict.replaceChildren();
  }

  #showConflict(theirs: Stored): void {
    const mine = this.#fields.value;
    const now = this.#parts.settingsOf(theirs);
    const panel = conflictPanel(this.#parts.noun, this.#initial, mine, now, this.#parts.describe, {
      keepMine: () => {
        const both = merged(this.#initial, this.#fields.value, now);
        this.#take(theirs);
        this.#fields.value = both;
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
