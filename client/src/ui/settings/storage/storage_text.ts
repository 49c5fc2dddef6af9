// SPDX-License-Identifier: Apache-2.0
//
// States, limits and forecasts of mounts in words.

import type { MountRecord, MountSettings } from "../../../wire/mounts";
import { bytesText, counted, daysText } from "../../widgets/amounts";

const kStates: Record<string, string> = {
  ready: "ready",
  "read-only": "read only",
  "no-access": "not accessible",
  full: "full",
  "kept-full": "full of kept recordings",
  failing: "failing",
  "in-use": "in use by another recorder",
  "space-held": "deleting frees no space",
  absent: "not mounted",
  elsewhere: "on other hosts",
  foreign: "belongs to another mount",
  "other-host": "on another host",
};

export function stateText({ enabled, state }: Pick<MountRecord, "enabled" | "state">): string {
  return enabled ? (kStates[state] ?? state) : "recording off";
}

/** "keeps 30 days, at most 500 GB", "keeps as much as there is room for". */
export function limitText({ bytes, days }: MountRecord["limit"]): string {
  const limits = [days === null ? "" : counted(days, "day"), bytes === null ? "" : `at most ${bytesText(bytes)}`];
  return `keeps ${limits.filter((text) => text).join(", ") || "as much as there is room for"}`;
}

/** For how long there is room, in words. */
export function forecastText(lastsDays: number | null): string {
  if (lastsDays === null) return "Not enough has been recorded to tell how long footage lasts.";
  return `Room for about ${daysText(lastsDays)} of footage.`;
}

/** What limits come to, at what is recorded now. */
export function limitsEffect(
  { limitBytes, limitDays }: Pick<MountSettings, "limitBytes" | "limitDays">,
  { perDay, used, free }: Pick<MountRecord, "perDay" | "free" | "used">,
): string {
  if (perDay <= 0) return "";
  const room = Math.min(limitBytes ?? Infinity, free === null ? Infinity : used + free);
  const days = Math.min(limitDays ?? Infinity, room / perDay);
  if (days === Infinity) return "";
  return `At ${bytesText(perDay)} a day there will be about ${daysText(days)} of footage, ${bytesText(days * perDay)}.`;
}
