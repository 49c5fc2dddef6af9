// SPDX-License-Identifier: Apache-2.0
//
// Where the parts of the events' screen are. Where there is no room for all of them, the player stays, and below it is
// the one that the user has chosen.

import { iconButton } from "../widgets/button";
import { Choice } from "../widgets/choice";
import { element } from "../widgets/dom";
import type { ExportPanel } from "./export_panel";
import type { Overview } from "./overview";
import type { Stage } from "./stage";
import type { Transport } from "./transport";

const kZoomStep = 2;
const kPanels = { list: "Events", calendar: "Calendar", timeline: "Timeline", filter: "Filter" };

export class EventsLayout {
  readonly root = element("div", { class: "events-body" });
  readonly #panels = new Choice<keyof typeof kPanels>("Show", kPanels, "list", (panel) => (this.root.dataset["panel"] = panel));

  constructor(stage: Stage, transport: Transport, exporting: ExportPanel, overview: Overview) {
    const { timeline, calendar, filter, list, markText } = overview;
    const zoom = element(
      "div",
      { class: "timeline-zoom", role: "group", "aria-label": "Span of the timeline" },
      iconButton("zoomOut", "Show more time", () => timeline.zoom(kZoomStep), "-"),
      iconButton("zoomIn", "Show less time", () => timeline.zoom(1 / kZoomStep), "+"),
      iconButton("now", "Show now", () => timeline.showNow()),
    );
    transport.root.append(zoom);
    const side = element("div", { class: "side" }, markText.root, calendar.root, filter.root, list.root);
    const below = [transport.root, exporting.root, this.#panels.root, timeline.root];
    this.root.append(element("div", { class: "events-main" }, stage.root, ...below), side);
  }

  /** Brings a part into sight where there is no room for all. */
  choose(panel: keyof typeof kPanels): void {
    this.#panels.choose(panel);
  }
}
