// SPDX-License-Identifier: Apache-2.0
//
// The buttons that choose how many cameras the stage has room for.

import { iconButton } from "../widgets/button";
import { element } from "../widgets/dom";
import type { IconName } from "../widgets/icons";
import { kStageLayouts, type StageLayout } from "./stage_layout";

const kLabels: Record<StageLayout, [IconName, string]> = {
  1: ["layout1", "One camera"],
  2: ["layout2", "Two by two cameras"],
  3: ["layout3", "Three by three cameras"],
};

export class StagePicker {
  readonly root = element("div", { class: "segments", role: "group", "aria-label": "Layout" });
  readonly #buttons: (readonly [StageLayout, HTMLButtonElement])[];

  /** Layouts of more than `maxPlayers` cameras are not offered. */
  constructor(maxPlayers: number, chosen: (layout: StageLayout) => void) {
    this.#buttons = kStageLayouts.map((layout) => [layout, iconButton(...kLabels[layout], () => chosen(layout))] as const);
    for (const [layout, button] of this.#buttons) {
      button.disabled = layout > 1 && maxPlayers <= (layout - 1) ** 2;
      if (button.disabled) button.title = `No more than ${maxPlayers} recordings play at once here`;
      this.root.append(button);
    }
  }

  show(current: StageLayout): void {
    for (const [layout, button] of this.#buttons) button.setAttribute("aria-pressed", String(layout === current));
  }
}
