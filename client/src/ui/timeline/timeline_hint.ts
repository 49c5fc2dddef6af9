// SPDX-License-Identifier: Apache-2.0
//
// What lies under the pointer on the timeline: a line through all lanes, and beside it the time, what happened then,
// and a picture of it once the pointer rests.

import { StillLoader } from "../../playback/still_loader";
import { element, setText } from "../widgets/dom";
import type { Point } from "../widgets/pan_zoom";

const kMaxWidthPx = 260;
/** On a screen with two pixels to each of the page's. */
export const kHintStillPx = 320;

export class TimelineHint {
  readonly #line = element("div", { class: "timeline-pointer", hidden: true });
  readonly #text = element("p");
  readonly #hint = element("div", { class: "timeline-hint", hidden: true }, this.#text);
  readonly #stills = new StillLoader();
  readonly #box: HTMLElement;
  #still: HTMLImageElement | null = null;
  #address = "";
  #shownAt: Point | null = null;

  /** Adds the line to `box`, and what it says to `around`, which may be larger. */
  constructor(box: HTMLElement, around: HTMLElement) {
    this.#box = box;
    box.append(this.#line);
    around.append(this.#hint);
  }

  /** Where it is shown and has no picture; null otherwise. */
  get withoutStill(): Point | null {
    return this.#still ? null : this.#shownAt;
  }

  /** `still` is the address of the picture; empty where there is none. */
  show(point: Point, text: string, still: string): void {
    const { x } = point;
    this.#shownAt = point;
    this.#line.hidden = this.#hint.hidden = false;
    setText(this.#text, text);
    this.#hint.classList.toggle("at-right", x > this.#box.clientWidth - kMaxWidthPx);
    for (const each of [this.#box, this.#hint]) each.style.setProperty("--pointer", `${x}px`);
    this.#showStill(still);
  }

  hide(): void {
    this.#shownAt = null;
    this.#line.hidden = this.#hint.hidden = true;
    this.#showStill("");
  }

  #showStill(address: string): void {
    if (address === this.#address) return;
    this.#address = address;
    if (this.#still) this.#stills.drop(this.#still);
    this.#still?.remove();
    this.#still = address ? element("img", { alt: "" }) : null;
    if (!this.#still) return;
    this.#hint.prepend(this.#still);
    this.#stills.load(this.#still, address);
  }
}
