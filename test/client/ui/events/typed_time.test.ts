// SPDX-License-Identifier: Apache-2.0

import { typedTime } from "../../../../client/src/ui/events/typed_time";

describe("a time that is typed", () => {
  /** A Friday. */
  const now = new Date(2026, 10, 27, 9, 30, 15).getTime();

  test.each<[string, [number, number, number, number, number, number] | null]>([
    ["8:05", [2026, 10, 27, 8, 5, 0]],
    [" 14:05 ", [2026, 10, 26, 14, 5, 0]],
    ["09:30:16", [2026, 10, 26, 9, 30, 16]],
    ["mon 14:05", [2026, 10, 23, 14, 5, 0]],
    ["Monday  14.05.30", [2026, 10, 23, 14, 5, 30]],
    ["fri 9:00", [2026, 10, 27, 9, 0, 0]],
    ["fri 14:05", [2026, 10, 20, 14, 5, 0]],
    ["today 14:05", [2026, 10, 27, 14, 5, 0]],
    ["yesterday 0:00", [2026, 10, 26, 0, 0, 0]],
    ["24 nov 14:05", [2026, 10, 24, 14, 5, 0]],
    ["24 December 14:05", [2025, 11, 24, 14, 5, 0]],
    ["1. jan 2024 6:00", [2024, 0, 1, 6, 0, 0]],
    ["2026-11-24 14:05", [2026, 10, 24, 14, 5, 0]],
    ["-10m", [2026, 10, 27, 9, 20, 15]],
    ["- 2 hours", [2026, 10, 27, 7, 30, 15]],
    ["-1d", [2026, 10, 26, 9, 30, 15]],
    ["now", [2026, 10, 27, 9, 30, 15]],
    ["", null],
    ["25:00", null],
    ["14:60", null],
    ["someday 14:05", null],
    ["31 feb 14:05", null],
    ["2026-13-01 14:05", null],
    ["-10x", null],
    ["mon", null],
  ])("%j", (text, expected) => {
    expect(typedTime(text, now)).toBe(expected && new Date(...expected).getTime());
  });
});
