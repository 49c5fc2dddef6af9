// SPDX-License-Identifier: Apache-2.0
//
// Says that someone else has changed the map meanwhile, and lets the user choose whose changes stay.

import { element } from "../widgets/dom";

export function conflictBar(onTakeTheirs: () => void, onOverwrite: () => void): HTMLElement {
  const choice = (label: string, onClick: () => void) => {
    const button = element("button", { type: "button", class: "button" }, label);
    button.addEventListener("click", onClick);
    return button;
  };
  return element(
    "div",
    { class: "map-conflict", role: "alert", hidden: true },
    element("p", {}, "Someone else has changed this map since you opened it. Your changes are not saved yet."),
    choice("Show their version", onTakeTheirs),
    choice("Overwrite with mine", onOverwrite),
  );
}
