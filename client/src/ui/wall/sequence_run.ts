// SPDX-License-Identifier: Apache-2.0
//
// A sequence that runs: which layout is shown, which comes next, and when.

import type { SavedLayout, SavedLayouts, Sequence } from "./saved_layouts";

/** The id after (1) or before (-1) `current`, the last one followed by the first; null where none can be shown. */
export function stepFrom(
  ids: readonly string[],
  canShow: (id: string) => boolean,
  current: string | null,
  by: 1 | -1,
): string | null {
  const at = current === null ? -1 : ids.indexOf(current);
  const from = at < 0 && by < 0 ? ids.length : at;
  for (let steps = 1; steps <= ids.length; steps += 1) {
    const id = ids[(from + by * steps + 2 * ids.length) % ids.length]!;
    if (canShow(id)) return id;
  }
  return null;
}

export class SequenceRun {
  readonly id: string;
  readonly #saved: SavedLayouts;
  readonly #canShow: (layout: SavedLayout) => boolean;
  readonly #changed: () => void;
  #current: string | null = null;
  #isPaused = false;
  #isHidden = false;
  #timer: ReturnType<typeof setTimeout> | undefined;

  /**
   * Begins with `refresh`. `canShow` says whether the account may see any of a layout; `changed` is called whenever
   * another layout is to be shown, or the sequence is paused or continues.
   */
  constructor(id: string, saved: SavedLayouts, canShow: (layout: SavedLayout) => boolean, changed: () => void) {
    this.id = id;
    this.#saved = saved;
    this.#canShow = canShow;
    this.#changed = changed;
  }

  /** As it is saved now; null where it was deleted. */
  get sequence(): Sequence | null {
    return this.#saved.sequences.find(({ id }) => id === this.id) ?? null;
  }

  /** Those that can be shown. */
  get layouts(): SavedLayout[] {
    const all = new Map(this.#saved.layouts.map((layout) => [layout.id, layout]));
    return (this.sequence?.layouts ?? []).flatMap((id) => all.get(id) ?? []).filter(this.#canShow);
  }

  /** The one that is shown; null where none can be. */
  get current(): SavedLayout | null {
    return this.layouts.find(({ id }) => id === this.#current) ?? null;
  }

  /** The one that follows; null where it is the same. */
  get next(): SavedLayout | null {
    const id = this.#idAt(1);
    return id === this.#current ? null : (this.layouts.find((one) => one.id === id) ?? null);
  }

  get isPaused(): boolean {
    return this.#isPaused;
  }

  set isPaused(isPaused: boolean) {
    if (isPaused === this.#isPaused) return;
    this.#isPaused = isPaused;
    this.#wait();
    this.#changed();
  }

  /** Nobody sees the page: the sequence waits, and continues later unless it is paused. */
  set isHidden(isHidden: boolean) {
    this.#isHidden = isHidden;
    this.#wait();
  }

  step(by: 1 | -1): void {
    this.#current = this.#idAt(by);
    this.#wait();
    this.#changed();
  }

  /** Call it when layouts, sequences or what the account may see have changed: leaves a layout that cannot be shown. */
  refresh(): void {
    if (this.current === null && this.#idAt(1) !== this.#current) this.step(1);
  }

  close(): void {
    clearTimeout(this.#timer);
  }

  #idAt(by: 1 | -1): string | null {
    const shown = new Set(this.layouts.map(({ id }) => id));
    return stepFrom(this.sequence?.layouts ?? [], (id) => shown.has(id), this.#current, by);
  }

  /** The layout is shown for the whole time once more. */
  #wait(): void {
    clearTimeout(this.#timer);
    const { sequence } = this;
    if (this.#isPaused || this.#isHidden || !sequence) return;
    this.#timer = setTimeout(() => this.step(1), sequence.dwellS * 1000);
  }
}
