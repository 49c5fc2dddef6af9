// SPDX-License-Identifier: Apache-2.0
//
// The recordings of the cameras as lanes below a common axis: wheel, pinch and keys zoom, a drag pans, a click plays,
// and the playhead is dragged along the axis.

import { kindOf, type EventKind } from "../../playback/coverage";
import type { FootageCache } from "../../playback/footage_cache";
import type { FootageOutline } from "../../playback/footage_outline";
import { midnight } from "../../playback/recorded_days";
import { describe, type Footage, type FootageRef } from "../../wire/footage";
import { element } from "../widgets/dom";
import { OncePerFrame } from "../widgets/once_per_frame";
import { panZoomByWheel, PanZoomPointers, type PanZoomActions, type Point } from "../widgets/pan_zoom";
import { clockTime, duration, minuteText, shortDate } from "../widgets/text";
import { SpanHandles, type Span } from "./span_handles";
import { TimelineScrubber, type ScrubActions } from "./timeline_scrubber";
import { TimeScale } from "./time_scale";
import { coloursOf, kAxisPx, paintAxis, paintGrid, paintPlayhead, prepare, type Colours } from "./timeline_drawing";
import { chosenOf, paintLane, type LaneContent } from "./timeline_lane";
import { kHintStillPx, TimelineHint } from "./timeline_hint";

export interface Lane {
  camera: number;
  name: string;
}

export interface TimelineActions extends ScrubActions {
  /** A click: this time, on this camera. */
  seek(atMs: number, camera: number): void;
  /** A click on a mark. */
  open(footage: Footage): void;
  /** A click on a camera's name. */
  toggle(camera: number): void;
  /** Another span is shown. */
  moved(): void;
  /** A handle of the chosen span was moved. */
  choose(span: Span): void;
  /** The address of the picture that a recording has of a time. */
  stillAddress(footage: Footage, atMs: number, widthPx: number): string;
}

/** For longer spans an outline is fetched and drawn, instead of each event. */
const kMaxEventsSpanMs = 4 * 86_400_000;
const kMarkPx = 6;
const kKeyZoom = 1.6;
const kStartSpanMs = 6 * 3_600_000;
/** The part of the span that is kept free behind the playhead or the present. */
const kAhead = 0.12;
/** The part of the span that may be still to come. */
const kMaxAhead = 0.3;

