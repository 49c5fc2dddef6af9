// SPDX-License-Identifier: Apache-2.0
//
// Paints the timeline's axis, grid and playhead.

import type { TimeScale } from "./time_scale";

export const kAxisPx = 26;

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

export function paintPlayhead(context: CanvasRenderingContext2D, x: number, heightPx: number, colours: Colours): void {
  context.fillStyle = colours.page;
  context.fillRect(Math.round(x) - 2, 0, 5, heightPx);
  context.fillStyle = colours.text;
  context.fillRect(Math.round(x) - 0.5, 0, 2, heightPx);
}
