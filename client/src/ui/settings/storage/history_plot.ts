// SPDX-License-Identifier: Apache-2.0
//
// How much footage is left of each of the last days, as bars.

import type { MountRecord } from "../../../wire/mounts";
import { bytesText } from "../../widgets/amounts";
import { element } from "../../widgets/dom";
import { svgElement } from "../../widgets/svg";
import { shortDate } from "../../widgets/text";

const kHeight = 60;
const kBarWidth = 10;
const kGap = 2;

export function historyPlot(history: MountRecord["history"]): HTMLElement {
  const most = Math.max(...history.map(({ bytes }) => bytes), 0);
  if (most === 0) return element("p", { class: "quiet" }, "No footage of the last 30 days is left.");
  const dayText = (day: string) => shortDate(Date.parse(`${day}T12:00`));
  const bars = history.map(({ day, bytes }, at) => {
    const height = bytes === 0 ? 0 : Math.max(1, (bytes / most) * kHeight);
    const place = { x: at * (kBarWidth + kGap), y: kHeight - height, width: kBarWidth, height };
    const title = svgElement("title", {}, `${dayText(day)}: ${bytesText(bytes)}`);
    return svgElement("rect", { class: "plot-bar", ...place }, title);
  });
  const [first, last] = [history[0]!.day, history.at(-1)!.day].map(dayText);
  const width = history.length * (kBarWidth + kGap) - kGap;
  const label = `Footage left of each day from ${first} to ${last}, at most ${bytesText(most)}`;
  const size = { viewBox: `0 0 ${width} ${kHeight}`, preserveAspectRatio: "none" };
  const plot = svgElement("svg", { class: "plot", ...size, role: "img", "aria-label": label }, ...bars);
  const caption = element(
    "figcaption",
    { class: "plot-caption" },
    element("span", {}, first!),
    element("span", {}, `up to ${bytesText(most)} a day`),
    element("span", {}, last!),
  );
  return element("figure", { class: "plot-figure" }, plot, caption);
}
