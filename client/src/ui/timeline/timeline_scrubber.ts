// SPDX-License-Identifier: Apache-2.0
//
// Drags the playhead: along the axis, by its line through the lanes, or with the arrow keys. Letting go ends it.

import { hasFocusByPointer } from "../widgets/key_owner";
import type { TimeScale } from "./time_scale";

export interface ScrubActions {
  /** The playhead is dragged. */
  scrub(atMs: number): void;
  /** It is let go. */
  release(atMs: number): void;
}

/** How near the line of the playhead a pointer takes hold of it. */
const kGrabPx = 6;
const kTouchGrabPx = 22;
/** A pointer that moved less than this has clicked. */
const kClickPx = 5;
/** What a key moves it by; with Shift ten times as much. */
const kKeyPx = 4;

export class TimelineScrubber {
  readonly #scale: () => TimeScale;
  readonly #playheadMs: () => number | null;
  readonly #actions: ScrubActions;
  #atMs: number | null = null;
  #hasMoved = false;

  /** Make it before others listen to the lanes: a pointer that takes hold of the playhead is not for them. */
  constructor(
    axis: HTMLElement,
    lanes: HTMLElement,
    scale: () => TimeScale,
    playheadMs: () => number | null,
    actions: ScrubActions,
  ) {
    this.#scale = scale;
    this.#playheadMs = playheadMs;
    this.#actions = actions;
    this.#listen(axis, () => true);
    this.#listen(lanes, (event) => this.#isOnPlayhead(event));
    lanes.addEventListener("keydown", (event) => this.#pressKey(event));
    lanes.addEventListener("keyup", (event) => event.key.startsWith("Arrow") && this.#release());
    lanes.addEventListener("blur", () => this.#release());
  }

  get isScrubbing(): boolean {
    return this.#atMs !== null;
  }

  /** Whether the pointer that was released last has dragged the playhead, so that its click is ignored. */
  get hasMoved(): boolean {
    return this.#hasMoved;
  }

  #listen(target: HTMLElement, mayBegin: (event: PointerEvent) => boolean): void {
    let pressedPx: number | null = null;
    target.addEventListener("pointerdown", (event) => {
      this.#hasMoved = false;
      if (event.button !== 0 || !event.isPrimary || !mayBegin(event)) return;
      event.stopImmediatePropagation();
      target.setPointerCapture(event.pointerId);
      pressedPx = event.offsetX;
      // The axis is for nothing else; on a lane a click has a meaning of its own.
      if (target.tabIndex < 0) this.#scrub(event.offsetX);
    });
    target.addEventListener("pointermove", (event) => {
      if (pressedPx === null) return;
      event.stopImmediatePropagation();
      this.#hasMoved ||= Math.abs(event.offsetX - pressedPx) >= kClickPx;
      if (this.#hasMoved || this.isScrubbing) this.#scrub(event.offsetX);
    });
    target.addEventListener("lostpointercapture", () => {
      if (pressedPx === null) return;
      pressedPx = null;
      this.#release();
    });
  }

  #isOnPlayhead({ offsetX, pointerType }: PointerEvent): boolean {
    const playheadMs = this.#playheadMs();
    const grabPx = pointerType === "touch" ? kTouchGrabPx : kGrabPx;
    return playheadMs !== null && Math.abs(this.#scale().xOf(playheadMs) - offsetX) <= grabPx;
  }

  #pressKey(event: KeyboardEvent): void {
    const by = event.key === "ArrowLeft" ? -1 : event.key === "ArrowRight" ? 1 : 0;
    const fromMs = this.#atMs ?? this.#playheadMs();
    if (by === 0 || fromMs === null || hasFocusByPointer() || event.altKey || event.ctrlKey || event.metaKey) return;
    event.preventDefault();
    event.stopPropagation();
    this.#to(fromMs + by * kKeyPx * (event.shiftKey ? 10 : 1) * this.#scale().msPerPx);
  }

  #scrub(px: number): void {
    this.#to(this.#scale().msAt(px));
  }

  /** There is nothing to see of the future. */
  #to(atMs: number): void {
    this.#atMs = Math.min(atMs, Date.now());
    this.#actions.scrub(this.#atMs);
  }

  #release(): void {
    const atMs = this.#atMs;
    this.#atMs = null;
    if (atMs !== null) this.#actions.release(atMs);
  }
}
