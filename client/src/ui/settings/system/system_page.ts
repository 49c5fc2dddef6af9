// SPDX-License-Identifier: Apache-2.0
//
// The installation as a whole: its health, its parts, its certificate, and what holds for all of it.

import { sentenceOf } from "../../../wire/sentence";
import { asServerError, ServerError } from "../../../wire/server";
import { System, type SettingRecord } from "../../../wire/system";
import { settingsAddress } from "../../route";
import { button, linkButton, whileBusy } from "../../widgets/button";
import { element } from "../../widgets/dom";
import { formPart } from "../../widgets/fields";
import { notify } from "../../widgets/notice";
import { yesNo } from "../../widgets/text";
import type { Descriptions } from "../conflict_panel";
import type { Draft } from "../draft";
import { changedFrom } from "../merge";
import { LoadedPage, type PageContext } from "../page";
import { RecordForm } from "../record_form";
import { copyable } from "./copyable";
import { LastErrorsPanel } from "./last_errors_panel";
import { LogLevelsPanel } from "./log_levels_panel";
import { SettingFields, settingLabel, type Values } from "./setting_fields";
import { StatusPanel } from "./status_panel";

/** All that may be changed as one record; each setting has a revision of its own. */
interface Stored {
  revision: 0;
  settings: readonly SettingRecord[];
}

const storedOf = (all: readonly SettingRecord[]): Stored => ({ revision: 0, settings: all.filter(({ operator }) => !operator) });
const valuesOf = ({ settings }: Stored): Values =>
  Object.fromEntries(settings.map(({ name, value }) => [name, value as number | boolean]));

export class SystemPage extends LoadedPage<SettingRecord[]> {
  readonly #system: System;
  readonly #status: StatusPanel;
  readonly #lastErrors: LastErrorsPanel;
  readonly #logLevels: LogLevelsPanel;
  #form: RecordForm<Values, Stored> | null = null;

  constructor(context: PageContext) {
    const again = button("Check again", (pressed) => void whileBusy(pressed, this.#checkAgain()));
    super(context, "System", again);
    this.#system = new System(context.server);
    this.#status = new StatusPanel(this.#system, this.closed);
    this.#lastErrors = new LastErrorsPanel(this.#system, this.closed);
    this.#logLevels = new LogLevelsPanel(this.#system, this.closed);
    void this.start(
      () => this.#system.settings(),
      (settings) => {
        this.#showAll(settings, context.draft);
        void whileBusy(again, this.#status.load());
        void this.#lastErrors.load();
        void this.#logLevels.load();
      },
    );
  }

  async #checkAgain(): Promise<void> {
    await Promise.all([this.#status.load(), this.#lastErrors.load()]);
  }

  override get isChanged(): boolean {
    return this.#form?.isChanged ?? false;
  }

  override get draft(): Draft | null {
    return this.#form ? this.#form.draft : super.draft;
  }

  #showAll(all: readonly SettingRecord[], draft: Draft | null): void {
    const stored = storedOf(all);
    const form = new RecordForm<Values, Stored>(
      {
        fields: new SettingFields(stored.settings),
        stored,
        initial: {},
        settingsOf: valuesOf,
        save: (values, base) => this.#save(values, base ?? stored),
        describe: descriptions(stored),
        onSaved: () => notify("The settings are saved."),
        noun: "group of settings",
        submit: "Save",
        leave: () => void this.#reset(),
      },
      draft,
    );
    this.#form = form;
    const operators = formPart("On the server only", ...all.filter(({ operator }) => operator).map(operatorsSetting));
    const audit = linkButton("Audit log", settingsAddress("audit"));
    this.show(this.#status.root, form.root, operators, this.#lastErrors.root, this.#logLevels.root, formPart("Who changed what", audit));
  }

  /** What was typed is given up. */
  async #reset(): Promise<void> {
    try {
      const settings = await this.#system.settings();
      if (!this.closed.aborted) this.#showAll(settings, null);
    } catch (error) {
      notify(asServerError(error).message);
    }
  }

  async #save(values: Values, base: Stored): Promise<Stored> {
    const saved = new Map<string, SettingRecord>();
    for (const [name, value] of Object.entries(changedFrom(valuesOf(base), values))) {
      const { revision } = base.settings.find((setting) => setting.name === name)!;
      try {
        saved.set(name, await this.#system.set(name, value!, revision));
      } catch (error) {
        const { status, code, message } = asServerError(error);
        if (status !== 409) throw error;
        throw new ServerError(status, code, message, storedOf(await this.#system.settings()));
      }
    }
    return { ...base, settings: base.settings.map((setting) => saved.get(setting.name) ?? setting) };
  }
}

function descriptions({ settings }: Stored): Descriptions<Values> {
  const text = (value: Values[string]) => (typeof value === "boolean" ? yesNo(value) : String(value));
  return Object.fromEntries(settings.map(({ name }) => [name, [settingLabel(name), text] as const]));
}

const kCommands: Record<string, string> = {
  login_port: "lookhaven setting set login_port 8080",
  mount_folders: "lookhaven setting set mount_folders /mnt:/media:/srv",
  monitor_token: "lookhaven setting set monitor_token new",
};

function operatorsSetting({ name, value, meaning }: SettingRecord): HTMLElement {
  const text = typeof value === "boolean" ? (value ? "set" : "none") : String(value);
  const command = kCommands[name];
  return element(
    "div",
    { class: "form-field" },
    element("p", {}, element("strong", {}, settingLabel(name)), `: ${text}`),
    element("p", { class: "form-hint" }, `${sentenceOf(meaning)} Changed with:`),
    ...(command ? [copyable(command)] : []),
  );
}
