// SPDX-License-Identifier: Apache-2.0
//
// When a camera records: the hours of a week, and the plan in words.

import type { CameraSettings, Named, RecordingPlan } from "../../../wire/camera_setup";
import { duration } from "../../widgets/text";

export const kDays = ["Monday", "Tuesday", "Wednesday", "Thursday", "Friday", "Saturday", "Sunday"] as const;
export const kHoursOfDay = 24;
const kHoursOfWeek = kDays.length * kHoursOfDay;

/** What an hour's character means. */
export const kHourModes = ["never", "always", "on alert"] as const;

/** As new cameras have it. */
export const kFirstPlan: RecordingPlan = {
  mode: "always",
  segment: 300,
  pre: 5,
  post: 10,
  mount: 0,
  profile: 0,
  hours: "1".repeat(kHoursOfWeek),
};

/** 168 characters, whatever was stored. */
export function wholeWeek(hours: string): string {
  return /^[012]{168}$/.test(hours) ? hours : "1".repeat(kHoursOfWeek);
}

/** The rectangle between two hours, both included, with another mode. */
export function painted(hours: string, from: number, to: number, mode: number): string {
  const [dayOf, hourOf] = [(at: number) => Math.floor(at / kHoursOfDay), (at: number) => at % kHoursOfDay];
  const isBetween = (at: number, one: number, other: number) => at >= Math.min(one, other) && at <= Math.max(one, other);
  return [...hours]
    .map((old, at) => {
      const isDay = isBetween(dayOf(at), dayOf(from), dayOf(to));
      const isInside = isDay && isBetween(hourOf(at), hourOf(from), hourOf(to));
      return isInside ? String(mode) : old;
    })
    .join("");
}

const kNotRecorded = "not recorded";

/** "always", "not recorded", "each week 98 h always, 70 h on alert". */
export function weekText(hours: string): string {
  const count = (mode: number) => [...hours].filter((hour) => Number(hour) === mode).length;
  const counts = kHourModes.map((text, mode) => ({ text, count: count(mode) }));
  const used = counts.filter(({ text, count }) => count > 0 && text !== "never");
  if (used.length === 0) return kNotRecorded;
  if (used[0]!.count === kHoursOfWeek) return used[0]!.text;
  return `each week ${used.map(({ text, count }) => `${count} h ${text}`).join(", ")}`;
}

/** "Monday, 08:00 to 09:00". */
export function hourText(at: number): string {
  const two = (hour: number) => `${String(hour).padStart(2, "0")}:00`;
  const hour = at % kHoursOfDay;
  return `${kDays[Math.floor(at / kHoursOfDay)]}, ${two(hour)} to ${two(hour + 1)}`;
}

function whenText({ mode, hours }: RecordingPlan): string {
  return { never: "on alert only", always: "always", schedule: weekText(hours) }[mode];
}

/** "recorded always", "recorded on alert only", "not recorded". */
export function recordedText({ enabled, plan }: Pick<CameraSettings, "enabled" | "plan">): string {
  const when = enabled ? whenText(plan) : kNotRecorded;
  return when === kNotRecorded ? when : `recorded ${when}`;
}

/** The whole plan. */
export function planText(plan: RecordingPlan, mounts: readonly Named[]): string {
  const when = whenText(plan);
  const hasAlerts = plan.mode === "never" || (plan.mode === "schedule" && plan.hours.includes("2"));
  const alerts = hasAlerts ? `, ${plan.pre} s before and ${plan.post} s after an alert` : "";
  const mount = mounts.find(({ id }) => id === plan.mount)?.name ?? "the default mount";
  return `${when}${alerts}, files of ${duration(plan.segment)}, on ${mount}`;
}
