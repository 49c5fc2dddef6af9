// SPDX-License-Identifier: Apache-2.0
//
// The cameras' past as lanes below a common axis: wheel, pinch and keys zoom, a drag moves, a click plays, and the
// playhead is dragged along the axis.

import type { EventKind } from "../../playback/coverage";
import { kindOf } from "../../playback/coverage";
import { midnight, type RecordedDays } from "../../playback/recorded_days";
import type { FootageCache } from "../../playback/footage_cache";
import type { Footage, FootageRef } from "../../wire/recordings";
import { element, setText } from "../widgets/dom";
import { clockTime, duration, shortDate } from "../widgets/text";
import { TimeScale } from "./time_scale";
import { coloursOf, kAxisPx, paintAxis, paintGrid, paintLane, paintPlayhead, prepare, type Colours } from "./timeline_drawing";

export interface Lane {
  camera: number;
  name: string;
}

export interface TimelineActions {
  /** A click: this time, on this camera. */
  seek(atMs: number, camera: number): void;
  /** A click on a mark. */
  open(footage: Footage): void;
  /** The playhead is dragged. */
  scrub(atMs: number): void;
  /** A click on a camera's name. */
  toggle(camera: number): void;
  /** Another span is shown. */
  moved(): void;
}

/** Wider than this, single events are neither fetched nor drawn, but the days that have any. */
const kWidestEventsMs = 4 * 86_400_000;
const kClickPx = 5;
const kMarkPx = 6;
const kWheelZoom = 1.0015;
const kKeyZoom = 1.6;
const kStartSpanMs = 6 * 3_600_000;
/** Of the span, kept free behind the playhead or the present. */
const kAhead = 0.12;
/** Of the span, how much may be still to come. */
const kMostAhead = 0.3;

