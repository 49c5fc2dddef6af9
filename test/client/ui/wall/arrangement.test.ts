// SPDX-License-Identifier: Apache-2.0
//
// The order of the wall's tiles: the user's own is kept, that of a saved layout is changed for the time being.

import { Arrangement } from "../../../../client/src/ui/wall/arrangement";
import type { Camera } from "../../../../client/src/wire/camera";
import type { Preferences } from "../../../../client/src/wire/preferences";

const cameras = (...ids: number[]) => ids.map((id) => ({ id }) as Camera);

function arrangementOf(values: Record<string, unknown>) {
  const moved = vi.fn();
  const set = (name: string, value: unknown) => (values[name] = value);
  return { moved, arrangement: new Arrangement({ get: (name: string) => values[name], set } as unknown as Preferences, moved) };
}

test.each<[string, unknown, number[], number[], number[]]>([
  // order, shown, their order after the move, kept
  ["no order yet", undefined, [1, 2, 3], [2, 1, 3], [2, 1, 3]],
  ["a new camera", [2, 1], [1, 2, 3], [3, 2, 1], [3, 2, 1]],
  ["some are not shown, and keep their places", [4, 1, 5, 2], [1, 2], [2, 1], [4, 2, 5, 1]],
  ["an order that is none", "1,2", [1, 2], [2, 1], [2, 1]],
  ["ids that are none", [null, 2, "1"], [1, 2], [1, 2], [1, 2]],
])("the user's own order is kept: %s", (_what, order, shown, ids, kept) => {
  const values: Record<string, unknown> = { "wall.order": order };
  const { arrangement } = arrangementOf(values);
  arrangement.moved(ids);
  expect(values["wall.order"]).toEqual(kept);
  expect(arrangement.inOrder(cameras(...shown)).map(({ id }) => id)).toEqual(ids);
});

test("what is changed in a layout stays until another is shown, keeps what cannot be seen, and is none of the user's own", () => {
  const values: Record<string, unknown> = { "wall.layout": "3", "wall.order": [1, 2, 3] };
  const { arrangement, moved } = arrangementOf(values);
  const layout = { id: "a", name: "Gates", grid: "2", cameras: [3, 7, 1] } as const;
  arrangement.show(layout);
  const state = () => [arrangement.grid, arrangement.idsOf(cameras(1, 3)), arrangement.isChanged];
  expect(state()).toEqual(["2", [3, 7, 1], false]);
  arrangement.moved([1, 3]);
  arrangement.chooseGrid("first");
  expect([...state(), moved.mock.calls.length]).toEqual(["first", [1, 7, 3], true, 1]);
  arrangement.show(layout);
  expect(state()).toEqual(["2", [3, 7, 1], false]);
  arrangement.show(null);
  expect([...state(), values]).toEqual(["3", [1, 3], false, { "wall.layout": "3", "wall.order": [1, 2, 3] }]);
});

test.each(["9", undefined, 2, { toString: null }])("a grid that is none is the usual one: %j", (grid) => {
  expect(arrangementOf({ "wall.layout": grid }).arrangement.grid).toBe("auto");
});
