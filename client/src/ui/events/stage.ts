// SPDX-License-Identifier: Apache-2.0
//
// The pictures of the cameras that are played side by side, as many at most as the session may have players.

import type { SyncPlayback } from "../../playback/sync_playback";
import { element } from "../widgets/dom";
import { PlayerTile } from "./player_tile";

export class Stage {
  readonly root = element("div", { class: "stage" });
  readonly #playback: SyncPlayback;
  readonly #maxPlayers: number;
  readonly #nameOf: (camera: number) => string;
  readonly #changed: () => void;
  #tiles: PlayerTile[] = [];

  /** `changed` is called when other cameras are on the stage. */
  constructor(playback: SyncPlayback, maxPlayers: number, nameOf: (camera: number) => string, changed: () => void) {
    this.#playback = playback;
    this.#maxPlayers = maxPlayers;
    this.#nameOf = nameOf;
    this.#changed = changed;
  }

  get cameras(): number[] {
    return this.#playback.tracks.map(({ camera }) => camera);
  }

  show(cameras: readonly number[]): void {
    const before = this.#tiles;
    this.#playback.setCameras(cameras);
    // A paused player does not draw its picture again, so its tile stays.
    this.#tiles = this.#playback.tracks.map(({ camera, player }) => {
      const kept = before.find((tile) => tile.player === player);
      return kept ?? new PlayerTile(this.#nameOf(camera), player, () => this.#playback.play());
    });
    this.root.dataset["players"] = String(this.#tiles.length);
    this.root.replaceChildren(...this.#tiles.map(({ root }) => root));
    this.#changed();
  }

  /** Gives the camera a player; the last camera makes room where there is none left. */
  include(camera: number): void {
    if (!this.cameras.includes(camera)) this.show([...this.cameras.slice(0, this.#maxPlayers - 1), camera]);
  }

  /** Adds the camera, in place of the first where the stage is full, or removes it unless it is the only one. */
  toggle(camera: number): void {
    if (!this.cameras.includes(camera)) this.show([...this.cameras, camera].slice(-this.#maxPlayers));
    else if (this.cameras.length > 1) this.show(this.cameras.filter((one) => one !== camera));
  }

  refresh(): void {
    for (const tile of this.#tiles) tile.refresh(this.#playback.playheadMs);
  }
}
