// SPDX-License-Identifier: Apache-2.0
//
// Leads the user who has just made the first account through the settings: the first camera, then storage. Each can be
// skipped.

import { settingsAddress, type OpenSettings } from "../route";
import { element } from "../widgets/dom";

const kSteps = ["Account", "First camera", "Storage"] as const;

export class SetupSteps {
  readonly root: HTMLElement;
  // Whether the others were done or skipped is not known.
  readonly #steps = kSteps.map((name, at) => element("li", { class: at === 0 ? "setup-step done" : "setup-step" }, name));
  readonly #next = element("a", { class: "button" });

  constructor() {
    const steps = element("ol", { class: "setup-list" }, ...this.#steps);
    this.root = element("nav", { class: "setup-steps", "aria-label": "Set up Lookhaven" }, steps, this.#next);
  }

  /** As it is at this page of the settings. */
  show({ section, open }: OpenSettings): void {
    const isLast = section === "storage";
    const current = isLast ? 2 : 1;
    this.#steps.forEach((step, at) => {
      if (at === current) step.setAttribute("aria-current", "step");
      else step.removeAttribute("aria-current");
    });
    const isSkip = !isLast && open === "new";
    this.#next.textContent = isLast ? "Finish" : isSkip ? "Skip this step" : "Next: storage";
    this.#next.setAttribute("href", isLast ? "#" : settingsAddress("storage"));
    this.#next.classList.toggle("primary", !isSkip);
  }
}