export class Timeline {
  readonly root: HTMLElement;
  readonly #history: FootageCache;
  readonly #days: RecordedDays;
  readonly #actions: TimelineActions;
  readonly #axis = element("canvas", { class: "timeline-axis", "aria-hidden": "true" });
  readonly #canvas = element("canvas", {
    class: "timeline-lanes",
    tabindex: "0",
    role: "slider",
    "aria-label": "Timeline: plus and minus zoom, page keys move, End goes to now",
  });
  readonly #names = element("div", { class: "timeline-names" });
  readonly #hint = element("div", { class: "timeline-hint", hidden: true });
  readonly #line = element("div", { class: "timeline-pointer", hidden: true });
  readonly #resized = new ResizeObserver(() => this.#resize());
  readonly #pointers = new Map<number, { x: number; y: number }>();
  #colours: Colours | null = null;
  #scale = TimeScale.of(Date.now() - kStartSpanMs, Date.now() + kStartSpanMs * kAhead, 1000);
  #lanes: readonly Lane[] = [];
  #kinds: ReadonlySet<EventKind> = new Set();
  #playheadMs: number | null = null;
  #selected: FootageRef | null = null;
  #frame = 0;
  #dragged = 0;
  #isScrubbing = false;

  constructor(history: FootageCache, days: RecordedDays, actions: TimelineActions) {
    this.#history = history;
    this.#days = days;
    this.#actions = actions;
    const drawn = element("div", { class: "timeline-drawn" }, this.#canvas, this.#line, this.#hint);
    const scrolled = element("div", { class: "timeline-scroll" }, this.#names, drawn);
    const head = element("div", { class: "timeline-head" }, element("div", { class: "timeline-corner" }), this.#axis);
    this.root = element("section", { class: "timeline", "aria-label": "Timeline" }, head, scrolled);
    this.#resized.observe(drawn);
    for (const canvas of [this.#canvas, this.#axis]) {
      canvas.addEventListener("wheel", (event) => this.#wheel(event), { passive: false });
      canvas.addEventListener("pointerdown", (event) => this.#press(event));
      canvas.addEventListener("pointermove", (event) => this.#move(event));
      canvas.addEventListener("pointerup", (event) => this.#release(event));
      canvas.addEventListener("pointercancel", (event) => this.#forget(event));
    }
    this.#canvas.addEventListener("pointerleave", () => this.#showHint(null));
    this.#canvas.addEventListener("keydown", (event) => this.#key(event));
  }

  get scale(): TimeScale {
    return this.#scale;
  }

  /** Whether single events are shown. */
  get isFine(): boolean {
    return this.#scale.spanMs <= kWidestEventsMs;
  }

  setLanes(lanes: readonly Lane[], onStage: readonly number[]): void {
    this.#lanes = lanes;
    this.#names.replaceChildren(
      ...lanes.map(({ camera, name }) => {
        const pressed = String(onStage.includes(camera));
        const button = element("button", { type: "button", class: "lane-name", title: name, "aria-pressed": pressed }, name);
        button.addEventListener("click", () => this.#actions.toggle(camera));
        return button;
      }),
    );
    this.#resize();
  }

  setKinds(kinds: ReadonlySet<EventKind>): void {
    this.#kinds = kinds;
    this.redraw();
  }

  /** The playhead moves; while it plays, the timeline turns the page when the playhead leaves it. */
  setPlayhead(atMs: number | null, selected: FootageRef | null, isPlaying: boolean): void {
    const was = this.#playheadMs;
    this.#selected = selected;
    this.#playheadMs = atMs;
    if (atMs === null) return this.redraw();
    const isLeaving = was !== null && this.#scale.contains(was) && !this.#scale.contains(atMs);
    if (isPlaying && isLeaving && this.#pointers.size === 0) this.reveal(atMs);
    this.#canvas.setAttribute("aria-valuenow", String(Math.round(atMs / 1000)));
    this.#canvas.setAttribute("aria-valuetext", `${shortDate(atMs)} ${clockTime(atMs)}`);
    this.redraw();
  }

  /** Moves so far that the time is in view. */
  reveal(atMs: number): void {
    if (this.#scale.contains(atMs)) return;
    this.#show(this.#scale.panned((this.#scale.startMs - atMs) / this.#scale.msPerPx + this.#scale.widthPx * kAhead));
  }

  /** Shows the local day. */
  showDay(dayMs: number): void {
    this.#show(TimeScale.of(dayMs, midnight(dayMs, 1), this.#scale.widthPx));
  }

  showNow(): void {
    const endMs = Date.now() + this.#scale.spanMs * kAhead;
    this.#show(this.#scale.panned((this.#scale.endMs - endMs) / this.#scale.msPerPx));
  }

  zoom(factor: number, px = this.#zoomCentre()): void {
    this.#show(this.#scale.zoomed(factor, px));
  }

  redraw(): void {
    this.#frame ||= requestAnimationFrame(() => {
      this.#frame = 0;
      this.#draw();
    });
  }

  close(): void {
    this.#resized.disconnect();
    cancelAnimationFrame(this.#frame);
  }

  #zoomCentre(): number {
    const x = this.#playheadMs === null ? NaN : this.#scale.xOf(this.#playheadMs);
    return x >= 0 && x <= this.#scale.widthPx ? x : this.#scale.widthPx / 2;
  }

  #show(scale: TimeScale): void {
    // Of the future there is nothing to see.
    const beyondMs = scale.endMs - (Date.now() + scale.spanMs * kMostAhead);
    this.#scale = beyondMs > 0 ? scale.panned(beyondMs / scale.msPerPx) : scale;
    this.#actions.moved();
    this.redraw();
  }

  #resize(): void {
    const widthPx = this.#canvas.parentElement!.clientWidth;
    if (widthPx === 0) return;
    this.root.style.setProperty("--lanes", String(Math.max(1, this.#lanes.length)));
    // The newest stays in place: the right end does.
    this.#scale = new TimeScale(this.#scale.endMs - widthPx * this.#scale.msPerPx, this.#scale.msPerPx, widthPx);
    this.#colours = coloursOf(this.root);
    this.#actions.moved();
    this.redraw();
  }

  #draw(): void {
    const colours = this.#colours;
    if (!colours) return;
    const scale = this.#scale;
    const heightPx = this.#canvas.clientHeight;
    const lanePx = heightPx / Math.max(1, this.#lanes.length);
    const font = `${getComputedStyle(this.#names).fontSize} ${getComputedStyle(this.root).fontFamily}`;
    const axis = prepare(this.#axis, scale.widthPx, kAxisPx);
    const context = prepare(this.#canvas, scale.widthPx, heightPx);
    paintAxis(axis, scale, colours, font);
    paintGrid(context, scale, colours, heightPx, Date.now());
    context.font = font;
    this.#lanes.forEach(({ camera }, index) => {
      const content = {
        ...this.#contentOf(camera),
        hasDay: this.isFine ? null : (day: number) => this.#days.has(camera, day),
      };
      paintLane(context, scale, colours, content, index * lanePx, lanePx, this.#selected);
    });
    if (this.#playheadMs === null) return;
    const x = scale.xOf(this.#playheadMs);
    paintPlayhead(context, x, heightPx, colours);
    paintPlayhead(axis, x, kAxisPx, colours);
  }

  #contentOf(camera: number) {
    if (!this.isFine) return { footage: [], segments: [] };
    const { footage, segments } = this.#history.of(camera, this.#scale.startMs / 1000, this.#scale.endMs / 1000);
    return { segments, footage: footage.filter((one) => this.#kinds.has(kindOf(one))) };
  }

  #wheel(event: WheelEvent): void {
    event.preventDefault();
    const lines = event.deltaMode === WheelEvent.DOM_DELTA_LINE ? 16 : 1;
    const [x, y] = [event.deltaX * lines, event.deltaY * lines];
    if (event.shiftKey || Math.abs(x) > Math.abs(y)) this.#show(this.#scale.panned(-(x || y)));
    // A trackpad's pinch comes as a wheel with Ctrl, in smaller steps.
    else this.zoom(kWheelZoom ** (event.ctrlKey ? y * 6 : y), event.offsetX);
  }

  #press(event: PointerEvent): void {
    if (event.button > 0) return;
    (event.target as Element).setPointerCapture(event.pointerId);
    this.#pointers.set(event.pointerId, { x: event.offsetX, y: event.offsetY });
    if (this.#pointers.size === 1) this.#dragged = 0;
    this.#isScrubbing = event.target === this.#axis;
    if (this.#isScrubbing) this.#actions.scrub(this.#scale.msAt(event.offsetX));
    this.#showHint(null);
  }

  #move(event: PointerEvent): void {
    const before = this.#pointers.get(event.pointerId);
    if (!before) return this.#showHint(event.target === this.#canvas ? event : null);
    const now = { x: event.offsetX, y: event.offsetY };
    this.#pointers.set(event.pointerId, now);
    this.#dragged += Math.abs(now.x - before.x) + Math.abs(now.y - before.y);
    if (this.#isScrubbing) return this.#actions.scrub(this.#scale.msAt(now.x));
    const other = [...this.#pointers].find(([id]) => id !== event.pointerId)?.[1];
    if (other) {
      const [wasApart, isApart] = [Math.abs(before.x - other.x), Math.abs(now.x - other.x)];
      if (wasApart > 10 && isApart > 10) this.zoom(wasApart / isApart, (now.x + other.x) / 2);
    } else if (this.#dragged > kClickPx) this.#show(this.#scale.panned(now.x - before.x));
  }

  #release(event: PointerEvent): void {
    const wasClick = this.#pointers.size === 1 && this.#dragged <= kClickPx && !this.#isScrubbing;
    this.#forget(event);
    if (!wasClick) return;
    const camera = this.#laneAt(event.offsetY);
    if (camera === undefined) return;
    const mark = this.#footageAt(camera, event.offsetX).mark;
    if (mark) this.#actions.open(mark);
    else this.#actions.seek(this.#scale.msAt(event.offsetX), camera);
  }

  #forget(event: PointerEvent): void {
    this.#pointers.delete(event.pointerId);
    if (this.#pointers.size === 0) this.#isScrubbing = false;
  }

  #laneAt(y: number): number | undefined {
    return this.#lanes[Math.floor((y / this.#canvas.clientHeight) * this.#lanes.length)]?.camera;
  }

  #footageAt(camera: number, x: number): { event: Footage | undefined; mark: Footage | undefined } {
    const shown = this.#contentOf(camera).footage;
    const [from, to, at] = [x - kMarkPx, x + kMarkPx, x].map((px) => this.#scale.msAt(px) / 1000) as [number, number, number];
    return {
      mark: shown.findLast(({ kind, moment }) => kind !== "event" && moment >= from && moment <= to),
      event: shown.findLast(({ kind, start, stop }) => kind === "event" && start <= at && stop > at),
    };
  }

  #showHint(event: PointerEvent | null): void {
    const camera = event ? this.#laneAt(event.offsetY) : undefined;
    this.#hint.hidden = this.#line.hidden = !event || camera === undefined || event.pointerType === "touch";
    if (!event || camera === undefined) return;
    const atMs = this.#scale.msAt(event.offsetX);
    const { event: recording, mark } = this.#footageAt(camera, event.offsetX);
    const about = mark ? mark.text : recording ? `${duration(recording.stop - recording.start)} recorded` : "";
    setText(this.#hint, `${this.isFine ? clockTime(atMs) : shortDate(atMs)}${about ? `\n${about}` : ""}`);
    this.root.style.setProperty("--pointer", `${event.offsetX}px`);
    this.#hint.classList.toggle("at-right", event.offsetX > this.#scale.widthPx - 240);
    this.root.style.setProperty("--pointer-y", `${event.offsetY}px`);
  }

  #key(event: KeyboardEvent): void {
    if (event.altKey || event.ctrlKey || event.metaKey) return;
    if (event.key === "+" || event.key === "=") this.zoom(1 / kKeyZoom);
    else if (event.key === "-") this.zoom(kKeyZoom);
    else if (event.key === "PageUp") this.#show(this.#scale.panned(this.#scale.widthPx / 2));
    else if (event.key === "PageDown") this.#show(this.#scale.panned(-this.#scale.widthPx / 2));
    else if (event.key === "Home") this.showDay(midnight(this.#playheadMs ?? this.#scale.startMs));
    else if (event.key === "End") this.showNow();
    else return;
    event.preventDefault();
    event.stopPropagation();
  }
}
