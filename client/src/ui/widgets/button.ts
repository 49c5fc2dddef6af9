// SPDX-License-Identifier: Apache-2.0
//
// A button that shows an icon and carries its label for everyone who does not see it.

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
