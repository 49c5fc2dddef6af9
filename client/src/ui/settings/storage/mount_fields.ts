// SPDX-License-Identifier: Apache-2.0
//
// The settings of a mount as fields: where it is, and what limits it.

import type { MountRecord, MountSettings } from "../../../wire/mounts";
import { kGigabyte } from "../../widgets/amounts";
import { element, setText } from "../../widgets/dom";
import { checkField, formPart, formRow, numberField, textField, type Field, type TextField } from "../../widgets/fields";
import type { RecordFields } from "../record_page";
import { limitsEffect } from "./storage_text";

export type MountFormSettings = MountSettings & { path: string };

const kWhere = "An empty folder on the server, below one that its operator allows (initially /mnt, /media and /srv).";
const kLimits = "Footage beyond either limit is deleted, the oldest first. Leave empty for no limit but the disk.";

export class MountFields implements RecordFields<MountFormSettings> {
  readonly content: HTMLElement[];
  readonly hasSecrets = false;
  readonly #name = textField("Name", { maxlength: "80" });
  readonly #path: TextField;
  readonly #enabled = checkField("Record to this mount", "When off, its recordings can still be played.");
  readonly #default = checkField("The default mount", "For cameras that name no other.");
  readonly #days: Field<number | null> = numberField("Days", 1, 36_500);
  readonly #gigabytes: Field<number | null> = numberField("Size in GB", 0.1, 10_000_000);
  readonly #effect = element("p", { class: "form-hint", "aria-live": "polite" });
  readonly #stored: () => MountRecord | null;

  /** `stored` tells the mount as the server has it, null for a new one. */
  constructor(stored: () => MountRecord | null) {
    this.#stored = stored;
    const mount = stored();
    const look = { readonly: mount !== null, placeholder: "/srv/recordings" };
    this.#path = textField("Folder", look, mount ? "" : kWhere);
    this.#enabled.root.hidden = mount === null;
    // Another one is made the default instead.
    this.#default.root.hidden = mount?.default ?? false;
    const hint = element("p", { class: "form-hint" }, kLimits);
    const limits = formPart("Limits", hint, formRow(this.#days, this.#gigabytes), this.#effect);
    const what = formPart("Mount", this.#name.root, this.#path.root, this.#enabled.root, this.#default.root);
    this.content = [what, limits];
    for (const part of this.content) part.addEventListener("input", () => this.#showEffect());
  }

  get value(): MountFormSettings {
    const gigabytes = this.#gigabytes.value;
    return {
      name: this.#name.value.trim(),
      path: this.#path.value.trim(),
      enabled: this.#enabled.value,
      default: this.#default.value,
      limitBytes: gigabytes === null ? null : Math.round(gigabytes * kGigabyte),
      limitDays: this.#days.value,
    };
  }

  set value(settings: MountFormSettings) {
    this.#name.value = settings.name;
    this.#path.value = settings.path;
    this.#enabled.value = settings.enabled;
    this.#default.value = settings.default;
    this.#days.value = settings.limitDays;
    this.#gigabytes.value = settings.limitBytes === null ? null : settings.limitBytes / kGigabyte;
    this.#showEffect();
  }

  problem({ name, path }: MountFormSettings): string {
    if (!name) return "Please give the mount a name.";
    return path.startsWith("/") ? "" : "The folder begins with a slash.";
  }

  focus(): void {
    this.#name.input.focus();
  }

  clearSecrets(): void {}

  #showEffect(): void {
    const mount = this.#stored();
    setText(this.#effect, mount ? limitsEffect(this.value, mount) : "");
  }
}
