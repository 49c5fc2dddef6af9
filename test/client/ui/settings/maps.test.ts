// SPDX-License-Identifier: Apache-2.0
//
// What the maps' page makes of files, and says before a map goes.

import { removalSentences } from "../../../../client/src/ui/settings/maps/map_dialogs";
import { drawnScale, nameOfFile, pictureOfFile } from "../../../../client/src/ui/settings/maps/picture_file";
import { kMaxUploadBytes } from "../../../../client/src/wire/emap_setup";

test.each([
  ["plans/Ground floor.v2.png", "Ground floor.v2"],
  ["C:\\plans\\Yard.svg", "Yard"],
  ["Yard", "Yard"],
  [`${"x".repeat(80)}.png`, "x".repeat(64)],
])("the map of the file %s is called %s", (file, name) => expect(nameOfFile(file)).toBe(name));

test.each([
  [1200, 800, 2],
  [100, 3000, 1],
  [20_000, 10, 0.25],
  [5000, 5000, 1],
])("a drawing of %i by %i is drawn %f times as large", (width, height, scale) => expect(drawnScale(width, height)).toBe(scale));

test("a file that no server would take is not sent, any other as it is", async () => {
  const file = (size: number) => new File([new Uint8Array(size)], "plan.png", { type: "image/png" });
  expect(await pictureOfFile(file(0))).toMatch(/empty/);
  expect(await pictureOfFile(file(kMaxUploadBytes + 1))).toMatch(/20 MB/);
  const largest = file(kMaxUploadBytes);
  expect(await pictureOfFile(largest)).toBe(largest);
});

test("before a map is removed, the user is told what goes and what else shows it", () => {
  const linked = removalSentences({ items: 1, linkedFrom: [{ id: 2, name: "Upper floor" }, { id: 3, name: "Site" }] });
  expect(linked.join(" ")).toMatch(/places of 1 item on it.*link on: Upper floor, Site\./);
  expect(removalSentences({ items: 0, linkedFrom: [] })).toEqual(["Its picture is deleted.", "No other map has a link to it."]);
});
