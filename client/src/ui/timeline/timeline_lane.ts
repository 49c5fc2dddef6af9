// SPDX-License-Identifier: Apache-2.0
//
// Paints a camera's lane of the timeline: coverage, events and marks.
//
// Why so        Ten thousand events are more than a screen has pixels in a row. Bars that would fall into the pixel of
//               the one before are skipped, and those that touch are painted as one, so that dragging is smooth.

import { kindOf, overlapping, type EventKind, type Segment } from "../../playback/coverage";
import { isSameFootage, type Footage, type FootageKind, type FootageRef } from "../../wire/footage";
import type { LaneOutline } from "../../wire/recordings";
import type { TimeScale } from "./time_scale";
import type { Colours } from "./timeline_drawing";

type Span = readonly [startS: number, stopS: number];

/** What is drawn in a lane. */
export interface LaneContent {
  /** By start; of the kinds that are shown. */
  footage: readonly Footage[];
  segments: readonly Segment[];
  outline: LaneOutline | null;
}

export function chosenOf(outline: LaneOutline, kinds: ReadonlySet<EventKind>): LaneOutline {
  const only = <T>(kind: EventKind, all: readonly T[]) => (kinds.has(kind) ? all : []);
  const { continuous, alarm, alert, pos } = outline;
  return {
    continuous: only("continuous", continuous),
    alarm: only("alarm", alarm),
    alert: only("alert", alert),
    pos: only("pos", pos),
  };
}

/** Each has a contrast of at least 4.5 : 1 to the lanes, and differs from the one before. */
const kRecorded = "#7a8794";
const kContinuous = "#a3afbb";
const kSelected = "#e4eaf0";
/** What marks say stands above the bars. */
const kTextPx = 17;
/** Events of this width or more are drawn apart from their neighbours. */
const kMinSinglePx = 2;

export function paintLane(
  context: CanvasRenderingContext2D,
  scale: TimeScale,
  colours: Colours,
  lane: LaneContent,
  topPx: number,
  heightPx: number,
  selected: FootageRef | null,
): void {
  const barTop = topPx + kTextPx;
  const barPx = Math.round(heightPx * 0.42);
  if (lane.outline) paintOutline(context, scale, colours, lane.outline, topPx, barTop, barPx);
  paintBars(context, scale, lane.segments.map(({ startS, stopS }) => [startS, stopS]), barTop, barPx, kRecorded);
  const shown = overlapping(lane.footage, scale.startMs / 1000, scale.endMs / 1000);
  const [continuous, alarm, chosen]: [Span[], Span[], Span[]] = [[], [], []];
  const marks: Footage[] = [];
  for (const one of shown) {
    if (one.kind !== "event") marks.push(one);
    else (kindOf(one) === "continuous" ? continuous : alarm).push([one.start, one.stop]);
    if (isSameFootage(one, selected)) chosen.push([one.start, one.stop]);
  }
  paintBars(context, scale, continuous, barTop, barPx, kContinuous);
  paintBars(context, scale, chosen, barTop, barPx, kSelected);
  paintBars(context, scale, alarm, barTop, barPx, colours.accent);
  paintGrowing(context, scale, shown, barTop, barPx, colours);
  for (const mark of marks) paintMark(context, scale, mark, topPx, barTop, colours, isSameFootage(mark, selected));
  paintTexts(context, scale, marks, topPx, colours);
}

function paintOutline(
  context: CanvasRenderingContext2D,
  scale: TimeScale,
  colours: Colours,
  { continuous, alarm, alert, pos }: LaneOutline,
  topPx: number,
  barTop: number,
  barPx: number,
): void {
  paintBars(context, scale, continuous, barTop, barPx, kContinuous);
  paintBars(context, scale, alarm, barTop, barPx, colours.accent);
  for (const [kind, moments] of [["alert", alert], ["pos", pos]] as const) {
    context.fillStyle = kind === "alert" ? colours.accent : colours.text;
    for (const momentS of moments) {
      if (scale.contains(momentS * 1000)) paintSign(context, kind, Math.round(scale.xOf(momentS * 1000)), topPx, barTop);
    }
  }
}

