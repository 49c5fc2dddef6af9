// SPDX-License-Identifier: Apache-2.0
//
// The last errors that the server has logged, for users without a shell there; and where else to look.

import type { LogTail, System } from "../../../wire/system";
import { button } from "../../widgets/button";
import { element } from "../../widgets/dom";
import { formPart } from "../../widgets/fields";
import { plainTable, scrolled } from "../../widgets/table";
import { minuteText } from "../../widgets/text";
import { LoadedPart } from "../loaded_part";
import { copyable } from "./copyable";

const kInitialCount = 10;
/** The server tells no more. */
const kMaxCount = 200;
const kJournalCommand = "journalctl _UID=$(id -u lookhaven) -p err";

const kTitle = "Last errors";

export class LastErrorsPanel {
  readonly #part: LoadedPart;
  readonly #system: System;

  constructor(system: System, closed: AbortSignal) {
    this.#part = new LoadedPart(kTitle, closed);
    this.#system = system;
  }

  get root(): HTMLElement {
    return this.#part.root;
  }

  async load(limit = kInitialCount): Promise<void> {
    await this.#part.fill(async () => [formPart(kTitle, ...this.#content(await this.#system.logTail(limit), limit))]);
  }

  #content({ entry, files, journal }: LogTail, limit: number): Node[] {
    const text = (words: string) => element("p", { class: "quiet" }, words);
    const rows = entry.map(({ time, process, text: what }) => {
      const cells = [process, what].map((words) => element("td", {}, words));
      return element("tr", {}, element("th", { scope: "row" }, minuteText(time * 1000)), ...cells);
    });
    const table = rows.length > 0 ? [scrolled(kTitle, plainTable(["Time", "Process", "Error"], rows))] : [];
    const more = button(`Show up to ${kMaxCount}`, () => void this.load(kMaxCount), "plain");
    const none = files ? "No errors in the log files of this server." : "This server has no log files.";
    const elsewhere = "The programs of this server log to the journal of the system, which is not shown here. On the server, read it with:";
    return [
      ...table,
      ...(entry.length === limit && limit < kMaxCount ? [element("div", { class: "form-buttons" }, more)] : []),
      ...(rows.length === 0 && !(journal && !files) ? [text(none)] : []),
      ...(journal ? [text(elsewhere), copyable(kJournalCommand)] : []),
    ];
  }
}
