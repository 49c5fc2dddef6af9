// SPDX-License-Identifier: Apache-2.0
//
// Which camera is in which cell of the stage.

/** How many cells a row and a column have. */
export const kStageLayouts = [1, 2, 3] as const;
export type StageLayout = (typeof kStageLayouts)[number];

/** A cell without a camera is null. */
export type Cells = readonly (number | null)[];

export interface StagePlan {
  layout: StageLayout;
  /** As many as the layout has. */
  cells: Cells;
}

/** The smallest layout with room for so many. */
export function layoutFor(cameras: number): StageLayout {
  return kStageLayouts.find((side) => side * side >= cameras) ?? 3;
}

/** The plan with these cells, cut or filled up with empty ones, of which at most `maxPlayers` have a camera. */
export function planOf(layout: StageLayout, cells: Cells, maxPlayers: number): StagePlan {
  const taken = new Set<number>();
  const admit = (camera: number | null) => {
    if (camera === null || taken.has(camera) || taken.size >= maxPlayers) return null;
    taken.add(camera);
    return camera;
  };
  return { layout, cells: Array.from({ length: layout * layout }, (_, at) => admit(cells[at] ?? null)) };
}

/** Another layout: cameras keep their order and lose the empty cells between them; `first` must stay. */
export function withLayout({ cells }: StagePlan, layout: StageLayout, first: number | null, maxPlayers: number): StagePlan {
  const cameras = cells.filter((camera) => camera !== null);
  const room = Math.min(layout * layout, maxPlayers);
  const isLost = first !== null && cameras.indexOf(first) >= room;
  return planOf(layout, isLost ? [...cameras.slice(0, room - 1), first] : cameras, maxPlayers);
}

/**
 * Puts the camera into an empty cell; where there is none, into a larger layout. Null where nothing has room for it.
 */
export function withCamera(plan: StagePlan, camera: number, maxPlayers: number): StagePlan | null {
  const cameras = plan.cells.filter((one) => one !== null);
  if (plan.cells.includes(camera)) return plan;
  if (cameras.length >= maxPlayers) return null;
  const empty = plan.cells.indexOf(null);
  if (empty >= 0) return inCell(plan, empty, camera);
  return planOf(layoutFor(cameras.length + 1), [...cameras, camera], maxPlayers);
}

/** Shows the camera in the layout as it is: in an empty cell, else in place of `replaced`. */
export function showing(plan: StagePlan, camera: number, replaced: number | null, maxPlayers: number): StagePlan {
  if (plan.cells.includes(camera)) return plan;
  const isFull = plan.cells.filter((one) => one !== null).length >= maxPlayers;
  const empty = isFull ? -1 : plan.cells.indexOf(null);
  return inCell(plan, empty >= 0 ? empty : Math.max(0, plan.cells.indexOf(replaced)), camera);
}

/** Puts the camera into that cell. */
export function inCell(plan: StagePlan, at: number, camera: number): StagePlan {
  return { ...plan, cells: plan.cells.map((one, cell) => (cell === at ? camera : one)) };
}

/** Leaves the camera's cell empty. */
export function withoutCamera(plan: StagePlan, camera: number): StagePlan {
  return { ...plan, cells: plan.cells.map((one) => (one === camera ? null : one)) };
}