function paintBars(
  context: CanvasRenderingContext2D,
  scale: TimeScale,
  spans: readonly Span[],
  topPx: number,
  heightPx: number,
  colour: string,
): void {
  context.fillStyle = colour;
  const run = { from: 0, to: -3 };
  const paint = () => run.to > run.from && context.fillRect(run.from, topPx, run.to - run.from, heightPx);
  for (const [startS, stopS] of spans) {
    const from = Math.max(-2, scale.xOf(startS * 1000));
    const to = Math.min(scale.widthPx + 2, scale.xOf(stopS * 1000));
    if (to < 0 || from > scale.widthPx || to <= run.to) continue;
    // A hairline between two recordings, where there is room for one.
    const gap = to - from >= kMinSinglePx ? Math.min(1, (to - from) / 4) : 0;
    const left = Math.max(from, run.to);
    const right = Math.max(to - gap, left + 1);
    if (left === run.to && gap === 0) {
      run.to = right;
      continue;
    }
    paint();
    Object.assign(run, { from: left, to: right });
  }
  paint();
}

/** What is still being recorded has an open end. */
function paintGrowing(
  context: CanvasRenderingContext2D,
  scale: TimeScale,
  events: readonly Footage[],
  topPx: number,
  heightPx: number,
  colours: Colours,
): void {
  for (const event of events.filter(({ isGrowing }) => isGrowing)) {
    context.fillStyle = colours.text;
    context.fillRect(Math.round(scale.xOf(event.stop * 1000)) - 1, topPx - 2, 2, heightPx + 4);
  }
}

/** An alert is a triangle in the accent colour, a POS transaction a square; both stand above their time. */
function paintMark(
  context: CanvasRenderingContext2D,
  scale: TimeScale,
  mark: Footage,
  topPx: number,
  barTop: number,
  colours: Colours,
  isSelected: boolean,
): void {
  const x = Math.round(scale.xOf(mark.moment * 1000));
  const [from, to] = [scale.xOf(mark.start * 1000), scale.xOf(mark.stop * 1000)];
  context.fillStyle = mark.kind === "alert" ? colours.accent : colours.text;
  context.fillRect(from, barTop - 3, Math.max(1, to - from), isSelected ? 3 : 1);
  paintSign(context, mark.kind, x, topPx, barTop);
}

function paintSign(context: CanvasRenderingContext2D, kind: FootageKind, x: number, topPx: number, barTop: number): void {
  context.beginPath();
  if (kind === "alert") {
    context.moveTo(x - 4, topPx + 1.5);
    context.lineTo(x + 4, topPx + 1.5);
    context.lineTo(x, barTop - 2);
  } else context.rect(x - 3, topPx + 2, 6, 6);
  context.fill();
}

function paintTexts(
  context: CanvasRenderingContext2D,
  scale: TimeScale,
  marks: readonly Footage[],
  topPx: number,
  colours: Colours,
): void {
  context.textBaseline = "top";
  context.fillStyle = colours.quiet;
  marks.forEach((mark, index) => {
    const x = scale.xOf(mark.moment * 1000) + 7;
    const nextX = marks[index + 1] ? scale.xOf(marks[index + 1]!.moment * 1000) - 6 : scale.widthPx;
    const text = fitting(context, mark.text.split("\n")[0]!, nextX - x);
    if (text) context.fillText(text, x, topPx + 1);
  });
}

function fitting(context: CanvasRenderingContext2D, text: string, roomPx: number): string {
  if (roomPx < 40) return "";
  const { width } = context.measureText(text);
  if (width <= roomPx) return text;
  const letters = Math.floor((text.length * roomPx) / width) - 1;
  return letters > 2 ? `${text.slice(0, letters)}…` : "";
}
