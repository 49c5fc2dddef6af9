// SPDX-License-Identifier: Apache-2.0

import { planOf, showing, withCamera, withLayout, withoutCamera, type Cells } from "../../../../client/src/ui/events/stage_layout";

describe("the cells of the stage", () => {
  const four = planOf(2, [1, null, 3], 9);
  const full = planOf(2, [1, 2, 3, 4], 4);
  const nine = planOf(3, [1, 2, 3, 4, 5], 9);

  test.each<[string, { layout: number; cells: Cells } | null, number, Cells]>([
    ["cells that a link has too few, too many or twice of", planOf(2, [1, 1, null, 2, 5], 9), 2, [1, null, null, 2]],
    ["no more cameras than may be played", planOf(3, [1, 2, 3, 4, 5], 4), 3, [1, 2, 3, 4, null, null, null, null, null]],
    ["a camera goes into the first empty cell", withCamera(four, 7, 9), 2, [1, 7, 3, null]],
    ["one that is there stays where it is", withCamera(four, 3, 9), 2, [1, null, 3, null]],
    ["the layout grows where there is no empty cell", withCamera(planOf(1, [1], 9), 2, 9), 2, [1, 2, null, null]],
    ["but holds no more than may be played", withCamera(full, 5, 4), 0, []],
    ["an event's camera takes the place of the active one", showing(full, 5, 3, 4), 2, [1, 2, 5, 4]],
    ["or an empty cell", showing(four, 5, 3, 9), 2, [1, 5, 3, null]],
    ["a cell is emptied, the others stay in place", withoutCamera(four, 1), 2, [null, null, 3, null]],
    ["a smaller layout keeps the first, and the active one", withLayout(nine, 2, 5, 9), 2, [1, 2, 3, 5]],
    ["a larger one keeps the order", withLayout(four, 3, null, 9), 3, [1, 3, null, null, null, null, null, null, null]],
  ])("%s", (_, plan, layout, cells) => {
    expect(plan ?? { layout: 0, cells: [] }).toEqual({ layout, cells });
  });
});
