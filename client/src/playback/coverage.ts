// SPDX-License-Identifier: Apache-2.0
//
// What of a span was recorded, as segments for a timeline; and the kinds of events that the user tells apart.

import type { EventKind, Footage } from "../wire/footage";
import type { Runs } from "../wire/recordings";

export interface Segment {
  startS: number;
  stopS: number;
  /** Part of an event, not only recorded. */
  isEvent: boolean;
}

/** The segments of run lengths that begin at `fromS`, cut at `toS`. */
export function segmentsOf(fromS: number, toS: number, interval: number, runs: Runs): Segment[] {
  const segments: Segment[] = [];
  let startS = fromS;
  for (const [value, count] of runs) {
    const stopS = Math.min(startS + Math.max(0, count) * interval, toS);
    if (value > 0 && stopS > startS) segments.push({ startS, stopS, isEvent: value >= 2 });
    startS = stopS;
  }
  return segments;
}

export type { EventKind };

export const kEventKinds: readonly EventKind[] = ["continuous", "alarm", "alert", "pos"];

const kReasonContinuous = 1;

export function kindOf({ kind, reason }: Pick<Footage, "kind" | "reason">): EventKind {
  if (kind !== "event") return kind;
  return reason === kReasonContinuous ? "continuous" : "alarm";
}

/** What overlaps the span. Marks lie within recordings, so that ends do not ascend with starts. */
export function overlapping(footage: readonly Footage[], fromS: number, toS: number): Footage[] {
  return footage.filter(({ start, stop }) => start < toS && stop > fromS);
}
