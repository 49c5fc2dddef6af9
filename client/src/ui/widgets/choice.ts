// SPDX-License-Identifier: Apache-2.0
//
// A row of buttons of which one is pressed.

import { element } from "./dom";

export class Choice<Name extends string> {
  readonly root: HTMLElement;
  readonly #chosen: (name: Name) => void;
  readonly #buttons = new Map<Name, HTMLButtonElement>();

  /** `chosen` is called for each choice, the first one included. */
  constructor(label: string, names: Record<Name, string>, first: Name, chosen: (name: Name) => void) {
    this.#chosen = chosen;
    this.root = element("div", { class: "choice", role: "group", "aria-label": label });
    for (const [name, text] of Object.entries(names) as [Name, string][]) {
      const button = element("button", { type: "button", class: "choice-button" }, text);
      button.addEventListener("click", () => this.choose(name));
      this.#buttons.set(name, button);
      this.root.append(button);
    }
    this.choose(first);
  }

  choose(wanted: Name): void {
    for (const [name, button] of this.#buttons) button.setAttribute("aria-pressed", String(name === wanted));
    this.#chosen(wanted);
  }
}
