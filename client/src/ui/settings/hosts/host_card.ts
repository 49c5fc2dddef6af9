// SPDX-License-Identifier: Apache-2.0
//
// One host: where it is, whether it answers, and its cameras.

import type { HostRecord } from "../../../wire/hosts";
import { sentenceOf } from "../../../wire/sentence";
import { counted } from "../../widgets/amounts";
import { button } from "../../widgets/button";
import { element } from "../../widgets/dom";
import { plainTable } from "../../widgets/table";
import { denialsText } from "./host_text";

export interface HostCard {
  readonly root: HTMLElement;
  /** Shows why the host does not answer; empty: it does. */
  showState(reason: string): void;
}

export function hostCard(record: HostRecord, onRemove: () => void): HostCard {
  const { name, address, port, enabled } = record;
  const state = element("span", { class: "quiet" }, stateText(record));
  const trouble = element("p", { class: "record-trouble" });
  trouble.hidden = true;
  const remove = button("Remove…", onRemove);
  remove.setAttribute("aria-label", `Remove ${name}…`);
  const gap = element("span", { class: "bar-gap" });
  const head = element("header", { class: "record-head" }, element("h3", {}, name), state, gap, remove);
  const where = address ? [element("p", { class: "quiet record-place" }, `${address}, port ${port}`)] : [];
  const root = element("li", { class: "card record-card" }, head, ...where, trouble, ...cameras(record));
  return {
    root,
    showState(reason) {
      if (!enabled) return;
      state.textContent = reason ? "does not answer" : "answers";
      state.className = reason ? "record-trouble" : "quiet";
      trouble.textContent = reason ? sentenceOf(reason) : "";
      trouble.hidden = reason === "";
    },
  };
}

function stateText({ address, enabled }: HostRecord): string {
  if (!enabled) return "disabled";
  return address ? "being asked…" : "may show all cameras of this host";
}

function cameras(record: HostRecord): HTMLElement[] {
  const { address, camera, denial } = record;
  if (!address) return [];
  const denied = denial.length > 0 ? [element("p", { class: "quiet" }, `Denied: ${denialsText(record)}`)] : [];
  if (camera.length === 0) return [element("p", { class: "quiet" }, "It has no camera."), ...denied];
  const rows = camera.map((one) => {
    const ids = [one.id, one.idOnServer].map((id) => element("td", {}, String(id)));
    return element("tr", {}, element("th", { scope: "row" }, one.name), ...ids);
  });
  const summary = element("summary", {}, counted(camera.length, "camera"));
  const table = plainTable(["Camera", "Id here", "Id there"], rows);
  return [element("details", { class: "form-more" }, summary, table), ...denied];
}
