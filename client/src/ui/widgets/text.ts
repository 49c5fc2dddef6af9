// SPDX-License-Identifier: Apache-2.0
//
// Times, names and states as text for the user.

import type { SignalState } from "../../live/signal_state";

const two = (value: number) => String(value).padStart(2, "0");

/** hh:mm:ss in the browser's time zone. */
export function clockTime(unixMs: number): string {
  const time = new Date(unixMs);
  return [time.getHours(), time.getMinutes(), time.getSeconds()].map(two).join(":");
}

/** hh:mm:ss.t in the browser's time zone. The tenth is the one that has begun. */
export function preciseTime(unixMs: number): string {
  return `${clockTime(unixMs)}.${Math.floor((unixMs % 1000) / 100)}`;
}

/** yyyy-mm-dd in the browser's time zone. */
export function calendarDate(unixMs: number): string {
  const time = new Date(unixMs);
  return [time.getFullYear(), time.getMonth() + 1, time.getDate()].map(two).join("-");
}

const kDayAndMonth = new Intl.DateTimeFormat("en-GB", { weekday: "short", day: "numeric", month: "short" });
const kMonthAndYear = new Intl.DateTimeFormat("en-GB", { month: "long", year: "numeric" });

/** "Tue 24 Nov" in the browser's time zone. */
export function shortDate(unixMs: number): string {
  return kDayAndMonth.format(unixMs).replace(",", "");
}

const kDayAndMinute = new Intl.DateTimeFormat("en-GB", { day: "numeric", month: "short", hour: "2-digit", minute: "2-digit" });

/** "24 Nov 01:45" in the browser's time zone. */
export function minuteText(unixMs: number): string {
  return kDayAndMinute.format(unixMs).replace(",", "");
}

/** "November 2026". */
export function monthName(unixMs: number): string {
  return kMonthAndYear.format(unixMs);
}

/** "4:05", "1:00:00". */
export function duration(seconds: number): string {
  const [hours, rest] = [Math.floor(seconds / 3600), Math.floor(seconds) % 3600];
  const minutes = Math.floor(rest / 60);
  return `${hours > 0 ? `${hours}:${two(minutes)}` : minutes}:${two(rest % 60)}`;
}

/** "12 s", "5 min", "3 h 29 min", "2 d 4 h". */
export function spanInWords(seconds: number): string {
  const [minutes, hours, days] = [60, 3600, 86_400].map((unit) => Math.floor(seconds / unit)) as [number, number, number];
  const pair = (whole: string, rest: number, unit: string) => (rest > 0 ? `${whole} ${rest} ${unit}` : whole);
  if (days > 0) return pair(`${days} d`, hours % 24, "h");
  if (hours > 0) return pair(`${hours} h`, minutes % 60, "min");
  return minutes > 0 ? `${minutes} min` : `${Math.round(seconds)} s`;
}

export function yesNo(value: boolean): string {
  return value ? "yes" : "no";
}

/** "½×" for slow motion by a factor of two, "4×" for four times as fast. */
export function rateText(rate: number): string {
  const slow: Record<number, string> = { [-2]: "½", [-4]: "¼", [-8]: "⅛" };
  return `${slow[rate] ?? rate}×`;
}

/** A file name that every file system takes: the camera's name and the time, without characters that some refuse. */
export function snapshotFileName(cameraName: string, takenMs: number): string {
  const plain = cameraName
    .replace(/[\u0000-\u001f\u007f/\\:*?"<>|]+/g, " ")
    .trim()
    .replace(/\s+/g, "-");
  const name = plain.replace(/^[.-]+|[.-]+$/g, "") || "camera";
  return `${name}_${calendarDate(takenMs)}_${clockTime(takenMs).replaceAll(":", "-")}.jpg`;
}

/** "08:15:30"; with the date where that is another day. */
function sinceText(unixMs: number, nowMs: number): string {
  const isToday = calendarDate(unixMs) === calendarDate(nowMs);
  return isToday ? clockTime(unixMs) : `${calendarDate(unixMs)} ${clockTime(unixMs)}`;
}

/** `pollIntervalMs` is the time between two pictures of a source that polls. */
export function signalText(state: SignalState, pollIntervalMs = 0): string {
  switch (state.kind) {
    case "idle":
      return "paused";
    case "connecting":
      return "connecting";
    case "live":
      return pollIntervalMs > 0 ? `live, every ${pollIntervalMs / 1000} s` : "live";
    case "lost":
      return state.sinceMs === null ? "no signal" : `no signal since ${sinceText(state.sinceMs, Date.now())}`;
  }
}

/** "Europe/Berlin, UTC+01:00": the browser's, in which all times are shown. */
export function zoneText(at: Date): string {
  const { timeZone } = Intl.DateTimeFormat().resolvedOptions();
  const minutes = -at.getTimezoneOffset();
  const two = (number: number) => String(number).padStart(2, "0");
  const offset = `${minutes < 0 ? "−" : "+"}${two(Math.floor(Math.abs(minutes) / 60))}:${two(Math.abs(minutes) % 60)}`;
  return timeZone === "UTC" ? timeZone : `${timeZone}, UTC${offset}`;
}
