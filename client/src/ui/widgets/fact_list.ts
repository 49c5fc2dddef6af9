// SPDX-License-Identifier: Apache-2.0
//
// Facts beneath each other or side by side, each with its label.

import { element } from "./dom";

export function factList(facts: readonly (readonly [label: string, text: string])[]): HTMLElement {
  const rows = facts.map(([label, text]) => element("div", {}, element("dt", {}, label), element("dd", {}, text)));
  return element("dl", { class: "fact-list" }, ...rows);
}
