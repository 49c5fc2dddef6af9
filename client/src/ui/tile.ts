// SPDX-License-Identifier: Apache-2.0
//
// One camera on the wall: its picture, and below it a bar with state, name and snapshot button.

import { MjpegSource } from "../live/mjpeg_source";
import { SnapshotSource } from "../live/snapshot_source";
import type { LiveSource } from "../live/source";
import type { Turns } from "../live/turns";
import type { Camera, Server } from "../wire/server";
import { iconButton } from "./button";
import { element, setText } from "./dom";
import { canShow, Picture, type PictureState } from "./picture";

/** How a tile gets its pictures. */
export type TileMode = "off" | "poll" | "stream-small" | "stream-full";

export interface TileActions {
  open(camera: Camera): void;
  snapshot(camera: Camera): void;
}

export class Tile {
  readonly root: HTMLElement;
  readonly camera: Camera;
  readonly picture: Picture;
  readonly #open: HTMLButtonElement;
  readonly #state = element("span", { class: "tile-state" });
  readonly #sources: Record<Exclude<TileMode, "off">, LiveSource>;

  constructor(camera: Camera, server: Server, turns: Turns, actions: TileActions) {
    this.camera = camera;
    this.#sources = {
      poll: new SnapshotSource(server, camera.id, turns),
      "stream-small": new MjpegSource(server, camera.id, true),
      "stream-full": new MjpegSource(server, camera.id, false),
    };
    this.#open = element("button", { type: "button", class: "tile-open" });
    this.picture = new Picture(camera, () => this.#showState());
    this.#open.append(this.picture.root);
    this.#open.addEventListener("click", () => actions.open(camera));
    const bar = element(
      "div",
      { class: "tile-bar" },
      element("span", { class: "dot" }),
      element("span", { class: "tile-name", title: camera.name }, camera.name),
      this.#state,
    );
    if (canShow(camera)) {
      bar.append(iconButton("snapshot", `Snapshot of ${camera.name}`, () => actions.snapshot(camera), "S"));
    }
    this.root = element("article", { class: "tile", "data-camera": String(camera.id) }, this.#open, bar);
    this.picture.refresh();
  }

  set mode(mode: TileMode) {
    if (mode === "off" || !canShow(this.camera)) this.picture.feed.stop();
    else this.picture.feed.play(this.#sources[mode]);
    this.#showState();
  }

  get streams(): boolean {
    return this.picture.feed.source?.everyMs === 0;
  }

  focus(): void {
    this.#open.focus();
  }

  #showState(): void {
    const state = this.picture.state();
    this.root.dataset["state"] = state.kind;
    const word = this.#wordFor(state);
    setText(this.#state, word);
    this.#open.setAttribute("aria-label", `${this.camera.name}, ${word}: open large`);
  }

  /** Short, since the picture itself carries the whole sentence. */
  #wordFor(state: PictureState): string {
    const everyMs = this.picture.feed.source?.everyMs ?? 0;
    switch (state.kind) {
      case "unavailable":
        return "not available yet";
      case "lost":
        return "no signal";
      case "live":
        return everyMs > 0 ? `live, every ${everyMs / 1000} s` : "live";
      case "idle":
        return "";
      case "connecting":
        return "connecting";
    }
  }
}
