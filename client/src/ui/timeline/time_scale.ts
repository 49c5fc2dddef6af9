// SPDX-License-Identifier: Apache-2.0
//
// Which time lies at which pixel of the timeline, how that is zoomed and panned, and the ticks of its axis.

import { midnight } from "../../playback/recorded_days";
import { calendarDate, clockTime, shortDate } from "../widgets/text";

const kSecondMs = 1_000;
const kMinuteMs = 60_000;
const kHourMs = 3_600_000;
const kDayMs = 86_400_000;
/** What the whole width shows at least and at most, however wide it is. */
const kMinSpanMs = 10 * kSecondMs;
const kMaxSpanMs = 90 * kDayMs;
/** Room that the label of a tick takes. */
const kLabelPx = 76;

const kSteps = [1, 2, 5, 10, 15, 30]
  .map((seconds) => seconds * kSecondMs)
  .concat([1, 2, 5, 10, 15, 30].map((minutes) => minutes * kMinuteMs))
  .concat([1, 2, 3, 6, 12].map((hours) => hours * kHourMs))
  .concat([1, 2, 7, 14, 28, 56].map((days) => days * kDayMs));

export interface Tick {
  atMs: number;
  label: string;
  /** Begins a day. */
  isDay: boolean;
}

export class TimeScale {
  readonly startMs: number;
  readonly msPerPx: number;
  readonly widthPx: number;

  constructor(startMs: number, msPerPx: number, widthPx: number) {
    this.startMs = startMs;
    this.widthPx = Math.max(1, widthPx);
    this.msPerPx = Math.min(kMaxSpanMs / this.widthPx, Math.max(kMinSpanMs / this.widthPx, msPerPx));
  }

  /** Shows this span; the middle of it where it is too long, and it in the middle where it is too short. */
  static of(fromMs: number, toMs: number, widthPx: number): TimeScale {
    const scale = new TimeScale(fromMs, (toMs - fromMs) / Math.max(1, widthPx), widthPx);
    return scale.panned((scale.spanMs - (toMs - fromMs)) / 2 / scale.msPerPx);
  }

  get spanMs(): number {
    return this.widthPx * this.msPerPx;
  }

  get endMs(): number {
    return this.startMs + this.spanMs;
  }

  xOf(ms: number): number {
    return (ms - this.startMs) / this.msPerPx;
  }

  msAt(px: number): number {
    return this.startMs + px * this.msPerPx;
  }

  contains(ms: number): boolean {
    return ms >= this.startMs && ms < this.endMs;
  }

  /** The time under `px` stays there; a factor above 1 shows more. */
  zoomed(factor: number, px: number): TimeScale {
    const zoomed = new TimeScale(this.startMs, this.msPerPx * factor, this.widthPx);
    return new TimeScale(this.msAt(px) - px * zoomed.msPerPx, zoomed.msPerPx, this.widthPx);
  }

  /** The same zoom, as far as it goes, and the same end on another width. */
  resized(widthPx: number): TimeScale {
    const resized = new TimeScale(this.startMs, this.msPerPx, widthPx);
    return new TimeScale(this.endMs - resized.spanMs, resized.msPerPx, widthPx);
  }

  /** The content moved to the right. */
  panned(px: number): TimeScale {
    return new TimeScale(this.startMs - px * this.msPerPx, this.msPerPx, this.widthPx);
  }

  ticks(): Tick[] {
    const stepMs = kSteps.find((step) => step / this.msPerPx >= kLabelPx) ?? kSteps.at(-1)!;
    return stepMs < kHourMs ? this.#fineTicks(stepMs) : this.#localTicks(stepMs);
  }

  /** On round times of the user's time zone, which may be a quarter of an hour away from UTC's. */
  #fineTicks(stepMs: number): Tick[] {
    const ticks: Tick[] = [];
    const offsetMs = new Date(this.startMs).getTimezoneOffset() * kMinuteMs;
    const firstMs = Math.ceil((this.startMs - offsetMs) / stepMs) * stepMs + offsetMs;
    for (let atMs = firstMs; atMs < this.endMs; atMs += stepMs) {
      ticks.push(tickAt(atMs, stepMs));
    }
    return ticks;
  }

  /** On full hours and days of the user's time zone, also on days with a change of the clock. */
  #localTicks(stepMs: number): Tick[] {
    const ticks: Tick[] = [];
    const stepHours = stepMs / kHourMs;
    const stepDays = Math.max(1, stepMs / kDayMs);
    // Counted from a fixed day, so that the ticks stay in place while the timeline is dragged.
    const firstDay = midnight(this.startMs);
    const skip = Math.round(firstDay / kDayMs) % stepDays;
    for (let day = midnight(firstDay, -skip); day < this.endMs; day = midnight(day, stepDays)) {
      const date = new Date(day);
      for (let hour = 0; hour < 24; hour += stepHours) {
        const atMs = new Date(date.getFullYear(), date.getMonth(), date.getDate(), hour).getTime();
        if (atMs >= this.startMs && atMs < this.endMs && atMs !== ticks.at(-1)?.atMs) ticks.push(tickAt(atMs, stepMs));
      }
    }
    return ticks;
  }
}

function tickAt(atMs: number, stepMs: number): Tick {
  const isDay = midnight(atMs) === atMs;
  const time = stepMs < kMinuteMs ? clockTime(atMs) : clockTime(atMs).slice(0, 5);
  return { atMs, isDay, label: isDay ? shortDate(atMs) : time };
}

/** For the user; a day is named once. */
export function spanText(fromMs: number, toMs: number): string {
  const time = (ms: number) => (toMs - fromMs < 10 * kMinuteMs ? clockTime(ms) : clockTime(ms).slice(0, 5));
  if (calendarDate(fromMs) === calendarDate(toMs)) return `${shortDate(fromMs)}, ${time(fromMs)} – ${time(toMs)}`;
  if (toMs - fromMs > 3 * kDayMs) return `${shortDate(fromMs)} – ${shortDate(toMs)}`;
  return `${shortDate(fromMs)} ${time(fromMs)} – ${shortDate(toMs)} ${time(toMs)}`;
}
