// SPDX-License-Identifier: Apache-2.0
//
// The buttons that choose the wall's layout.

import { iconButton } from "../widgets/button";
import { element } from "../widgets/dom";
import type { IconName } from "../widgets/icons";
import { kLayoutChoices, type LayoutChoice } from "./layout";

export const kLayoutLabels: Record<LayoutChoice, readonly [IconName, string]> = {
  auto: ["layoutAuto", "All cameras on the screen"],
  first: ["layoutFirst", "The first camera large"],
  "1": ["layout1", "One camera"],
  "2": ["layout2", "Two by two"],
  "3": ["layout3", "Three by three"],
  "4": ["layout4", "Four by four"],
};

export class LayoutPicker {
  readonly root = element("div", { class: "segments", role: "group", "aria-label": "Layout" });

  /** `chosen` gets each choice that the user makes. */
  constructor(chosen: (choice: LayoutChoice) => void) {
    for (const choice of kLayoutChoices) {
      const button = iconButton(...kLayoutLabels[choice], () => chosen(choice));
      button.dataset["layout"] = choice;
      this.root.append(button);
    }
  }

  show(current: LayoutChoice): void {
    for (const button of this.root.children) {
      button.setAttribute("aria-pressed", String((button as HTMLElement).dataset["layout"] === current));
    }
  }
}
