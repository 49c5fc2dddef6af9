// SPDX-License-Identifier: Apache-2.0
//
// One camera over the whole window, at the camera's full picture.

import { MjpegSource } from "../live/mjpeg_source";
import type { Camera, Server } from "../wire/server";
import { iconButton } from "./button";
import { element, setText } from "./dom";
import { canShow, Picture } from "./picture";
import { sentenceOf } from "./text";

export interface LargeViewActions {
  back(): void;
  /** Goes on to the next camera (1) or the previous one (-1). */
  step(by: 1 | -1): void;
  snapshot(): void;
  fullScreen(): void;
}

export class LargeView {
  readonly root: HTMLElement;
  readonly camera: Camera;
  readonly #picture: Picture;
  readonly #source: MjpegSource;
  readonly #state = element("span", { class: "large-state" });
  readonly #description = element("span", { class: "large-description" });
  readonly #back: HTMLButtonElement;
  readonly #follow = () => this.#playIfSeen();

  /** `still` is what the wall shows of this camera, as a first picture until the large one comes. */
  constructor(camera: Camera, server: Server, actions: LargeViewActions, still?: Picture) {
    this.camera = camera;
    this.#source = new MjpegSource(server, camera.id, false);
    this.#picture = new Picture(camera, () => this.#showState());
    if (still?.hasPicture) this.#picture.showStill(still.canvas);
    this.#back = iconButton("back", "Back to all cameras", () => actions.back(), "Esc");
    const buttons = [
      iconButton("previous", "Previous camera", () => actions.step(-1), "←"),
      iconButton("next", "Next camera", () => actions.step(1), "→"),
      ...(canShow(camera) ? [iconButton("snapshot", "Snapshot", () => actions.snapshot(), "S")] : []),
      iconButton("fullScreen", "Full screen", () => actions.fullScreen(), "F"),
    ];
    const bar = element(
      "header",
      { class: "bar" },
      this.#back,
      element("span", { class: "dot" }),
      element("h1", { class: "large-name" }, camera.name),
      this.#state,
      this.#description,
      element("div", { class: "large-buttons" }, ...buttons),
    );
    this.root = element("section", { class: "large", "aria-label": camera.name }, bar, this.#picture.root);
    document.addEventListener("visibilitychange", this.#follow);
    this.#playIfSeen();
    this.#picture.refresh();
  }

  focus(): void {
    this.#back.focus({ preventScroll: true });
  }

  /** Brings the screen up to date with the clock. */
  refresh(): void {
    this.#picture.refresh();
    this.#showState();
  }

  close(): void {
    document.removeEventListener("visibilitychange", this.#follow);
    this.#picture.feed.stop();
    this.root.remove();
  }

  #playIfSeen(): void {
    if (!canShow(this.camera)) return;
    if (document.hidden) this.#picture.feed.stop();
    else this.#picture.feed.play(this.#source);
  }

  #showState(): void {
    const state = this.#picture.state();
    this.root.dataset["state"] = state.kind;
    setText(this.#state, state.kind === "unavailable" ? "not available yet" : sentenceOf(state));
    setText(this.#description, this.#picture.description());
  }
}