export class Timeline {
  readonly root: HTMLElement;
  readonly #cache: FootageCache;
  readonly #outline: FootageOutline;
  readonly #actions: TimelineActions;
  readonly #axis = element("canvas", { class: "timeline-axis", "aria-hidden": "true" });
  readonly #canvas = element("canvas", {
    class: "timeline-lanes",
    tabindex: "0",
    role: "slider",
    // In seconds; screen readers say the text.
    "aria-valuemin": "0",
    "aria-valuemax": String(2 ** 32),
    "aria-valuenow": "0",
    "aria-valuetext": "nothing plays",
    "aria-label": "Timeline: arrow keys move the playhead, plus and minus zoom, page keys move, End goes to now",
  });
  readonly #names = element("div", { class: "timeline-names" });
  readonly #drawn = element("div", { class: "timeline-drawn" }, this.#canvas);
  readonly #hint: TimelineHint;
  readonly #scrubber: TimelineScrubber;
  readonly #handles = new SpanHandles(this.#drawn, (span) => this.#actions.choose(span));
  readonly #pointers: PanZoomPointers;
  readonly #resized = new ResizeObserver(() => this.#resize());
  readonly #drawing = new OncePerFrame(() => this.#draw());
  #colours: Colours | null = null;
  #scale = TimeScale.of(Date.now() - kStartSpanMs, Date.now() + kStartSpanMs * kAhead, 1000);
  #lanes: readonly Lane[] = [];
  #kinds: ReadonlySet<EventKind> = new Set();
  #playheadMs: number | null = null;
  #selected: FootageRef | null = null;

  constructor(cache: FootageCache, outline: FootageOutline, actions: TimelineActions) {
    this.#cache = cache;
    this.#outline = outline;
    this.#actions = actions;
    const scrolled = element("div", { class: "timeline-scroll" }, this.#names, this.#drawn);
    const head = element("div", { class: "timeline-head" }, element("div", { class: "timeline-corner" }), this.#axis);
    this.root = element("section", { class: "timeline", "aria-label": "Timeline" }, head, scrolled);
    this.#hint = new TimelineHint(this.#drawn, this.root);
    this.#resized.observe(this.#drawn);
    const scrub = (atMs: number) => {
      this.#hint.hide();
      actions.scrub(atMs);
    };
    const scrubbing = { scrub, release: actions.release };
    this.#scrubber = new TimelineScrubber(this.#axis, this.#canvas, () => this.#scale, () => this.#playheadMs, scrubbing);
    const panZoom: PanZoomActions = {
      pan: (px) => this.#show(this.#scale.panned(px)),
      zoom: (factor, { x }) => this.zoom(1 / factor, x),
    };
    panZoomByWheel(this.#axis, panZoom);
    panZoomByWheel(this.#canvas, panZoom);
    this.#pointers = new PanZoomPointers(this.#canvas, panZoom, "x");
    this.#canvas.addEventListener("click", (event) => this.#click(event));
    this.#canvas.addEventListener("pointerdown", () => this.#hint.hide());
    this.#canvas.addEventListener("pointermove", (event) => {
      if (this.#pointers.isPressed || event.pointerType === "touch") return;
      this.#showHint({ x: event.offsetX, y: event.offsetY });
    });
    this.#canvas.addEventListener("pointerleave", () => this.#hint.hide());
    this.#canvas.addEventListener("keydown", (event) => this.#pressKey(event));
  }

  get scale(): TimeScale {
    return this.#scale;
  }

  /** Whether each event is known, or only an outline. */
  get showsEvents(): boolean {
    return this.#scale.spanMs <= kMaxEventsSpanMs;
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

  /** Moves the playhead. When it leaves the span during playback, the timeline follows. */
  setPlayhead(atMs: number | null, selected: FootageRef | null, isPlaying: boolean): void {
    const was = this.#playheadMs;
    this.#selected = selected;
    this.#playheadMs = atMs;
    if (atMs === null) return this.redraw();
    const isLeaving = was !== null && this.#scale.contains(was) && !this.#scale.contains(atMs);
    if (isPlaying && isLeaving && !this.#pointers.isPressed && !this.#scrubber.isScrubbing) this.reveal(atMs);
    this.#canvas.setAttribute("aria-valuenow", String(Math.round(atMs / 1000)));
    this.#canvas.setAttribute("aria-valuetext", `${shortDate(atMs)} ${clockTime(atMs)}`);
    this.redraw();
  }

  /** Shows handles at the ends of the span, null for none. */
  chooseSpan(span: Span | null): void {
    this.#handles.show(span);
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

  /** A factor above 1 shows more time. */
  zoom(factor: number, atPx = this.#zoomCentre()): void {
    this.#show(this.#scale.zoomed(factor, atPx));
  }

  redraw(): void {
    this.#drawing.request();
  }

  close(): void {
    this.#resized.disconnect();
    this.#drawing.cancel();
  }

  #zoomCentre(): number {
    const x = this.#playheadMs === null ? NaN : this.#scale.xOf(this.#playheadMs);
    return x >= 0 && x <= this.#scale.widthPx ? x : this.#scale.widthPx / 2;
  }

  #show(scale: TimeScale): void {
    // The future is empty.
    const beyondMs = scale.endMs - (Date.now() + scale.spanMs * kMaxAhead);
    this.#scale = beyondMs > 0 ? scale.panned(beyondMs / scale.msPerPx) : scale;
    this.#actions.moved();
    this.redraw();
  }

  #resize(): void {
    const widthPx = this.#drawn.clientWidth;
    if (widthPx === 0) return;
    this.root.style.setProperty("--lanes", String(Math.max(1, this.#lanes.length)));
    const { startMs, endMs } = this.#scale;
    // The newest stays in place: the right end does. What was shown before there was a width stays whole.
    const isFirst = this.#colours === null;
    this.#scale = isFirst ? TimeScale.of(startMs, endMs, widthPx) : this.#scale.resized(widthPx);
    this.#colours = coloursOf(this.root);
    this.#actions.moved();
    this.redraw();
  }

  #draw(): void {
    const colours = this.#colours;
    if (!colours) return;
    const scale = this.#scale;
    this.#handles.draw(scale);
    const heightPx = this.#canvas.clientHeight;
    const lanePx = heightPx / Math.max(1, this.#lanes.length);
    const font = `${getComputedStyle(this.#names).fontSize} ${getComputedStyle(this.root).fontFamily}`;
    const axis = prepare(this.#axis, scale.widthPx, kAxisPx);
    const context = prepare(this.#canvas, scale.widthPx, heightPx);
    paintAxis(axis, scale, colours, font);
    paintGrid(context, scale, colours, heightPx, Date.now());
    context.font = font;
    this.#lanes.forEach(({ camera }, index) => {
      paintLane(context, scale, colours, this.#contentOf(camera), index * lanePx, lanePx, this.#selected);
    });
    // What was recorded there may have been fetched just now.
    if (this.#hint.withoutStill) this.#showHint(this.#hint.withoutStill);
    if (this.#playheadMs === null) return;
    const x = scale.xOf(this.#playheadMs);
    paintPlayhead(context, x, heightPx, colours);
    paintPlayhead(axis, x, kAxisPx, colours);
  }

  /** Events, or the outline; both while the right one is being fetched, so that what is known stays in sight. */
  #contentOf(camera: number): LaneContent {
    const { startMs, endMs } = this.#scale;
    const lane = !this.showsEvents || this.#cache.requests.isBusy ? this.#outline.get(camera) : null;
    const outline = lane && chosenOf(lane, this.#kinds);
    if (!this.showsEvents && this.#outline.covers(camera, startMs, endMs)) return { footage: [], segments: [], outline };
    const { footage, segments } = this.#cache.get(camera, startMs / 1000, endMs / 1000);
    return { segments, footage: footage.filter((one) => this.#kinds.has(kindOf(one))), outline };
  }

  #click(event: MouseEvent): void {
    const camera = this.#laneAt(event.offsetY);
    if (camera === undefined || this.#pointers.hasMoved || this.#scrubber.hasMoved) return;
    const { mark } = this.#footageAt(camera, event.offsetX);
    if (mark) this.#actions.open(mark);
    else this.#actions.seek(this.#scale.msAt(event.offsetX), camera);
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

  #showHint(point: Point): void {
    const { x, y } = point;
    const camera = this.#laneAt(y);
    if (camera === undefined) return this.#hint.hide();
    const atMs = this.#scale.msAt(x);
    const { event, mark } = this.#footageAt(camera, x);
    const about = mark ? describe(mark) : event ? `${duration(event.stop - event.start)} recorded` : "";
    const still = event?.isSaved ? this.#actions.stillAddress(event, atMs, kHintStillPx) : "";
    this.#hint.show(point, `${this.showsEvents ? clockTime(atMs) : minuteText(atMs)}${about ? `\n${about}` : ""}`, still);
  }

  #pressKey(event: KeyboardEvent): void {
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
