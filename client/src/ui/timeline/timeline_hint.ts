// SPDX-License-Identifier: Apache-2.0
//
// What lies under the pointer on the timeline: a line through all lanes, and beside it the time and what happened then.

import { element, setText } from "../widgets/dom";
import type { Point } from "../widgets/pan_zoom";

const kMaxWidthPx = 240;

export class TimelineHint {
  readonly #line = element("div", { class: "timeline-pointer", hidden: true });
  readonly #text = element("div", { class: "timeline-hint", hidden: true });
  readonly #box: HTMLElement;

  /** Adds itself to `box`. */
  constructor(box: HTMLElement) {
    this.#box = box;
    box.append(this.#line, this.#text);
  }

  show({ x, y }: Point, text: string): void {
    this.#line.hidden = this.#text.hidden = false;
    setText(this.#text, text);
    this.#text.classList.toggle("at-right", x > this.#box.clientWidth - kMaxWidthPx);
    this.#box.style.setProperty("--pointer", `${x}px`);
    this.#box.style.setProperty("--pointer-y", `${y}px`);
  }

  hide(): void {
    this.#line.hidden = this.#text.hidden = true;
  }
}
