// SPDX-License-Identifier: Apache-2.0
//
// The links from screen to screen, in the bar of each.

import { element } from "../widgets/dom";
import { icon, type IconName } from "../widgets/icons";
import type { ScreenName } from "./route";

const kLinks: [ScreenName, IconName, label: string, href: string][] = [
  ["wall", "live", "Live", "#"],
  ["events", "events", "Events", "#events"],
  ["maps", "map", "Maps", "#maps"],
  ["settings", "settings", "Settings", "#settings"],
];

/** Those who are no managers have no settings. */
export function navigation(current: ScreenName, isManager: boolean): HTMLElement {
  const links = kLinks
    .filter(([screen]) => isManager || screen !== "settings")
    .map(([screen, name, label, href]) => {
      const link = element("a", { class: "nav-link", href }, icon(name), element("span", {}, label));
      if (screen === current) link.setAttribute("aria-current", "page");
      return link;
    });
  return element("nav", { class: "nav", "aria-label": "Screens" }, ...links);
}
