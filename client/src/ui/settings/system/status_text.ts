// SPDX-License-Identifier: Apache-2.0
//
// The state of the installation in words, the worst first.

import type { Check, Finding, SystemProcess, SystemStatus } from "../../../wire/system";
import { counted } from "../../widgets/amounts";
import { minuteText } from "../../widgets/text";

export interface Line {
  kind: "fault" | "note" | "unchecked";
  /** "web server" */
  check: string;
  text: string;
  /** What to do; may be empty. */
  remedy: string;
}

const kKinds = ["fault", "note", "unchecked"] as const;
export const kKindNames: Record<Line["kind"], string> = { fault: "Problem", note: "Note", unchecked: "Not checked" };

/** Faults, then notes, then what was not checked; within each in the order of the checks. */
export function linesOf(checks: readonly Check[]): Line[] {
  const lines = checks.flatMap(({ name, finding, unchecked }): Line[] => [
    ...finding.map(({ severity, problem, remedy }) => ({ kind: severity, check: name, text: problem, remedy })),
    ...(unchecked ? [{ kind: "unchecked" as const, check: name, text: unchecked, remedy: "" }] : []),
  ]);
  return lines.sort((one, other) => kKinds.indexOf(one.kind) - kKinds.indexOf(other.kind));
}

/** "2 problems, 1 note", "All is well." */
export function summaryText(lines: readonly Line[]): string {
  const counts = [
    [lines.filter(({ kind }) => kind === "fault").length, "problem"],
    [lines.filter(({ kind }) => kind === "note").length, "note"],
    [lines.filter(({ kind }) => kind === "unchecked").length, "check not done"],
  ] as const;
  const told = counts.filter(([count]) => count > 0).map(([count, noun]) => countedText(count, noun));
  return told.length > 0 ? told.join(", ") : "All is well.";
}

function countedText(count: number, noun: string): string {
  const [first = "", ...rest] = noun.split(" ");
  return [counted(count, first), ...rest].join(" ");
}

/** The command that a remedy begins with, ready for a shell; null where a remedy has no command. */
export function commandOf(remedy: Finding["remedy"]): string | null {
  const found = /^(?:as root: )?((?:(?:lookhaven|chmod|chown|ipcrm|systemctl) |mount -)(?:'[^']*'|[^'])*?)(?:[,;] .*)?$/.exec(remedy);
  return found?.[1] ?? null;
}

const kProcessNames: Record<string, string> = { recorder: "Recorder", webapi: "Web API" };
const kProcessStates: Record<SystemProcess["state"], string> = { running: "running", hanging: "hangs", stopped: "not running" };

export function processName({ name }: SystemProcess): string {
  return kProcessNames[name] ?? name;
}

/** "running since 24 Nov 01:45" */
export function processText({ state, since, replaced }: SystemProcess): string {
  const begin = since === null ? "" : ` since ${minuteText(since * 1000)}`;
  return `${kProcessStates[state]}${begin}${replaced ? "; restart it to run the updated program" : ""}`;
}

export function storeText({ engine, schema }: SystemStatus["store"]): string {
  return `${engine === "sqlite" ? "SQLite" : "PostgreSQL"}, schema ${schema}`;
}
