// SPDX-License-Identifier: Apache-2.0
//
// What holds for the whole installation, as fields: a number with its bounds, or a switch.

import { sentenceOf } from "../../../wire/sentence";
import type { SettingRecord } from "../../../wire/system";
import { checkField, formPart, numberField, type Field } from "../../widgets/fields";
import type { FormFields } from "../record_form";

/** By name. A number is null where nothing is typed. */
export type Values = Record<string, number | boolean | null>;

const kLabels: Record<string, string> = {
  login_port: "Port for a direct log-in",
  players_per_session: "Recordings side by side",
  marks_per_day: "Alerts and transactions a day",
  cms: "Central management",
  mount_folders: "Folders for mounts",
  monitor_token: "Monitors' token",
};

export function settingLabel(name: string): string {
  return kLabels[name] ?? name;
}

function hintOf({ meaning, initial, min, max, kind }: SettingRecord): string {
  const sentence = sentenceOf(meaning);
  return kind === "number" ? `${sentence} From ${min} to ${max}, initially ${initial}.` : sentence;
}

export class SettingFields implements FormFields<Values> {
  readonly content: HTMLElement[];
  readonly hasSecrets = false;
  readonly #settings: readonly SettingRecord[];
  readonly #fields = new Map<string, Field<number | null> | Field<boolean>>();

  /** `settings` are those that may be changed. */
  constructor(settings: readonly SettingRecord[]) {
    this.#settings = settings;
    for (const setting of settings) {
      const { name, kind, min, max } = setting;
      const label = settingLabel(name);
      const hint = hintOf(setting);
      this.#fields.set(name, kind === "switch" ? checkField(label, hint) : numberField(label, min!, max!, hint));
    }
    this.content = [formPart("For the whole installation", ...[...this.#fields.values()].map(({ root }) => root))];
  }

  get value(): Values {
    return Object.fromEntries([...this.#fields].map(([name, field]) => [name, field.value]));
  }

  set value(values: Values) {
    for (const [name, field] of this.#fields) (field as Field<unknown>).value = values[name] ?? null;
  }

  problem(values: Values): string {
    const isWrong = ({ name, kind, min, max }: SettingRecord) => {
      const value = values[name];
      return kind === "number" && !(Number.isInteger(value) && Number(value) >= min! && Number(value) <= max!);
    };
    const wrong = this.#settings.find(isWrong);
    return wrong ? `${settingLabel(wrong.name)}: please enter a whole number from ${wrong.min} to ${wrong.max}.` : "";
  }
}
