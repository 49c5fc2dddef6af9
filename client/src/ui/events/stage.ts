// SPDX-License-Identifier: Apache-2.0
//
// The pictures of the cameras that are played in step, in one cell, four or nine; as many at most as may be played at
// once.

import { kStillWidths, type ScrubRequest } from "../../playback/scrub_stills";
import type { SyncPlayback } from "../../playback/sync_playback";
import type { Camera, Snapshot } from "../../wire/camera";
import type { Footage } from "../../wire/footage";
import type { Still } from "../../wire/recordings";
import { element } from "../widgets/dom";
import { PlayerTile } from "./player_tile";
import { emptyCell } from "./stage_cell";
import { inCell, planOf, showing, withCamera, withLayout, withoutCamera, type StageLayout, type StagePlan } from "./stage_layout";

export class Stage {
  readonly root = element("div", { class: "stage", role: "group", "aria-label": "Pictures" });
  readonly maxPlayers: number;
  readonly #playback: SyncPlayback;
  readonly #changed: () => void;
  readonly #tiles = new Map<number, PlayerTile>();
  #cameras: readonly Camera[] = [];
  #plan: StagePlan = planOf(1, [], 1);
  #large: number | null = null;

  /** `changed` is called when other cameras are on the stage, or they are in other places. */
  constructor(playback: SyncPlayback, maxPlayers: number, changed: () => void) {
    this.#playback = playback;
    this.maxPlayers = maxPlayers;
    this.#changed = changed;
  }

  /** All that may be put on the stage. */
  setCameras(cameras: readonly Camera[]): void {
    this.#cameras = cameras;
    this.#arrange();
  }

  get plan(): StagePlan {
    return this.#plan;
  }

  get cameras(): number[] {
    return this.#plan.cells.filter((camera) => camera !== null);
  }

  /** The camera that is shown alone in a layout of several; null for none. */
  get large(): number | null {
    return this.#large;
  }

  /** The one that is dragged, enlarged and stepped through. */
  get active(): number | null {
    return this.#large ?? this.#playback.active?.camera ?? null;
  }

  show(plan: StagePlan, large: number | null = null): void {
    this.#plan = planOf(plan.layout, plan.cells, this.maxPlayers);
    this.#large = large !== null && this.cameras.includes(large) && plan.layout > 1 ? large : null;
    this.#playback.setCameras(this.cameras);
    this.#arrange();
    this.#changed();
  }

  setLayout(layout: StageLayout): void {
    this.show(withLayout(this.#plan, layout, this.active, this.maxPlayers));
  }

  /** Gives the camera a player in the layout as it is; the active camera makes room where there is none. */
  include(camera: number): void {
    if (this.cameras.includes(camera)) return;
    this.show(showing(this.#plan, camera, this.active, this.maxPlayers));
  }

  /** Adds the camera, in place of the active one where no player is left, or closes it unless it is the only one. */
  toggle(camera: number): void {
    if (this.cameras.includes(camera)) return this.remove(camera);
    this.show(withCamera(this.#plan, camera, this.maxPlayers) ?? showing(this.#plan, camera, this.active, this.maxPlayers));
  }

  remove(camera: number): void {
    if (this.cameras.length > 1) this.show(withoutCamera(this.#plan, camera), this.#large === camera ? null : this.#large);
  }

  /** Shows a camera alone, or all again. False where there is but one cell. */
  enlarge(camera: number | null = this.active): boolean {
    if (this.#plan.layout === 1 || camera === null) return false;
    this.#large = this.#large === null ? camera : null;
    if (this.#large !== null) this.#playback.setActive(camera);
    this.#arrange();
    this.#changed();
    return true;
  }

  refresh(): void {
    for (const [camera, tile] of this.#tiles) {
      tile.isActive = this.cameras.length > 1 && camera === this.active;
      tile.refresh(this.#playback.playheadMs);
    }
  }

  /** The active camera's; null where nothing is shown of it. */
  snapshot(): { camera: Camera; picture: Promise<Snapshot> } | null {
    const camera = this.#cameras.find(({ id }) => id === this.active);
    const picture = camera ? this.#tiles.get(camera.id)?.snapshot() : null;
    return camera && picture ? { camera, picture } : null;
  }

  /** What is to be fetched for a time: the active camera first. */
  stillsAt(atMs: number, find: (camera: number) => Footage | null): ScrubRequest[] {
    const cameras = this.#large === null ? this.cameras : [this.#large];
    const order = [...cameras].sort((one, other) => Number(other === this.active) - Number(one === this.active));
    return order.map((camera) => {
      const widthPx = this.#tiles.get(camera)?.widthPx ?? 0;
      const width = kStillWidths.find((each) => each >= widthPx) ?? kStillWidths.at(-1)!;
      return { camera, atMs, widthPx: width, footage: find(camera) };
    });
  }

  async showStill(camera: number, still: Still | null): Promise<void> {
    await this.#tiles.get(camera)?.showStill(still);
    this.refresh();
  }

  /** Ends what `showStill` began. */
  showPlayers(): void {
    for (const tile of this.#tiles.values()) tile.showPlayer();
    this.refresh();
  }

  #arrange(): void {
    const tracks = this.#playback.tracks;
    for (const [camera, tile] of this.#tiles) if (!tracks.some(({ player }) => player === tile.player)) this.#tiles.delete(camera);
    // A paused player does not draw its picture again, so its tile stays.
    for (const { camera, player } of tracks) if (!this.#tiles.has(camera)) this.#tiles.set(camera, this.#newTile(camera, player));
    for (const [camera, tile] of this.#tiles) tile.isLarge = camera === this.#large;
    this.root.dataset["layout"] = String(this.#plan.layout);
    this.root.dataset["players"] = String(tracks.length);
    this.root.classList.toggle("has-large", this.#large !== null);
    this.root.replaceChildren(...this.#plan.cells.map((camera, at) => this.#tiles.get(camera ?? 0)?.root ?? this.#emptyCell(at)));
    this.refresh();
  }

  #newTile(camera: number, player: PlayerTile["player"]): PlayerTile {
    const name = this.#cameras.find(({ id }) => id === camera)?.name ?? `Camera ${camera}`;
    return new PlayerTile(name, player, {
      again: () => this.#playback.play(),
      choose: () => this.#playback.setActive(camera),
      enlarge: () => this.enlarge(camera),
      close: () => this.remove(camera),
    });
  }

  #emptyCell(at: number): HTMLElement {
    const others = this.#cameras.filter(({ id }) => !this.cameras.includes(id));
    const isFull = this.cameras.length >= this.maxPlayers;
    const full = isFull ? `No more than ${this.maxPlayers} at once` : "";
    return emptyCell(others, full, (camera) => this.show(inCell(this.#plan, at, camera)));
  }
}
