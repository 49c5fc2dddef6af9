// SPDX-License-Identifier: Apache-2.0
//
// The buttons that choose the wall's layout; the choice is kept for the next visit.

import type { Preferences } from "../../wire/preferences";
import { iconButton } from "../widgets/button";
import { element } from "../widgets/dom";
import type { IconName } from "../widgets/icons";
import { kLayoutChoices, type LayoutChoice } from "./layout";

const kName = "wall.layout";
const kLabels: Record<LayoutChoice, [IconName, string]> = {
  auto: ["layoutAuto", "All cameras on the screen"],
  first: ["layoutFirst", "The first camera large"],
  "1": ["layout1", "One camera"],
  "2": ["layout2", "Two by two"],
  "3": ["layout3", "Three by three"],
  "4": ["layout4", "Four by four"],
};

/** `onChoose` gets the choice of the last visit at once, and then each one that the user makes. */
export function layoutPicker(preferences: Preferences, onChoose: (choice: LayoutChoice) => void): HTMLElement {
  const picker = element("div", { class: "segments", role: "group", "aria-label": "Layout" });
  const show = (choice: LayoutChoice) => {
    onChoose(choice);
    for (const button of picker.children) {
      button.setAttribute("aria-pressed", String((button as HTMLElement).dataset["layout"] === choice));
    }
  };
  for (const choice of kLayoutChoices) {
    const button = iconButton(...kLabels[choice], () => {
      show(choice);
      preferences.set(kName, choice);
    });
    button.dataset["layout"] = choice;
    picker.append(button);
  }
  const preferred = preferences.get(kName);
  show(kLayoutChoices.find((choice) => choice === preferred) ?? "auto");
  return picker;
}
