// SPDX-License-Identifier: Apache-2.0
//
// Texts for the user: file names, times and spans.

import { minuteText, preciseTime, snapshotFileName, spanInWords, zoneText } from "../../../../client/src/ui/widgets/text";

test.each([
  ["Entrance", "Entrance_2026-11-04_09-05-07.jpg"],
  ["Hof / Süd  2", "Hof-Süd-2_2026-11-04_09-05-07.jpg"],
  ["../../etc/passwd", "etc-passwd_2026-11-04_09-05-07.jpg"],
  ['a:b*c?"<d>|\\\n', "a-b-c-d_2026-11-04_09-05-07.jpg"],
  ["..", "camera_2026-11-04_09-05-07.jpg"],
])("file name of a snapshot of %j", (name, file) => {
  expect(snapshotFileName(name, new Date(2026, 10, 4, 9, 5, 7).getTime())).toBe(file);
});

test("times to the tenth that has begun, and spans in words", () => {
  expect(preciseTime(new Date(2026, 10, 4, 9, 5, 7, 999).getTime())).toBe("09:05:07.9");
  expect(minuteText(new Date(2026, 10, 24, 1, 45).getTime())).toBe("24 Nov 01:45");
  const spans = [4.4, 60, 12_540, 7_200, 86_400 * 2 + 3_600 * 4 + 59];
  expect(spans.map(spanInWords)).toEqual(["4 s", "1 min", "3 h 29 min", "2 h", "2 d 4 h"]);
});

test.each([
  ["Asia/Kathmandu", -345, "Asia/Kathmandu, UTC+05:45"],
  ["America/St_Johns", 210, "America/St_Johns, UTC−03:30"],
  ["UTC", 0, "UTC"],
])("the zone of the times that are shown: %s", (timeZone, offset, text) => {
  vi.spyOn(Intl, "DateTimeFormat").mockReturnValue({ resolvedOptions: () => ({ timeZone }) } as Intl.DateTimeFormat);
  const at = new Date();
  vi.spyOn(at, "getTimezoneOffset").mockReturnValue(offset);
  expect(zoneText(at)).toBe(text);
  vi.restoreAllMocks();
});
