// SPDX-License-Identifier: Apache-2.0
//
// What is wrong with the installation, the worst first, and what to do about it; its processes and its certificate.

import type { Certificate, System, SystemStatus } from "../../../wire/system";
import { button } from "../../widgets/button";
import { element } from "../../widgets/dom";
import { factList } from "../../widgets/fact_list";
import { formPart } from "../../widgets/fields";
import { calendarDate } from "../../widgets/text";
import { LoadedPart } from "../loaded_part";
import { askForCertificate } from "./certificate_dialog";
import { copyable } from "./copyable";
import { commandOf, kKindNames, linesOf, processName, processText, storeText, summaryText, type Line } from "./system_text";

export class HealthPanel {
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
    formPart(
      "Certificate",
      ...certificateContent(certificate),
      element("div", { class: "form-buttons" }, button("Replace the certificate…", replaceCertificate)),
    ),
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

function certificateContent(certificate: Certificate | null): HTMLElement[] {
  if (!certificate) return [element("p", { class: "quiet" }, "The server has no certificate of its own that can be read.")];
  const { subject, name, fingerprint, end, selfSigned } = certificate;
  const hint = "Browsers ask once about a certificate that is self-signed, and show this fingerprint.";
  return [
    factList([
      ["Subject", subject],
      ["Names", name.join(", ") || "none"],
      ["Expires", calendarDate(end * 1000)],
      ["Signed by", selfSigned ? "itself" : "an authority"],
    ]),
    element("p", { class: "quiet" }, "Fingerprint (SHA-256)"),
    copyable(fingerprint),
    ...(selfSigned ? [element("p", { class: "form-hint" }, hint)] : []),
  ];
}
