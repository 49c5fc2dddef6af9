// SPDX-License-Identifier: Apache-2.0
//
// Texts for the user: file names.

import { snapshotFileName } from "../../../../client/src/ui/widgets/text";

test.each([
  ["Entrance", "Entrance_2026-11-04_09-05-07.jpg"],
  ["Hof / Süd  2", "Hof-Süd-2_2026-11-04_09-05-07.jpg"],
  ["../../etc/passwd", "etc-passwd_2026-11-04_09-05-07.jpg"],
  ['a:b*c?"<d>|\\\n', "a-b-c-d_2026-11-04_09-05-07.jpg"],
  ["..", "camera_2026-11-04_09-05-07.jpg"],
])("file name of a snapshot of %j", (name, file) => {
  expect(snapshotFileName(name, new Date(2026, 10, 4, 9, 5, 7).getTime())).toBe(file);
});
