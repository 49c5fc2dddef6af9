// SPDX-License-Identifier: Apache-2.0
//
// The links from screen to screen, in the bar of each.

import type { Alerts } from "../../wire/alerts";
import { newsText } from "../events/news_text";
import type { ScreenName } from "../route";
import { element, setText } from "../widgets/dom";
import { icon, type IconName } from "../widgets/icons";

const kLinks: [ScreenName, IconName, label: string, href: string][] = [
  ["wall", "live", "Live", "#"],
  ["events", "events", "Events", "#events"],
  ["maps", "map", "Maps", "#maps"],
  ["settings", "settings", "Settings", "#settings"],
];

/** How many events are new, beside the link to them. */
function badge(alerts: Alerts, closed: AbortSignal): HTMLElement {
  const root = element("span", { class: "nav-badge" });
  const show = () => {
    const { count, mayBeMore } = alerts.news;
    root.hidden = count === 0 && !mayBeMore;
    setText(root, count > 99 ? "99+" : `${count || ""}${mayBeMore ? "+" : ""}`);
    root.title = newsText(alerts.news);
  };
  alerts.listen(show, closed);
  show();
  return root;
}

/** Those who are no managers have no settings. Kept up to date until `closed` is aborted. */
export function navigation(current: ScreenName, isManager: boolean, alerts: Alerts, closed: AbortSignal): HTMLElement {
  const links = kLinks
    .filter(([screen]) => isManager || screen !== "settings")
    .map(([screen, name, label, href]) => {
      const link = element("a", { class: "nav-link", href }, icon(name), element("span", {}, label));
      if (screen === "events") link.append(badge(alerts, closed));
      if (screen === current) link.setAttribute("aria-current", "page");
      return link;
    });
  return element("nav", { class: "nav", "aria-label": "Screens" }, ...links);
}
