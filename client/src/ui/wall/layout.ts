// SPDX-License-Identifier: Apache-2.0
//
// The layouts of the wall: how many columns, and how wide a tile is.

/** All cameras on the screen, the first of them large, or this many columns and rows. */
export const kLayoutChoices = ["auto", "first", "1", "2", "3", "4"] as const;
export type LayoutChoice = (typeof kLayoutChoices)[number];

export interface Space {
  widthPx: number;
  heightPx: number;
  /** Between tiles. */
  gapPx: number;
  /** The height of a tile's bar with name and state, below its picture. */
  barPx: number;
}

/** Narrower screens show one column, whatever was chosen. */
const kPhoneWidthPx = 640;
const kMinTilePx = 240;
const kPictureRatio = 16 / 9;
/** For the layout with one large camera; that one takes all columns but one, and as many rows. */
const kColumnsBesideFirst = 4;

/** Columns and width of a tile; what does not fit on the screen is scrolled. */
export function arrange(tiles: number, choice: LayoutChoice, space: Space): { columns: number; tilePx: number } {
  const widthFor = (columns: number) => Math.floor((space.widthPx - space.gapPx * (columns - 1)) / columns);
  const widthToFit = (columns: number, rows: number) => {
    const heightPx = (space.heightPx - space.gapPx * (rows - 1)) / rows - space.barPx;
    return Math.min(widthFor(columns), Math.floor(heightPx * kPictureRatio));
  };

  if (space.widthPx < kPhoneWidthPx) return { columns: 1, tilePx: widthFor(1) };
  if (choice === "first") {
    const large = kColumnsBesideFirst - 1;
    const rows = large + Math.max(0, Math.ceil((tiles - 1 - large) / kColumnsBesideFirst));
    const columns = kColumnsBesideFirst;
    return { columns, tilePx: Math.max(widthToFit(columns, rows), Math.min(kMinTilePx, widthFor(columns))) };
  }
  if (choice !== "auto") {
    const side = Number(choice);
    return { columns: side, tilePx: Math.max(widthToFit(side, side), Math.min(kMinTilePx, widthFor(side))) };
  }
  let best = { columns: 1, tilePx: widthToFit(1, tiles) };
  for (let columns = 2; columns <= tiles; columns += 1) {
    const tilePx = widthToFit(columns, Math.ceil(tiles / columns));
    if (tilePx > best.tilePx) best = { columns, tilePx };
  }
  if (best.tilePx >= kMinTilePx) return best;
  const columns = Math.max(1, Math.floor((space.widthPx + space.gapPx) / (kMinTilePx + space.gapPx)));
  return { columns, tilePx: widthFor(columns) };
}
