// SPDX-License-Identifier: Apache-2.0
//
// Text for somewhere else, such as a command for the server's shell: one button copies it.

import { button } from "../../widgets/button";
import { element } from "../../widgets/dom";
import { notify } from "../../widgets/notice";

export function copyable(text: string): HTMLElement {
  const shown = element("code", { class: "copyable-text" }, text);
  const copy = button("Copy", () => void copyText(shown));
  copy.setAttribute("aria-label", `Copy ${text}`);
  return element("div", { class: "copyable" }, shown, copy);
}

/** Over plain HTTP browsers let no page write to the clipboard: then it is selected, for the keys. */
async function copyText(shown: HTMLElement): Promise<void> {
  try {
    await navigator.clipboard.writeText(shown.textContent ?? "");
    notify("Copied.");
  } catch {
    getSelection()?.selectAllChildren(shown);
    notify("Selected. Copy it with the keys of your browser.");
  }
}
