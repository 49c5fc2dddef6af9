// SPDX-License-Identifier: Apache-2.0
//
// The time that a user types: "14:05", "mon 14:05:30", "yesterday 8:00", "24 nov 14:05", "2026-11-24 14:05", "-10m".

import { midnight } from "../../playback/recorded_days";

const kUnitMs: Record<string, number> = { s: 1_000, m: 60_000, h: 3_600_000, d: 86_400_000 };
const kWeekdays = ["sun", "mon", "tue", "wed", "thu", "fri", "sat"];
const kMonths = ["jan", "feb", "mar", "apr", "may", "jun", "jul", "aug", "sep", "oct", "nov", "dec"];
const kAgo = /^-\s*(\d{1,6})\s*(s|m|h|d)[a-z]*$/;
const kClock = /^(?:(.*?)\s+)?(\d{1,2})[:.](\d{2})(?:[:.](\d{2}))?$/;
const kIsoDay = /^(\d{4})-(\d{1,2})-(\d{1,2})$/;
const kNamedDay = /^(\d{1,2})\.?\s+([a-z]{3})[a-z]*(?:\s+(\d{4}))?$/;

export const kTimeExamples = "14:05, mon 14:05, 24 nov 14:05:30, 2026-11-24 14:05, or -10m for ten minutes ago";

/**
 * Unix milliseconds, in the browser's time zone; the last such time where no day or no year is named. Null where it is
 * none.
 */
export function typedTime(text: string, nowMs: number): number | null {
  const words = text.trim().toLowerCase().replace(/\s+/g, " ");
  if (words === "now") return nowMs;
  const ago = kAgo.exec(words);
  if (ago) return nowMs - Number(ago[1]) * kUnitMs[ago[2]!]!;
  const found = kClock.exec(words);
  if (!found) return null;
  const [hours, minutes, seconds] = [found[2], found[3], found[4] ?? "0"].map(Number) as [number, number, number];
  if (hours > 23 || minutes > 59 || seconds > 59) return null;
  const onDay = (dayMs: number) => {
    const day = new Date(dayMs);
    return new Date(day.getFullYear(), day.getMonth(), day.getDate(), hours, minutes, seconds).getTime();
  };
  const day = found[1] ?? "";
  if (day === "" || kWeekdays.includes(day.slice(0, 3))) return lastOf(day.slice(0, 3), onDay, nowMs);
  const dayMs = dayOf(day, nowMs);
  return dayMs === null ? null : onDay(dayMs);
}

/** The last day up to today on that weekday (any, where it is empty) on which the time is not still to come. */
function lastOf(weekday: string, onDay: (dayMs: number) => number, nowMs: number): number | null {
  for (let back = 0; back <= 7; back += 1) {
    const dayMs = midnight(nowMs, -back);
    if (weekday !== "" && kWeekdays[new Date(dayMs).getDay()] !== weekday) continue;
    if (onDay(dayMs) <= nowMs) return onDay(dayMs);
  }
  return null;
}

function dayOf(text: string, nowMs: number): number | null {
  if (text === "today") return midnight(nowMs);
  if (text === "yesterday") return midnight(nowMs, -1);
  const iso = kIsoDay.exec(text);
  if (iso) return dateOf(Number(iso[1]), Number(iso[2]) - 1, Number(iso[3]));
  const named = kNamedDay.exec(text);
  const month = named ? kMonths.indexOf(named[2]!) : -1;
  if (!named || month < 0) return null;
  if (named[3]) return dateOf(Number(named[3]), month, Number(named[1]));
  const thisYear = dateOf(new Date(nowMs).getFullYear(), month, Number(named[1]));
  const isToCome = thisYear !== null && thisYear > nowMs;
  return isToCome ? dateOf(new Date(nowMs).getFullYear() - 1, month, Number(named[1])) : thisYear;
}

/** Null for a day that there is not. */
function dateOf(year: number, month: number, day: number): number | null {
  const date = new Date(year, month, day);
  return date.getMonth() === month && date.getDate() === day ? date.getTime() : null;
}
