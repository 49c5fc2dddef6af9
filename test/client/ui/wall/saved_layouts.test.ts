// SPDX-License-Identifier: Apache-2.0
//
// Saved layouts and sequences: what is read of whatever the server sends, and under which names they are saved.

import { SavedLayouts } from "../../../../client/src/ui/wall/saved_layouts";
import { chosenCameras } from "../../../../client/src/ui/wall/wall_dialogs";
import type { Preferences } from "../../../../client/src/wire/preferences";
import { ServerError } from "../../../../client/src/wire/server";

type Values = Record<string, unknown>;

/** Of a server that answers what is saved with this status. */
function savedIn(values: Values, status = 200): SavedLayouts {
  const save = async (records: Values) => {
    if (status !== 200) throw new ServerError(status, status, "The server refused: no.");
    Object.assign(values, records);
  };
  const preferences = { names: Object.keys(values), get: (name: string) => values[name], save };
  return new SavedLayouts(preferences as unknown as Preferences, () => undefined);
}

const gates = { name: "Gates", grid: "2", cameras: [2, 1] };

test.each<[string, unknown, unknown]>([
  ["as this client saves it", gates, [{ id: "a", ...gates }]],
  ["a grid of a newer client", { ...gates, grid: "9x9" }, [{ id: "a", ...gates, grid: "auto" }]],
  ["no grid", { name: "Gates", cameras: [2, 1] }, [{ id: "a", ...gates, grid: "auto" }]],
  ["cameras twice, and what is none", { ...gates, cameras: [2, "1", 1, 2, null, 1.5, { id: 3 }] }, [{ id: "a", ...gates }]],
  ["no camera", { ...gates, cameras: ["1"] }, []],
  ["cameras that are no list", { ...gates, cameras: { length: 1e9 } }, []],
  ["no name", { grid: "2", cameras: [1] }, []],
  ["an empty name", { ...gates, name: " " }, []],
  ["a name that is no text", { ...gates, name: { toLowerCase: 1 } }, []],
  ["a name that is too long", { ...gates, name: "x".repeat(65) }, []],
  ["64 characters of two units each", { ...gates, name: "🌳".repeat(64) }, [{ id: "a", ...gates, name: "🌳".repeat(64) }]],
  ["a text", "Gates", []],
  ["a list", [gates], []],
  ["a number", 7, []],
])("a layout is read from %s", (_what, value, expected) => {
  expect(savedIn({ "saved.layout.a": value }).layouts).toEqual(expected);
});

test.each<[string, unknown, unknown]>([
  ["as this client saves it", { name: "Night", dwellS: 10, layouts: ["b", "a"] }, [{ id: "s", name: "Night", dwellS: 10, layouts: ["b", "a"] }]],
  ["layouts that were deleted", { name: "Night", dwellS: 10, layouts: ["x", "a", 7, "a"] }, [{ id: "s", name: "Night", dwellS: 10, layouts: ["a"] }]],
  ["no layouts", { name: "Night", dwellS: 10 }, [{ id: "s", name: "Night", dwellS: 10, layouts: [] }]],
  ["too short a time", { name: "Night", dwellS: -1, layouts: ["a"] }, [{ id: "s", name: "Night", dwellS: 5, layouts: ["a"] }]],
  ["too long a time", { name: "Night", dwellS: 1e300, layouts: ["a"] }, [{ id: "s", name: "Night", dwellS: 600, layouts: ["a"] }]],
  ["no time", { name: "Night", dwellS: "10", layouts: ["a"] }, []],
  ["nothing", null, []],
])("a sequence is read from %s", (_what, value, expected) => {
  const layouts = { "saved.layout.a": gates, "saved.layout.b": { ...gates, name: "Yard" } };
  expect(savedIn({ ...layouts, "saved.sequence.s": value }).sequences).toEqual(expected);
});

test("they are listed by name; what has an id that no address takes, or another name, is not", () => {
  const named = (name: string) => ({ ...gates, name });
  const values = {
    "saved.layout.1": named("Hall 10"),
    "saved.layout.2": named("Hall 9"),
    "saved.layout.": named("none"),
    "saved.layout.a&b": named("none"),
    "wall.layout": named("none"),
    "saved.sequence.3": named("none"),
  };
  expect(savedIn(values).layouts.map(({ name }) => name)).toEqual(["Hall 9", "Hall 10"]);
});

test.each<[string, number, string, string, RegExp]>([
  ["a new name", 1, "Yard", "x", /^$/],
  ["no name", 1, "", "x", /give the layout a name/],
  ["the name of another one", 1, "gATES 0", "x", /already/],
  ["its own name", 1, "Gates 0", "0", /^$/],
  ["64 characters", 1, "🌳".repeat(64), "x", /^$/],
  ["65 characters", 1, "x".repeat(65), "x", /at most 64/],
  ["the 32nd", 31, "Yard", "x", /^$/],
  ["the 33rd", 32, "Yard", "x", /Delete one first/],
  ["one of 32 that gets another name", 32, "Yard", "0", /^$/],
])("%s", (_what, count, name, id, expected) => {
  const values = Object.fromEntries(Array.from({ length: count }, (_, at) => [`saved.layout.${at}`, { ...gates, name: `Gates ${at}` }]));
  expect(savedIn(values).nameProblem("layout", name, id)).toMatch(expected);
});

test.each([
  [400, "The account has no room for this. Delete a layout or a sequence first."],
  [403, "The server refused: no."],
])("the user learns why the server refuses with %i", async (status, message) => {
  const saved = savedIn({}, status).saveLayout({ id: "a", name: "Gates", grid: "auto", cameras: [1] });
  await expect(saved).rejects.toMatchObject({ status, message });
});

test.each([
  // before, known, ticked, expected
  [[3, 1, 2], [1, 2, 3], [1, 2, 3], [3, 1, 2]],
  [[3, 1, 2], [1, 2, 3], [2, 3], [3, 2]],
  [[3], [2, 1, 3], [1, 2, 3], [3, 2, 1]],
  [[3, 7, 1], [1, 2, 3], [1, 2], [7, 1, 2]],
])("of a layout of %j, of %j known, %j are ticked", (before, known, ticked, expected) => {
  expect(chosenCameras(before, known, ticked)).toEqual(expected);
});
