// SPDX-License-Identifier: Apache-2.0
//
// Paints the timeline: the axis, and for each camera a lane of coverage, events and marks.
//
// Why so        Ten thousand events are more than a screen has pixels in a row. Bars that would fall into the pixel of
//               the one before are skipped, and each colour is filled once, so that dragging is smooth.

import { kindOf, overlapping, type EventKind, type Segment } from "../../playback/coverage";
import { midnights } from "../../playback/recorded_days";
import type { Footage, FootageRef } from "../../wire/footage";
import type { TimeScale } from "./time_scale";

export const kAxisPx = 26;

/** What is drawn in a lane. */
export interface LaneContent {
  /** By start; of the kinds that are shown. */
  footage: readonly Footage[];
  segments: readonly Segment[];
  /** Whether a day has recordings, where the zoom is too wide for more; undefined while unknown. */
  hasDay: ((dayMs: number) => boolean | undefined) | null;
}

export interface Colours {
  page: string;
  surface: string;
  line: string;
  text: string;
  quiet: string;
  faint: string;
  accent: string;
}

export function coloursOf(root: Element): Colours {
  const style = getComputedStyle(root);
  const names = ["page", "surface", "line", "text", "quiet", "faint", "accent"] as const;
  return Object.fromEntries(names.map((name) => [name, style.getPropertyValue(`--${name}`).trim()])) as unknown as Colours;
}

/** Each at least 3 : 1 on the page, and told from the one before. */
const kRecorded = "#5a6672";
const kContinuous = "#7b8896";
const kSelected = "#c3ced8";

/** Makes the canvas as large as it is shown, in the screen's own pixels; what is drawn is in CSS pixels. */
export function prepare(canvas: HTMLCanvasElement, widthPx: number, heightPx: number): CanvasRenderingContext2D {
  const ratio = devicePixelRatio;
  const [width, height] = [Math.round(widthPx * ratio), Math.round(heightPx * ratio)];
  if (canvas.width !== width) canvas.width = width;
  if (canvas.height !== height) canvas.height = height;
  const context = canvas.getContext("2d")!;
  context.setTransform(ratio, 0, 0, ratio, 0, 0);
  context.clearRect(0, 0, widthPx, heightPx);
  return context;
}

export function paintAxis(context: CanvasRenderingContext2D, scale: TimeScale, colours: Colours, font: string): void {
  context.font = font;
  context.textBaseline = "middle";
  for (const { atMs, label, isDay } of scale.ticks()) {
    const x = Math.round(scale.xOf(atMs));
    context.fillStyle = isDay ? colours.faint : colours.line;
    context.fillRect(x, isDay ? 4 : kAxisPx - 7, 1, kAxisPx);
    context.fillStyle = isDay ? colours.text : colours.quiet;
    context.fillText(label, x + 5, kAxisPx / 2);
  }
}

/** Lines through all lanes: days and hours, the present and what is still to come. */
export function paintGrid(
  context: CanvasRenderingContext2D,
  scale: TimeScale,
  colours: Colours,
  heightPx: number,
  nowMs: number,
): void {
  for (const { atMs, isDay } of scale.ticks()) {
    context.fillStyle = isDay ? "#2c3238" : "#191d21";
    context.fillRect(Math.round(scale.xOf(atMs)), 0, 1, heightPx);
  }
  const nowX = Math.round(scale.xOf(nowMs));
  if (nowX >= scale.widthPx) return;
  context.fillStyle = "rgb(0 0 0 / 35%)";
  context.fillRect(Math.max(0, nowX), 0, scale.widthPx, heightPx);
  context.fillStyle = colours.quiet;
  for (let y = 0; y < heightPx; y += 6) context.fillRect(nowX, y, 1, 3);
}

export function paintLane(
  context: CanvasRenderingContext2D,
  scale: TimeScale,
  colours: Colours,
  lane: LaneContent,
  topPx: number,
  heightPx: number,
  selected: FootageRef | null,
): void {
  const barTop = topPx + Math.round(heightPx * 0.3);
  const barPx = Math.round(heightPx * 0.42);
  if (lane.hasDay) return paintDays(context, scale, lane.hasDay, barTop, barPx);
  const strip = (segment: Segment) => [segment.startS, segment.stopS] as const;
  paintBars(context, scale, lane.segments.map(strip), barTop, barPx, kRecorded);
  const shown = overlapping(lane.footage, scale.startMs / 1000, scale.endMs / 1000);
  const marks = shown.filter(({ kind }) => kind !== "event");
  const bars = (kind: EventKind) => shown.filter((one) => kindOf(one) === kind).map((one) => [one.start, one.stop] as const);
  paintBars(context, scale, bars("continuous"), barTop, barPx, kContinuous);
  const chosen = shown.find((one) => one.kind === selected?.kind && one.id === selected.id);
  if (chosen) paintBars(context, scale, [[chosen.start, chosen.stop]], barTop, barPx, kSelected);
  paintBars(context, scale, bars("alarm"), barTop, barPx, colours.accent);
  paintGrowing(context, scale, shown, barTop, barPx, colours);
  for (const mark of marks) paintMark(context, scale, mark, topPx, barTop, colours, mark.id === selected?.id);
  paintTexts(context, scale, marks, topPx, colours);
}

function paintBars(
  context: CanvasRenderingContext2D,
  scale: TimeScale,
  spans: readonly (readonly [startS: number, stopS: number])[],
  topPx: number,
  heightPx: number,
  colour: string,
): void {
  context.fillStyle = colour;
  context.beginPath();
  let paintedPx = -1;
  for (const [startS, stopS] of spans) {
    const from = Math.max(-2, scale.xOf(startS * 1000));
    const to = Math.min(scale.widthPx + 2, scale.xOf(stopS * 1000));
    if (to < 0 || from > scale.widthPx || to <= paintedPx) continue;
    // A hairline between two recordings, where there is room for one.
    const gap = to - from > 6 ? 1 : 0;
    const left = Math.max(from, paintedPx);
    const right = Math.max(to - gap, left + 1);
    context.rect(left, topPx, right - left, heightPx);
    paintedPx = right + gap;
  }
  context.fill();
}

function paintDays(
  context: CanvasRenderingContext2D,
  scale: TimeScale,
  hasDay: (dayMs: number) => boolean | undefined,
  topPx: number,
  heightPx: number,
): void {
  const days = midnights(scale.startMs, Math.min(scale.endMs, Date.now()));
  const spans = days.flatMap((day, index) => {
    const end = days[index + 1] ?? day + 86_400_000;
    return hasDay(day) ? [[day / 1000, Math.min(end, Date.now()) / 1000] as const] : [];
  });
  paintBars(context, scale, spans, topPx, heightPx, kContinuous);
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
  context.beginPath();
  if (mark.kind === "alert") {
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
    if (text) context.fillText(text, x, topPx);
  });
}

function fitting(context: CanvasRenderingContext2D, text: string, roomPx: number): string {
  if (roomPx < 40) return "";
  if (context.measureText(text).width <= roomPx) return text;
  const letters = Math.floor((text.length * roomPx) / context.measureText(text).width) - 1;
  return letters > 2 ? `${text.slice(0, letters)}…` : "";
}

export function paintPlayhead(context: CanvasRenderingContext2D, x: number, heightPx: number, colours: Colours): void {
  context.fillStyle = colours.page;
  context.fillRect(Math.round(x) - 2, 0, 5, heightPx);
  context.fillStyle = colours.text;
  context.fillRect(Math.round(x) - 0.5, 0, 2, heightPx);
}
