// SPDX-License-Identifier: Apache-2.0
//
// Links to the wall of all cameras and of each camera group that has some of them. Nothing where there are no groups.

import type { CameraGroup } from "../../wire/recordings";
import { groupAddress } from "../screens/route";
import { element } from "../widgets/dom";

export class GroupTabs {
  readonly root = element("nav", { class: "group-tabs", "aria-label": "Camera groups", hidden: true });
  #shown = "";

  /** `open` is the id of the group that is shown; null: all cameras. */
  show(groups: readonly CameraGroup[], open: number | null): void {
    const shown = JSON.stringify([groups, open]);
    if (shown === this.#shown) return;
    this.#shown = shown;
    this.root.hidden = groups.length === 0;
    const had = this.root.contains(document.activeElement);
    this.root.replaceChildren(tab("All", "#", open === null), ...groups.map(({ id, name }) => tab(name, groupAddress(id), id === open)));
    if (had) this.root.querySelector<HTMLElement>("[aria-current]")?.focus();
  }
}

function tab(name: string, href: string, isOpen: boolean): HTMLElement {
  const link = element("a", { class: "group-tab", href, title: name }, name);
  if (isOpen) link.setAttribute("aria-current", "page");
  return link;
}
