// SPDX-License-Identifier: Apache-2.0
//
// The way from screen to screen, in the bar of each.

import { element } from "../widgets/dom";
import { icon, type IconName } from "../widgets/icons";
import type { Screen } from "./route";

const kScreens: [Screen, IconName, string, string][] = [
  ["live", "live", "Live", "#"],
  ["events", "events", "Events", "#events"],
  ["maps", "map", "Maps", "#maps"],
];

export function navigation(current: Screen): HTMLElement {
  const links = kScreens.map(([screen, name, label, href]) => {
    const link = element("a", { class: "nav-link", href }, icon(name), element("span", {}, label));
    if (screen === current) link.setAttribute("aria-current", "page");
    return link;
  });
  return element("nav", { class: "nav", "aria-label": "Screens" }, ...links);
}
