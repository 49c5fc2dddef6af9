// SPDX-License-Identifier: Apache-2.0
//
// Entries of the audit log in words.

import type { AuditedState, AuditEntry } from "../../../wire/audit";
import { capitalized } from "../../../wire/sentence";
import { yesNo } from "../../widgets/text";
import { weekText } from "../cameras/plan";

/** Where the user knows it by another name. */
const kAreas: Record<string, string> = {
  user: "account", group: "camera group", emap: "map", io: "I/O module", pos: "POS terminal", server: "host",
};
const kVerbs: Record<string, string> = {
  add: "added",
  set: "changed",
  remove: "removed",
  order: "put in order",
  place: "items placed",
  changePassword: "password changed",
  endSessions: "sessions ended",
  admit: "may show cameras of this one",
  invite: "invited by a code",
  cameras: "cameras read again",
};

/** "camera.add": "Camera added". */
export function actionText(action: string): string {
  const [area = "", verb = ""] = action.split(".");
  const words = (text: string) => text.replaceAll(/[-_]/g, " ").replaceAll(/([a-z])([A-Z])/g, "$1 $2").toLowerCase();
  const what = kAreas[area] ?? words(area);
  return `${capitalized(what)} ${kVerbs[verb] ?? words(verb)}`.trim();
}

export interface AuditedChange {
  name: string;
  /** Empty where there was, or is, nothing. */
  before: string;
  after: string;
}

/** Each setting that differs, those within settings as well: "plan mode". */
export function changesOf({ before, after }: Pick<AuditEntry, "before" | "after">): AuditedChange[] {
  const [old, now] = [flat(before), flat(after)];
  const names = [...new Set([...old.keys(), ...now.keys()])];
  return names
    .map((name) => ({ name, before: old.get(name) ?? "", after: now.get(name) ?? "" }))
    .filter((change) => change.before !== change.after);
}

function flat(state: AuditedState | null, prefix = ""): Map<string, string> {
  const found = new Map<string, string>();
  for (const [name, value] of Object.entries(state ?? {})) {
    const isNested = typeof value === "object" && value !== null && !Array.isArray(value);
    if (name === "hours" && typeof value === "string") found.set(`${prefix}${name}`, weekText(value));
    else if (!isNested) found.set(`${prefix}${name}`, textOf(value));
    else for (const [inner, text] of flat(value as AuditedState, `${prefix}${name} `)) found.set(inner, text);
  }
  return found;
}

function textOf(value: unknown): string {
  if (typeof value === "boolean") return yesNo(value);
  if (value === null || value === undefined) return "";
  if (Array.isArray(value)) return value.map(textOf).join(", ");
  if (typeof value !== "object") return String(value);
  return Object.entries(value).map(([name, inner]) => `${name} ${textOf(inner)}`).join(" ");
}
