// SPDX-License-Identifier: Apache-2.0
//
// Buttons: with a word; with an icon, whose label is for everyone who does not see it; and links that look like one.

import { element } from "./dom";
import { icon, type IconName } from "./icons";

/** `shortcut` is the key that does the same, shown with the label when the pointer rests on the button. */
export function iconButton(name: IconName, label: string, onClick: () => void, shortcut?: string): HTMLButtonElement {
  const button = element(
    "button",
    { type: "button", class: "icon-button", "aria-label": label, title: shortcut ? `${label} (${shortcut})` : label },
    icon(name),
  );
  button.addEventListener("click", onClick);
  return button;
}

/** A link that looks like a button. */
export function linkButton(label: string, href: string, isPrimary = false): HTMLElement {
  return element("a", { class: isPrimary ? "button primary" : "button", href }, label);
}

export function button(label: string, onClick: (made: HTMLButtonElement) => void, look = ""): HTMLButtonElement {
  const made = element("button", { type: "button", class: `button ${look}`.trim() }, label);
  made.addEventListener("click", () => onClick(made));
  return made;
}

/** The button takes no clicks until `work` is done, which a second one would begin again. */
export async function whileBusy<Result>(pressed: HTMLButtonElement, work: Promise<Result>): Promise<Result> {
  const hadFocus = document.activeElement === pressed;
  pressed.setAttribute("aria-busy", "true");
  pressed.disabled = true;
  try {
    return await work;
  } finally {
    pressed.removeAttribute("aria-busy");
    pressed.disabled = false;
    // Disabled buttons lose it.
    if (hadFocus) pressed.focus();
  }
}
