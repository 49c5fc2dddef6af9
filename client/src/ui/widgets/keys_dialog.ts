// SPDX-License-Identifier: Apache-2.0
//
// The dialog that shows the keys of a screen.

import { iconButton } from "./button";
import { element } from "./dom";

/** Keys, separated by blanks, and what they do. */
export type KeyList = readonly (readonly [keys: string, does: string])[];

/** What they are called where the browser's own name says little. */
const kNames: Record<string, string> = { Left: "←", Right: "→", Up: "↑", Down: "↓" };

export class KeysDialog {
  readonly root = element("dialog", { class: "card dialog keys", "aria-labelledby": "keys-title" });

  constructor() {
    this.root.addEventListener("click", (event) => event.target === this.root && this.root.close());
  }

  show(list: KeyList): void {
    const head = element(
      "header",
      { class: "dialog-head" },
      element("h2", { id: "keys-title" }, "Keys"),
      element("span", { class: "bar-gap" }),
      iconButton("close", "Close", () => this.root.close(), "Esc"),
    );
    const rows = list.flatMap(([keys, does]) => [
      element("dt", {}, ...keys.split(" ").map((key) => element("kbd", {}, kNames[key] ?? key))),
      element("dd", {}, does),
    ]);
    this.root.replaceChildren(head, element("dl", {}, ...rows));
    this.root.showModal();
  }
}
