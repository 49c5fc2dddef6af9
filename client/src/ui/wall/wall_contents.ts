// SPDX-License-Identifier: Apache-2.0
//
// Which of the account's cameras the wall shows: all, those of a group, those of a saved layout, or those of the layout
// that a sequence has come to.

import type { Camera } from "../../wire/camera";
import type { Preferences } from "../../wire/preferences";
import type { CameraGroup } from "../../wire/recordings";
import type { OpenWall } from "../route";
import { Arrangement } from "./arrangement";
import { SavedLayouts, type SavedLayout } from "./saved_layouts";
import { SequenceRun } from "./sequence_run";

export class WallContents {
  readonly saved: SavedLayouts;
  readonly arrangement: Arrangement;
  /** All of the account; null until they are known. */
  cameras: readonly Camera[] | null = null;
  /** Null until they are known. */
  groups: readonly CameraGroup[] | null = null;
  /** The sequence that is shown. */
  run: SequenceRun | null = null;
  readonly #changed: () => void;
  #open: OpenWall;
  #isHidden = document.hidden;

  /** `changed` is called when something else is to be shown, or its state has changed. */
  constructor(preferences: Preferences, open: OpenWall, changed: () => void) {
    this.saved = new SavedLayouts(preferences, () => {
      this.update();
      changed();
    });
    this.arrangement = new Arrangement(preferences, changed);
    this.#changed = changed;
    this.#open = open;
  }

  get open(): OpenWall {
    return this.#open;
  }

  /** Shows what the address names; `update` has to follow. */
  set open(open: OpenWall) {
    this.#open = open;
    this.run?.close();
    this.run = null;
  }

  set isHidden(isHidden: boolean) {
    this.#isHidden = isHidden;
    if (this.run) this.run.isHidden = isHidden;
  }

  /** Call it when cameras, layouts or sequences may be others. What was changed in a layout stays until it is saved. */
  update(): void {
    const { sequence } = this.#open;
    if (sequence !== null && this.cameras !== null && !this.run) {
      this.run = new SequenceRun(sequence, this.saved, (layout) => this.canShow(layout), () => this.#followRun());
      this.run.isHidden = this.#isHidden;
    }
    this.run?.refresh();
    this.#arrange();
  }

  /** Back to the layout as it is saved, and on with a sequence that was paused. */
  reopen(): void {
    this.arrangement.show(this.arrangement.layout);
    if (this.run) this.run.isPaused = false;
    this.#changed();
  }

  /** Whether the account may see any of its cameras. */
  canShow({ cameras }: SavedLayout): boolean {
    return this.cameras?.some(({ id }) => cameras.includes(id)) ?? false;
  }

  /** On the wall, as the server lists them. */
  get shown(): Camera[] {
    return (this.cameras ?? []).filter((camera) => this.isShown(camera));
  }

  isShown({ id }: Camera): boolean {
    const { group, layout, sequence } = this.#open;
    if (layout !== null || sequence !== null) return this.arrangement.layout?.cameras.includes(id) ?? false;
    if (group === null || this.groups === null) return true;
    return this.groups.find((one) => one.id === group)?.live.includes(id) ?? false;
  }

  /** Why there is no camera on the wall. */
  get whyEmpty(): string {
    const { layout, sequence } = this.#open;
    if (layout !== null && !this.arrangement.layout) return "This layout does not exist or was deleted.";
    if (layout !== null) return "This layout has no cameras that you may watch.";
    if (sequence !== null && !this.run?.sequence) return "This sequence does not exist or was deleted.";
    if (sequence !== null) return "This sequence has no layouts that can be shown.";
    return "This group has no cameras that you may watch.";
  }

  close(): void {
    this.open = { group: null, layout: null, sequence: null };
  }

  #followRun(): void {
    this.#arrange();
    this.#changed();
  }

  #arrange(): void {
    const named = this.saved.layouts.find(({ id }) => id === this.#open.layout) ?? null;
    const layout = this.run ? this.run.current : named;
    if (JSON.stringify(layout) !== JSON.stringify(this.arrangement.layout)) this.arrangement.show(layout);
  }
}
