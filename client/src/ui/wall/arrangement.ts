// SPDX-License-Identifier: Apache-2.0
//
// Grid and order of the wall: the user's own, kept for the next visit, or those of a saved layout, whose changes last
// until another is shown.

import type { Camera } from "../../wire/camera";
import type { Preferences } from "../../wire/preferences";
import type { TileOrder } from "./grid";
import { kLayoutChoices, type LayoutChoice } from "./layout";
import type { SavedLayout } from "./saved_layouts";

const kGridName = "wall.layout";
const kOrderName = "wall.order";

export class Arrangement implements TileOrder {
  readonly #preferences: Preferences;
  readonly #moved: () => void;
  #layout: SavedLayout | null = null;
  /** The layout with what was changed since. */
  #changed: SavedLayout | null = null;

  /** `moved` is called when the user has changed the order of a layout's tiles. */
  constructor(preferences: Preferences, moved: () => void) {
    this.#preferences = preferences;
    this.#moved = moved;
  }

  /** Null for the user's own. */
  get layout(): SavedLayout | null {
    return this.#layout;
  }

  /** Whether the wall is not what the layout is. */
  get isChanged(): boolean {
    return JSON.stringify(this.#layout) !== JSON.stringify(this.#changed);
  }

  get grid(): LayoutChoice {
    if (this.#changed) return this.#changed.grid;
    const preferred = this.#preferences.get(kGridName);
    return kLayoutChoices.find((choice) => choice === preferred) ?? "auto";
  }

  /** Shows a layout as it was saved, or null for the user's own arrangement. */
  show(layout: SavedLayout | null): void {
    this.#layout = this.#changed = layout;
  }

  chooseGrid(grid: LayoutChoice): void {
    if (this.#changed) this.#changed = { ...this.#changed, grid };
    else this.#preferences.set(kGridName, grid);
  }

  /** Cameras that have no place in the order come after the others, as the server lists them. */
  inOrder(cameras: readonly Camera[]): Camera[] {
    const order = this.#order;
    const place = ({ id }: Camera) => (order.includes(id) ? order.indexOf(id) : order.length);
    return [...cameras].sort((one, other) => place(one) - place(other));
  }

  /** The ids of a layout that has these cameras; of one that is shown, those that cannot be seen now as well. */
  idsOf(cameras: readonly Camera[]): readonly number[] {
    return this.#changed ? this.#changed.cameras : this.inOrder(cameras).map(({ id }) => id);
  }

  /** `ids` may be some of the cameras: among those that are not shown now, they keep the places that they have. */
  moved(ids: readonly number[]): void {
    const rest = [...ids];
    const merged = this.#order.map((id) => (ids.includes(id) ? rest.shift()! : id));
    if (!this.#changed) return this.#preferences.set(kOrderName, [...merged, ...rest]);
    this.#changed = { ...this.#changed, cameras: merged };
    this.#moved();
  }

  get #order(): readonly number[] {
    if (this.#changed) return this.#changed.cameras;
    const preferred = this.#preferences.get(kOrderName);
    return Array.isArray(preferred) ? preferred.filter((id): id is number => typeof id === "number") : [];
  }
}
