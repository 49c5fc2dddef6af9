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
  failing: "failing",
  "in-use": "in use by another recorder",
  "space-held": "its space is held",
  absent: "not mounted",
  foreign: "another mount's",
};

export function stateText({ enabled, state }: Pick<MountRecord, "enabled" | "state">): string {
  return enabled ? (kStates[state] ?? state) : "not recorded to";
}

/** "keeps 30 days, at most 500 GB", "keeps as much as there is room for". */
export function limitText({ bytes, days }: MountRecord["limit"]): string {
  const limits = [days === null ? "" : counted(days, "day"), bytes === null ? "" : `at most ${bytesText(bytes)}`];
  return `keeps ${limits.filter((text) => text).join(", ") || "as much as there is room for"}`;
}

/** For how long there is room, in words. */
export function forecastText(lastsDays: number | null): string {
  return lastsDays === null ? "For how long it lasts is not known yet." : `Lasts for about ${daysText(lastsDays)} of footage.`;
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
