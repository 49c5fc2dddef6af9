// SPDX-License-Identifier: Apache-2.0

import { foldContinuous, isInRow } from "../../../../client/src/ui/events/folded_events";
import { markAt } from "../../../../client/src/ui/events/mark_text";
import type { Footage } from "../../../../client/src/wire/footage";

const kHourS = new Date(2026, 10, 28, 14).getTime() / 1000;
const footage = (id: number, minute: number, more: Partial<Footage> = {}): Footage => {
  const start = kHourS + minute * 60;
  return { kind: "event", id, camera: 1, start, stop: start + 300, moment: start + 60, reason: 1, text: "", isKept: false, isGrowing: false, ...more } as Footage;
};

test("continuous recordings of a camera and an hour are one row, all else stands by itself", () => {
  const alert = footage(9, 17, { kind: "alert", reason: 0, text: "Door" });
  const events = [
    footage(8, 63, { isGrowing: true }),
    footage(7, 58),
    footage(6, 50),
    footage(5, 45, { isKept: true }),
    footage(4, 40, { camera: 2 }),
    footage(3, 30, { reason: 2 }),
    alert,
    footage(2, 10),
    footage(1, -1),
  ];
  const rows = foldContinuous(events);
  expect(rows.map(({ ids, seconds, isGrowing }) => [ids, seconds, isGrowing])).toEqual([
    [[8], 300, true],
    [[5], 300, false],
    [[4], 300, false],
    [[3], 300, false],
    [[9], 300, false],
    [[2, 6, 7], 900, false],
    [[1], 300, false],
  ]);
  const folded = rows[5]!;
  expect(folded.footage.id, "it opens the first").toBe(2);
  const selected = [footage(7, 58), { kind: "alert" as const, id: 7 }, footage(8, 63), null];
  expect(selected.map((one) => isInRow(folded, one))).toEqual([true, false, false, false]);
});

test.each([
  ["before its footage", -1, null],
  ["in its footage", 0, 1],
  ["where two have footage, of the nearer moment", 200, 2],
  ["after all", 900, null],
])("the text that stands beside the picture: %s", (_name, s, id) => {
  const marks = [
    footage(1, 0, { kind: "pos", text: "Tea" }),
    footage(2, 2, { kind: "alert", text: "Door" }),
    footage(3, 2, { kind: "alert" }),
    footage(4, 0, { text: "a recording" }),
  ];
  expect(markAt(marks, kHourS + s)?.id ?? null).toBe(id);
});
