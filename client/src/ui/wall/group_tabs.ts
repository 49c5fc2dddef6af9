// SPDX-License-Identifier: Apache-2.0
//
// Links to the wall of all cameras and of each camera group that has some of them, and the saved layout that is shown.
// Nothing where there are no groups, and no layout is shown.

import type { CameraGroup } from "../../wire/recordings";
import { groupAddress, savedAddress, type OpenWall } from "../route";
import { element } from "../widgets/dom";

export class GroupTabs {
  readonly root = element("nav", { class: "group-tabs", "aria-label": "Camera groups", hidden: true });
  #shown = "";

  /** `layout` is the name of the one that `open` names; empty where it names none, or one that is not there. */
  show(groups: readonly CameraGroup[], open: OpenWall, layout: string): void {
    const shown = JSON.stringify([groups, open, layout]);
    if (shown === this.#shown) return;
    this.#shown = shown;
    this.root.hidden = groups.length === 0 && !layout;
    const isAll = open.group === null && open.layout === null && open.sequence === null;
    const had = this.root.contains(document.activeElement);
    this.root.replaceChildren(
      tab("All", "#", isAll),
      ...groups.map(({ id, name }) => tab(name, groupAddress(id), id === open.group)),
      ...(layout ? [tab(layout, savedAddress("layout", open.layout ?? ""), true)] : []),
    );
    if (had) this.root.querySelector<HTMLElement>("[aria-current]")?.focus();
  }
}

function tab(name: string, href: string, isOpen: boolean): HTMLElement {
  const link = element("a", { class: "group-tab", href, title: name }, name);
  if (isOpen) link.setAttribute("aria-current", "page");
  return link;
}
