// SPDX-License-Identifier: Apache-2.0
//
// One camera's picture with the message that lies over it while it is not live; used by the tiles and the large view.

import { Feed } from "../live/feed";
import type { SignalState } from "../live/signal_state";
import { kVideoTypeMjpeg, type Camera } from "../wire/server";
import { draw, element, setText } from "./dom";
import { icon } from "./icons";
import { sentenceOf } from "./text";

export type PictureState = SignalState | { kind: "unavailable" };

/** Whether this client can show the camera's live view and take snapshots of it. */
export function canShow(camera: Camera): boolean {
  return camera.video_type === kVideoTypeMjpeg;
}

export class Picture {
  readonly canvas = element("canvas", { "aria-hidden": "true" });
  readonly feed: Feed;
  readonly root: HTMLElement;
  readonly #camera: Camera;
  readonly #changed: () => void;
  readonly #sentence = element("p", { class: "message-sentence" });
  readonly #reason = element("p", { class: "message-reason" });
  #frames = 0;
  #rateSinceMs = performance.now();
  #framesPerSecond = 0;

  /** `changed` is called after the state on the screen changed; call `refresh` once when you are ready for it. */
  constructor(camera: Camera, changed: () => void) {
    this.#camera = camera;
    this.#changed = changed;
    this.feed = new Feed(
      ({ image }) => {
        this.showStill(image);
        this.#frames += 1;
        image.close();
      },
      () => this.refresh(),
    );
    const message = element(
      "div",
      { class: "message" },
      element("div", { class: "spinner" }),
      icon(canShow(camera) ? "noSignal" : "camera"),
      this.#sentence,
      this.#reason,
    );
    this.root = element("div", { class: "picture" }, this.canvas, message);
  }

  state(): PictureState {
    return canShow(this.#camera) ? this.feed.state() : { kind: "unavailable" };
  }

  get hasPicture(): boolean {
    return this.root.classList.contains("has-picture");
  }

  /** Draws a picture that is not news: the state stays as it is. */
  showStill(image: ImageBitmap | VideoFrame | HTMLCanvasElement): void {
    draw(this.canvas, image);
    this.root.classList.add("has-picture");
  }

  /** Size and rate of what is shown, for people who set up cameras; empty while nothing is live. */
  description(): string {
    const nowMs = performance.now();
    const elapsedMs = nowMs - this.#rateSinceMs;
    if (elapsedMs >= 1000) {
      this.#framesPerSecond = Math.round((this.#frames * 1000) / elapsedMs);
      this.#frames = 0;
      this.#rateSinceMs = nowMs;
    }
    if (this.state().kind !== "live" || this.#framesPerSecond === 0) return "";
    return `${this.canvas.width} × ${this.canvas.height} · ${this.#framesPerSecond} fps`;
  }

  /** Brings the screen up to date with the clock. */
  refresh(): void {
    const state = this.state();
    const sentence = state.kind === "unavailable" ? "live view is not available yet" : sentenceOf(state);
    setText(this.#sentence, sentence.charAt(0).toUpperCase() + sentence.slice(1));
    setText(this.#reason, state.kind === "lost" ? state.reason : "");
    if (this.root.dataset["state"] !== state.kind) {
      this.root.dataset["state"] = state.kind;
      this.#changed();
    }
  }
}
