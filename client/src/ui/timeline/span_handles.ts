// SPDX-License-Identifier: Apache-2.0
//
// The chosen span on the timeline, with a handle at either end: dragged, or moved by a second with the arrow keys, with
// Shift by a minute.

import { element } from "../widgets/dom";
import { clockTime, shortDate } from "../widgets/text";
import type { TimeScale } from "./time_scale";

export interface Span {
  fromMs: number;
  toMs: number;
}

const kMinSpanMs = 1_000;
const kSecondMs = 1_000;
const kMinuteMs = 60_000;

export class SpanHandles {
  readonly #root = element("div", { class: "timeline-span", hidden: true });
  readonly #handles: Record<keyof Span, HTMLElement> = { fromMs: this.#handle("fromMs", "Begin"), toMs: this.#handle("toMs", "End") };
  readonly #moved: (span: Span) => void;
  #span: Span | null = null;
  #scale: TimeScale | null = null;

  /** `moved` is called when the user moves a handle. */
  constructor(place: HTMLElement, moved: (span: Span) => void) {
    this.#moved = moved;
    place.append(this.#root);
    this.#root.append(this.#handles.fromMs, this.#handles.toMs);
  }

  show(span: Span | null): void {
    this.#span = span;
    this.#draw();
  }

  draw(scale: TimeScale): void {
    this.#scale = scale;
    this.#draw();
  }

  #draw(): void {
    this.#root.hidden = !this.#span || !this.#scale;
    if (!this.#span || !this.#scale) return;
    this.#root.style.setProperty("--from", `${this.#scale.xOf(this.#span.fromMs)}px`);
    this.#root.style.setProperty("--to", `${this.#scale.xOf(this.#span.toMs)}px`);
    for (const end of ["fromMs", "toMs"] as const) {
      this.#handles[end].setAttribute("aria-valuenow", String(Math.round(this.#span[end] / kSecondMs)));
      this.#handles[end].setAttribute("aria-valuetext", `${shortDate(this.#span[end])} ${clockTime(this.#span[end])}`);
    }
  }

  #handle(end: keyof Span, label: string): HTMLElement {
    const bounds = { "aria-valuemin": "0", "aria-valuemax": String(2 ** 32) };
    const handle = element("div", { class: "span-handle", role: "slider", tabindex: "0", "aria-label": `${label} of the span`, "data-end": end, ...bounds });
    handle.addEventListener("pointerdown", (event) => {
      if (event.button === 0) handle.setPointerCapture(event.pointerId);
    });
    handle.addEventListener("pointermove", (event) => {
      if (!handle.hasPointerCapture(event.pointerId) || !this.#scale) return;
      this.#move(end, this.#scale.msAt(event.clientX - this.#root.parentElement!.getBoundingClientRect().left));
    });
    handle.addEventListener("keydown", (event) => {
      const by = event.key === "ArrowLeft" ? -1 : event.key === "ArrowRight" ? 1 : 0;
      if (by === 0 || !this.#span) return;
      event.preventDefault();
      event.stopPropagation();
      this.#move(end, this.#span[end] + by * (event.shiftKey ? kMinuteMs : kSecondMs));
    });
    return handle;
  }

  #move(end: keyof Span, atMs: number): void {
    if (!this.#span) return;
    const { fromMs, toMs } = this.#span;
    const whole = Math.round(atMs / kSecondMs) * kSecondMs;
    this.#span =
      end === "fromMs" ? { fromMs: Math.min(whole, toMs - kMinSpanMs), toMs } : { fromMs, toMs: Math.max(whole, fromMs + kMinSpanMs) };
    this.#draw();
    this.#moved(this.#span);
  }
}
