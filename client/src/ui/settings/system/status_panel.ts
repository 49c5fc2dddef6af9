// SPDX-License-Identifier: Apache-2.0
//
// What is wrong with the installation, the worst first, and what to do about it; its processes and its certificate.

import type { System, SystemStatus } from "../../../wire/system";
import { element } from "../../widgets/dom";
import { factList } from "../../widgets/fact_list";
import { formPart } from "../../widgets/fields";
import { LoadedPart } from "../loaded_part";
import { askForCertificate } from "./certificate_dialog";
import { certificatePart } from "./certificate_part";
import { copyable } from "./copyable";
import { commandOf, kKindNames, linesOf, processName, processText, storeText, summaryText, type Line } from "./status_text";

export class StatusPanel {
  readonly #part: LoadedPart;
  readonly #system: System;
  readonly #closed: AbortSignal;

  constructor(system: System, closed: AbortSignal) {
    this.#part = new LoadedPart("Health", closed, "Running the checks; this may take seconds…");
    this.#system = system;
    this.#closed = closed;
  }

  get root(): HTMLElement {
    return this.#part.root;
  }

  /** Looks at everything, which may take seconds. What was seen before stays until then. */
  async load(): Promise<void> {
    await this.#part.fill(async () => content(await this.#system.status(this.#closed), () => void this.#replaceCertificate()));
  }

  async #replaceCertificate(): Promise<void> {
    if (await askForCertificate(this.root, this.#system)) await this.load();
  }
}

function content(status: SystemStatus, replaceCertificate: () => void): HTMLElement[] {
  const { version, store, process, certificate, check } = status;
  const lines = linesOf(check);
  const summary = element("p", { class: "health-summary", role: "status" }, summaryText(lines));
  const list = lines.length > 0 ? [element("ul", { class: "settings-list health-list" }, ...lines.map(lineRow))] : [];
  const passed = check.filter(({ ok, finding }) => ok && finding.length === 0).map(({ name }) => name);
  const rest = passed.length > 0 ? [element("p", { class: "quiet" }, `OK: ${passed.join(", ")}.`)] : [];
  const facts = factList([
    ["Version", version],
    ...process.map((one): [string, string] => [processName(one), processText(one)]),
    ["Store", storeText(store)],
  ]);
  return [
    formPart("Health", summary, ...list, ...rest),
    formPart("Components", facts),
    certificatePart(certificate, replaceCertificate),
  ];
}

function lineRow({ kind, check, text, remedy }: Line): HTMLElement {
  const mark = element("strong", { class: `health-mark ${kind}` }, kKindNames[kind]);
  const head = element("p", {}, mark, ` ${check}: ${text}`);
  if (!remedy) return element("li", { class: "card health-line" }, head);
  const command = commandOf(remedy);
  const advice = command === remedy ? [] : [element("p", { class: "health-remedy" }, `To do: ${remedy}`)];
  return element("li", { class: "card health-line" }, head, ...advice, ...(command ? [copyable(command)] : []));
}
