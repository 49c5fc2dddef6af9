// SPDX-License-Identifier: Apache-2.0
//
// One mount: how much of it is used, for how long it lasts, and what each camera needs.

import type { MountRecord } from "../../../wire/mounts";
import { settingsAddress } from "../../route";
import { bytesText } from "../../widgets/amounts";
import { linkButton } from "../../widgets/button";
import { element } from "../../widgets/dom";
import { factList } from "../../widgets/fact_list";
import { svgElement } from "../../widgets/svg";
import { plainTable } from "../../widgets/table";
import { minuteText } from "../../widgets/text";
import { historyPlot } from "./history_plot";
import { forecastText, limitText, stateText } from "./storage_text";

export function mountCard(mount: MountRecord): HTMLElement {
  const { id, name, path, enabled, state, message, total, free } = mount;
  const isWell = state === "ready" || state === "elsewhere";
  const words = [mount.default ? "default" : "", mount.shared ? "shared" : "", stateText(mount)];
  const marks = words.filter((text) => text).join(" · ");
  const head = element(
    "header",
    { class: "record-head" },
    element("h3", {}, name),
    element("span", { class: isWell || !enabled ? "quiet" : "record-trouble" }, marks),
    element("span", { class: "bar-gap" }),
    linkButton("Change", settingsAddress("storage", id)),
  );
  head.lastElementChild!.setAttribute("aria-label", `Change ${name}`);
  const trouble = message ? [element("p", { class: isWell ? "quiet" : "record-trouble" }, message)] : [];
  const oldest = mount.oldest ? minuteText(mount.oldest * 1000) : "none";
  const facts = factList([
    ["Recordings", bytesText(mount.used)],
    ["Free", total === null || free === null ? "unknown" : `${bytesText(free)} of ${bytesText(total)}`],
    ["Oldest footage", oldest],
    ["Per day", bytesText(mount.perDay)],
    ["Limits", limitText(mount.limit)],
  ]);
  return element(
    "li",
    { class: "card record-card" },
    head,
    element("p", { class: "quiet record-place" }, path),
    ...trouble,
    ...(total === null || free === null ? [] : [usageBar(total, free, mount.used)]),
    element("p", { class: "mount-forecast" }, forecastText(mount.lastsDays)),
    facts,
    historyPlot(mount.history),
    ...cameras(mount),
  );
}

function usageBar(total: number, free: number, used: number): HTMLElement {
  const whole = Math.max(total, 1);
  const other = Math.max(0, total - free - used);
  const rect = (look: string, from: number, bytes: number) =>
    svgElement("rect", { class: look, x: from / whole, y: 0, width: bytes / whole, height: 1 });
  const label = `${bytesText(used)} of recordings, ${bytesText(other)} of other files, ${bytesText(free)} free`;
  const bar = svgElement(
    "svg",
    { class: "usage", viewBox: "0 0 1 1", preserveAspectRatio: "none", role: "img", "aria-label": label },
    rect("usage-used", 0, used),
    rect("usage-other", used, other),
  );
  const key = (look: string, text: string) => element("span", { class: `usage-key ${look}` }, text);
  const keys = [key("used", "recordings"), key("other", "other files"), key("free", "free")];
  return element("div", {}, bar, element("p", { class: "usage-keys", "aria-hidden": "true" }, ...keys));
}

function cameras({ camera }: MountRecord): HTMLElement[] {
  if (camera.length === 0) return [];
  const most = [...camera].sort((one, other) => other.perDay - one.perDay);
  const rows = most.map(({ name, perDay }) => {
    const need = element("td", {}, `${bytesText(perDay)} a day`);
    return element("tr", {}, element("th", { scope: "row" }, name || "removed camera"), need);
  });
  const summary = element("summary", {}, `By camera (${camera.length})`);
  return [element("details", { class: "form-more" }, summary, plainTable([], rows))];
}
