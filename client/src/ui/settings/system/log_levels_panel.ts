// SPDX-License-Identifier: Apache-2.0
//
// How much the server logs of what it does, by category.

import type { LogLevels, System } from "../../../wire/system";
import { button } from "../../widgets/button";
import { element } from "../../widgets/dom";
import { factList } from "../../widgets/fact_list";
import { formPart, selectField, type Field } from "../../widgets/fields";
import { openDialog } from "../../widgets/form_dialog";
import { notify } from "../../widgets/notice";
import { LoadedPart } from "../loaded_part";
import { SeenRecord } from "../seen_record";

const kNames: Record<string, string> = { liveview: "Live view", player: "Players", requests: "Requests", others: "Everything else" };
const kHint = "Messages of this level and more severe ones are logged. Levels hold at once, and until they are changed.";
/** The most severe first. */
const kOrder = ["off", "error", "warning", "notice", "info", "debug"];

const kTitle = "Log levels";

export class LogLevelsPanel {
  readonly #part: LoadedPart;
  readonly #system: System;

  constructor(system: System, closed: AbortSignal) {
    this.#part = new LoadedPart(kTitle, closed);
    this.#system = system;
  }

  get root(): HTMLElement {
    return this.#part.root;
  }

  async load(): Promise<void> {
    await this.#part.fill(async () => {
      const levels = await this.#system.logLevels();
      const change = button("Change log levels…", () => void this.#change(levels));
      const facts = entries(levels).map(([name, level]): [string, string] => [labelOf(name), level]);
      return [formPart(kTitle, factList(facts), element("div", { class: "form-buttons" }, change))];
    });
  }

  async #change(levels: LogLevels): Promise<void> {
    const options = [...levels.known].sort((one, other) => kOrder.indexOf(one) - kOrder.indexOf(other));
    const fields = entries(levels).map(([name, level]): [string, Field<string>] => {
      const field = selectField(labelOf(name), options.map((one) => [one, one] as const));
      field.value = level;
      return [name, field];
    });
    const seen = new SeenRecord({ ...levels, name: "the log levels" }, "Save");
    const isDone = await openDialog(this.root, {
      title: kTitle,
      content: [element("p", { class: "form-hint" }, kHint), ...fields.map(([, field]) => field.root)],
      submit: "Save",
      attempt: () => {
        const wanted = fields.map(([name, field]) => ({ name, level: field.value }));
        const changed = wanted.filter(({ name, level }) => level !== new Map(entries(levels)).get(name));
        return seen.attempt(({ revision }) => this.#system.setLogLevels(changed, revision));
      },
    });
    if (!isDone) return;
    notify("The log levels are saved.");
    await this.load();
  }
}

function entries({ category, others }: LogLevels): [name: string, level: string][] {
  return [...category.map(({ name, level }): [string, string] => [name, level]), ["others", others]];
}

function labelOf(name: string): string {
  return kNames[name] ?? `Category ${name}`;
}
