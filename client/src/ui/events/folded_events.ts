// SPDX-License-Identifier: Apache-2.0
//
// What a list of events has in one row: continuous recordings of a camera, an hour's together, so that what was reported
// stands out; anything else, and what is kept, by itself.

import { kindOf } from "../../playback/coverage";
import type { Footage, FootageRef } from "../../wire/footage";

export interface EventRow {
  /** What the row opens: of several recordings the first. */
  readonly footage: Footage;
  /** The number of all of them, the first included. */
  readonly ids: readonly number[];
  /** How much was recorded, in seconds. */
  readonly seconds: number;
  readonly isGrowing: boolean;
}

export function rowOf(footage: Footage): EventRow {
  return { footage, ids: [footage.id], seconds: footage.stop - footage.start, isGrowing: footage.isGrowing };
}

export function isInRow({ footage, ids }: EventRow, one: FootageRef | null): boolean {
  return one !== null && one.kind === footage.kind && ids.includes(one.id);
}

/** From newest to oldest, as `footage` is. */
export function foldContinuous(footage: readonly Footage[]): EventRow[] {
  const rows = new Map<string, EventRow>();
  for (const one of footage) {
    const isFolded = kindOf(one) === "continuous" && !one.isKept;
    const key = isFolded ? `${one.camera} of ${hourOf(one.start)}` : `${one.kind} ${one.id}`;
    const later = rows.get(key);
    const row = rowOf(one);
    // The row is where its first recording is.
    rows.delete(key);
    rows.set(key, !later ? row : {
      footage: one,
      ids: [one.id, ...later.ids],
      seconds: row.seconds + later.seconds,
      isGrowing: row.isGrowing || later.isGrowing,
    });
  }
  return [...rows.values()];
}

/** In the browser's time zone, which may be a quarter of an hour away from UTC's. */
function hourOf(unixS: number): number {
  return new Date(unixS * 1000).setMinutes(0, 0, 0);
}
