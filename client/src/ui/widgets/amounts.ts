// SPDX-License-Identifier: Apache-2.0
//
// Amounts of data and time as text for the user, and back.

const kUnits = ["B", "kB", "MB", "GB", "TB", "PB"];
export const kGigabyte = 1e9;

/** "734 B", "1.2 MB", "12 GB", in one line. */
export function bytesText(bytes: number): string {
  let value = bytes;
  let unit = 0;
  for (; value >= 999.5 && unit + 1 < kUnits.length; unit += 1) value /= 1000;
  return `${unit > 0 && value < 9.95 ? value.toFixed(1) : Math.round(value)}\u00a0${kUnits[unit]}`;
}

/** "1 event", "3 events". */
export function counted(count: number, noun: string): string {
  return `${count.toLocaleString("en-GB")} ${noun}${count === 1 ? "" : "s"}`;
}

/** "less than a day", "5 days", "3 weeks", "14 months". */
export function daysText(days: number): string {
  if (days < 1) return "less than a day";
  if (days < 30) return counted(Math.floor(days), "day");
  if (days < 90) return counted(Math.floor(days / 7), "week");
  return days < 3650 ? counted(Math.floor(days / 30.4), "month") : "more than ten years";
}
