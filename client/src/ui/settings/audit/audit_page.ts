// SPDX-License-Identifier: Apache-2.0
//
// Who has changed what: the audit log, the newest entry first.

import { auditEntries, type AuditEntry } from "../../../wire/audit";
import { asServerError } from "../../../wire/server";
import { button } from "../../widgets/button";
import { element } from "../../widgets/dom";
import { notify } from "../../widgets/notice";
import { plainTable, scrolled } from "../../widgets/table";
import { clockTime, shortDate } from "../../widgets/text";
import { emptyState, LoadedPage, type PageContext } from "../page";
import { actionText, changesOf } from "./audit_text";

type Entries = Awaited<ReturnType<typeof auditEntries>>;

export class AuditPage extends LoadedPage<Entries> {
  readonly #list = element("ol", { class: "settings-list audit" });
  readonly #older = button("Older", () => void this.#loadOlder());
  #oldest: number | undefined;

  constructor(context: PageContext) {
    super(context, "Audit log");
    void this.start(
      () => auditEntries(context.server),
      (entries) => {
        const isEmpty = entries.entry.length === 0;
        if (isEmpty) return this.show(emptyState("audit", "Nobody has changed anything yet."));
        this.#append(entries);
        this.show(this.#list, element("div", { class: "form-buttons" }, this.#older));
      },
    );
  }

  #append({ entry, more }: Entries): void {
    this.#list.append(...entry.map(entryRow));
    this.#oldest = entry.at(-1)?.id ?? this.#oldest;
    this.#older.hidden = !more;
  }

  async #loadOlder(): Promise<void> {
    if (this.#older.getAttribute("aria-busy") === "true") return;
    this.#older.setAttribute("aria-busy", "true");
    try {
      const entries = await auditEntries(this.context.server, this.#oldest);
      if (!this.closed.aborted) this.#append(entries);
    } catch (error) {
      notify(asServerError(error).message);
    } finally {
      this.#older.removeAttribute("aria-busy");
    }
  }
}

function entryRow(entry: AuditEntry): HTMLElement {
  const { time, who, address, action, object } = entry;
  const at = element("time", { class: "audit-time quiet" }, `${shortDate(time * 1000)} ${clockTime(time * 1000)}`);
  const what = element("span", { class: "audit-what" }, `${actionText(action)}: `, element("strong", {}, object));
  const by = element("span", { class: "quiet audit-who" }, address ? `${who}, from ${address}` : who);
  const changes = changesOf(entry).map(({ name, before, after }) => {
    const cell = (text: string) => element("td", {}, text || "–");
    return element("tr", {}, element("th", { scope: "row" }, name), cell(before), cell(after));
  });
  const heads = ["Setting", "Before", "After"];
  const entryOf = (content: HTMLElement) => element("li", { class: "card audit-entry" }, content);
  if (changes.length === 0) return entryOf(element("div", { class: "audit-line" }, at, what, by));
  const summary = element("summary", { class: "audit-line" }, at, what, by);
  return entryOf(element("details", {}, summary, scrolled("What was changed", plainTable(heads, changes))));
}
