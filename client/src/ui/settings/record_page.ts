// SPDX-License-Identifier: Apache-2.0
//
// The page of one record, or of a new one: its form, what stands above and below that, and the way back to the list of
// all. Cameras, accounts and mounts differ in their fields, and in how they are saved.

import { capitalized } from "../../wire/sentence";
import { settingsAddress, type SettingsSection } from "../route";
import { button } from "../widgets/button";
import type { IconName } from "../widgets/icons";
import { notify } from "../widgets/notice";
import type { Descriptions } from "./conflict_panel";
import type { Draft } from "./draft";
import { emptyState, LoadedPage, type PageContext } from "./page";
import { RecordForm, type FormFields, type Revised } from "./record_form";

export interface NamedRecord extends Revised {
  id: number;
  name: string;
}

/** What a kind of record is called, and what a new one begins with. */
export interface RecordKind<Settings extends object, Stored> {
  /** "account", and with its article "an account". */
  noun: string;
  aNoun: string;
  section: SettingsSection;
  icon: IconName;
  initial: Settings;
  settingsOf(stored: Stored): Settings;
}

export interface RecordFields<Settings> extends FormFields<Settings> {
  /** Where the user begins with a new record. */
  focus(): void;
  /** Once they are saved. */
  clearSecrets(): void;
}

export abstract class RecordPage<
  List,
  Settings extends object,
  Stored extends NamedRecord,
  Fields extends RecordFields<Settings>,
> extends LoadedPage<List> {
  readonly #kind: RecordKind<Settings, Stored>;
  readonly #id: number | "new";
  #form: RecordForm<Settings, Stored> | null = null;
  #record: Stored | null = null;

  constructor(context: PageContext, id: number | "new", kind: RecordKind<Settings, Stored>) {
    const { noun, aNoun, section } = kind;
    super(context, id === "new" ? `Add ${aNoun}` : capitalized(noun));
    this.linkBack(`All ${noun}s`, settingsAddress(section));
    this.#kind = kind;
    this.#id = id;
  }

  override get isChanged(): boolean {
    return this.#form?.isChanged ?? false;
  }

  override get draft(): Draft | null {
    return this.#form ? this.#form.draft : super.draft;
  }

  /** As it was stored last; null for a new one, and until it is known. */
  protected get record(): Stored | null {
    return this.#record;
  }

  protected abstract newFields(record: Stored | null, list: List): Fields;

  /** Each setting in words, for a user who has to choose between two changes. */
  protected abstract descriptions(list: List): Descriptions<Settings>;

  /** Stores `settings`, made from `base`; null: the user has changed their mind. Rejects with a ServerError. */
  protected abstract save(settings: Settings, base: Stored | null, fields: Fields): Promise<Stored | null>;

  protected above(_record: Stored): Node[] {
    return [];
  }

  protected abstract below(record: Stored): Node[];

  /** A page calls it once it is made: shows the record as the server has it. */
  protected load(ask: () => Promise<List>, recordsOf: (list: List) => readonly Stored[]): void {
    const { noun, icon } = this.#kind;
    void this.start(ask, (list) => {
      this.#record = recordsOf(list).find(({ id }) => id === this.#id) ?? null;
      if (this.#id === "new" || this.#record) return this.#showForm(list);
      const back = button(`All ${noun}s`, this.context.done);
      this.show(emptyState(icon, `There is no such ${noun} any more.`, back));
    });
  }

  #showForm(list: List): void {
    const record = this.#record;
    const { noun, initial, settingsOf } = this.#kind;
    const fields = this.newFields(record, list);
    this.#form = new RecordForm<Settings, Stored>(
      {
        fields,
        stored: record,
        initial,
        settingsOf,
        save: (settings, base) => this.save(settings, base, fields),
        describe: this.descriptions(list),
        onSaved: (stored, hadSecrets) => this.#onSaved(stored, hadSecrets ? fields : null),
        noun,
        submit: record ? "Save" : `Add the ${noun}`,
        leave: this.context.leave,
      },
      this.context.draft,
    );
    this.show(this.#form.root);
    if (!record) return fields.focus();
    this.title = record.name;
    this.show(...this.above(record), this.#form.root, ...this.below(record));
  }

  /** `saved` are fields whose secrets are stored. */
  #onSaved(stored: Stored, saved: Fields | null): void {
    const isNew = this.#record === null;
    this.#record = stored;
    saved?.clearSecrets();
    this.title = stored.name;
    notify(isNew ? `${stored.name} is added.` : `The ${this.#kind.noun} is saved.`);
    if (isNew) this.context.done();
  }
}
