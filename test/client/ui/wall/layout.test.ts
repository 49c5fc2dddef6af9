// SPDX-License-Identifier: Apache-2.0
//
// The arrangement of tiles on the wall.

import { arrange } from "../../../../client/src/ui/wall/layout";

test.each([
  // tiles, choice, width × height, columns, width of a tile
  [1, "auto", 1440, 850, 1, 1440],
  [4, "auto", 1440, 850, 2, 698],
  [9, "auto", 1440, 850, 3, 445],
  [2, "auto", 700, 1200, 1, 700],
  [64, "auto", 1440, 850, 5, 284],
  [4, "2", 1440, 850, 2, 698],
  [4, "3", 1440, 850, 3, 445],
  [9, "1", 1440, 850, 1, 1440],
  [16, "4", 1440, 850, 4, 319],
  [4, "first", 1440, 850, 4, 357],
  [8, "first", 1440, 850, 4, 319],
  [9, "3", 390, 800, 1, 390],
  [9, "3", 1440, 200, 3, 240],
] as const)("%i tiles, layout %s, %i × %i", (tiles, choice, widthPx, heightPx, columns, tilePx) => {
  expect(arrange(tiles, choice, { widthPx, heightPx, gapPx: 4, barPx: 30 })).toEqual({ columns, tilePx });
});
