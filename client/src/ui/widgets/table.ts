// SPDX-License-Identifier: Apache-2.0
//
// Tables of text.

import { element } from "./dom";

/** A head may be empty. */
export function plainTable(heads: readonly string[], rows: readonly HTMLElement[]): HTMLTableElement {
  const cells = heads.map((text) => (text ? element("th", { scope: "col" }, text) : element("td")));
  const table = element("table", { class: "plain-table" });
  if (heads.length > 0) table.append(element("thead", {}, element("tr", {}, ...cells)));
  table.append(element("tbody", {}, ...rows));
  return table;
}

/** A wide table scrolls by itself, with the keys as well, so that the page does not. */
export function scrolled(label: string, table: HTMLElement): HTMLElement {
  return element("div", { class: "table-scroll", tabindex: "0", role: "group", "aria-label": label }, table);
}
