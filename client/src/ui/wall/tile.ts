// SPDX-License-Identifier: Apache-2.0
//
// One camera on the wall: its picture, and below it a bar with state, name and snapshot button.

import { SnapshotSource } from "../../live/snapshot_source";
import { StreamSource } from "../../live/stream_source";
import type { Unplayable } from "../../live/unplayable";
import type { Camera } from "../../wire/camera";
import type { Semaphore } from "../../wire/semaphore";
import type { Server } from "../../wire/server";
import { LivePicture, type PictureState } from "../camera/live_picture";
import { recordingsButtons } from "../camera/recordings_buttons";
import { iconButton } from "../widgets/button";
import { element, setText } from "../widgets/dom";
import { signalText } from "../widgets/text";

/** How a tile gets its pictures. */
export type TileMode = "off" | "poll" | "stream-small" | "stream-full";

export interface TileActions {
  open(camera: Camera): void;
  snapshot(camera: Camera): void;
  /** Takes the tile of a camera that is absent off the wall. */
  dismiss(camera: Camera): void;
}

export class Tile {
  readonly root: HTMLElement;
  readonly camera: Camera;
  readonly picture: LivePicture;
  readonly #server: Server;
  readonly #open: HTMLButtonElement;
  readonly #state = element("span", { class: "tile-state" });
  readonly #stills: SnapshotSource;
  readonly #streams: Record<Exclude<TileMode, "off" | "poll">, StreamSource>;

  /** `absence` says why the camera is absent, and is empty for one that is there. */
  constructor(camera: Camera, absence: string, server: Server, semaphore: Semaphore, actions: TileActions) {
    this.camera = camera;
    this.#server = server;
    this.#stills = new SnapshotSource(server, camera, semaphore);
    this.#streams = {
      "stream-small": new StreamSource(server, camera, true, this.#stills),
      "stream-full": new StreamSource(server, camera, false, this.#stills),
    };
    this.#open = element("button", { type: "button", class: "tile-open" });
    this.picture = new LivePicture(
      () => this.unplayable,
      () => server.signalLosses.of(camera),
      () => this.#showState(),
      false,
    );
    this.picture.absence = absence;
    this.picture.reported = () => server.alerts.kindAt(camera);
    this.#open.disabled = absence !== "";
    this.#open.addEventListener("click", () => actions.open(camera));
    // The button lies over the picture, whose messages are not its label.
    const picture = element("div", { class: "tile-picture" }, this.picture.root, this.#open);
    const bar = element(
      "div",
      { class: "tile-bar" },
      element("span", { class: "dot" }),
      element("span", { class: "tile-name", title: camera.name }, camera.name),
      this.#state,
      ...(absence
        ? [iconButton("close", `Take ${camera.name} off the wall`, () => actions.dismiss(camera))]
        : [
            ...recordingsButtons(camera),
            iconButton("snapshot", `Snapshot of ${camera.name}`, () => actions.snapshot(camera), "S"),
          ]),
    );
    this.root = element("article", { class: "tile", "data-camera": String(camera.id) }, picture, bar);
    this.picture.refresh();
  }

  set mode(mode: TileMode) {
    if (mode === "off") this.picture.feed.stop();
    else this.picture.feed.play(mode === "poll" ? this.#stills : this.#streams[mode]);
    this.#showState();
  }

  /** Why the tile cannot play a stream; null when it plays one, or could. */
  get unplayable(): Unplayable | null {
    return this.#streams["stream-small"].unplayable ?? this.#streams["stream-full"].unplayable;
  }

  get isStreaming(): boolean {
    return this.picture.feed.source?.pollIntervalMs === 0;
  }

  focus(): void {
    this.#open.focus();
  }

  #showState(): void {
    const state = this.picture.state();
    this.root.dataset["state"] = state.kind;
    const text = this.#stateText(state);
    setText(this.#state, text);
    const does = state.kind === "absent" ? state.reason : `${text}: open large`;
    this.#open.setAttribute("aria-label", `${this.camera.name}, ${does}`);
  }

  /** Short, since the picture itself shows the whole sentence. */
  #stateText(state: PictureState): string {
    switch (state.kind) {
      case "unavailable":
        return "not available";
      case "lost":
        return this.#server.signalLosses.of(this.camera)?.cause ?? "no signal";
      case "live":
      case "connecting":
        return signalText(state, this.picture.feed.source?.pollIntervalMs);
      case "idle":
      case "absent":
        return "";
    }
  }
}
