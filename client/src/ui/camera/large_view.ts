// SPDX-License-Identifier: Apache-2.0
//
// One camera over the whole window, at the camera's full picture.

import { SnapshotSource } from "../../live/snapshot_source";
import { AudioPlayer } from "../../live/audio_player";
import { StreamSource } from "../../live/stream_source";
import { Semaphore } from "../../wire/semaphore";
import type { Camera, Server } from "../../wire/server";
import { iconButton } from "../widgets/button";
import { element, setText } from "../widgets/dom";
import { icon } from "../widgets/icons";
import { notify } from "../widgets/notice";
import { Picture } from "./live_picture";
import { sentenceOf } from "../widgets/text";

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
  readonly #actions: LargeViewActions;
  readonly #picture: Picture;
  readonly #source: StreamSource;
  readonly #sound = new AudioPlayer(() => this.#showSound());
  readonly #soundButton = element("button", {
    type: "button",
    class: "icon-button sound",
    "aria-label": "Sound",
    hidden: true,
  });
  readonly #soundWord = element("span");
  readonly #state = element("span", { class: "large-state" });
  readonly #description = element("span", { class: "large-description" });
  readonly #back: HTMLButtonElement;
  readonly #follow = () => this.#playIfSeen();

  /** `still` is what the wall shows of this camera, as a first picture until the large one comes. */
  constructor(camera: Camera, server: Server, actions: LargeViewActions, still?: Picture) {
    this.camera = camera;
    this.#actions = actions;
    this.#source = new StreamSource(
      server,
      camera,
      false,
      new SnapshotSource(server, camera, new Semaphore(1)),
      this.#sound,
    );
    this.#picture = new Picture(
      () => this.#source.unplayable,
      () => this.#showState(),
      true,
    );
    if (still?.hasPicture) this.#picture.showStill(still.canvas);
    this.#back = iconButton("back", "Back to all cameras", () => actions.back(), "Esc");
    this.#soundButton.append(icon("soundOff"), icon("soundOn"), this.#soundWord);
    this.#soundButton.addEventListener("click", () => this.toggleSound());
    const buttons = [
      this.#soundButton,
      iconButton("previous", "Previous camera", () => actions.step(-1), "←"),
      iconButton("next", "Next camera", () => actions.step(1), "→"),
      iconButton("snapshot", "Snapshot", () => actions.snapshot(), "S"),
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
    this.#sound.switchOff();
    this.root.remove();
  }

  /** Does what the key asks for; false for a key that means nothing here. */
  key(event: KeyboardEvent): boolean {
    switch (event.key.toLowerCase()) {
      case "escape":
        this.#actions.back();
        return true;
      case "arrowleft":
      case "arrowup":
        this.#actions.step(-1);
        return true;
      case "arrowright":
      case "arrowdown":
        this.#actions.step(1);
        return true;
      case "s":
        this.#actions.snapshot();
        return true;
      case "f":
        this.#actions.fullScreen();
        return true;
      case "m":
        this.toggleSound();
        return true;
      default:
        return false;
    }
  }

  /** Call it while the user clicks or presses a key. */
  toggleSound(): void {
    if (this.#sound.trouble) notify(`${this.#sound.trouble}.`);
    if (this.#sound.isOn) this.#sound.switchOff();
    else void this.#sound.switchOn();
  }

  #playIfSeen(): void {
    if (document.hidden) this.#picture.feed.stop();
    else this.#picture.feed.play(this.#source);
  }

  #showState(): void {
    const state = this.#picture.state();
    this.root.dataset["state"] = state.kind;
    const everyMs = this.#picture.feed.source?.everyMs;
    setText(this.#state, state.kind === "unavailable" ? "not available" : sentenceOf(state, everyMs));
    setText(this.#description, this.#picture.description());
    if (this.#source.unplayable && this.#sound.isOn) this.#sound.switchOff();
    this.#showSound();
  }

  #showSound(): void {
    const { exists, isOn, trouble } = this.#sound;
    this.#soundButton.hidden = !exists || this.#source.unplayable !== null;
    this.#soundButton.setAttribute("aria-pressed", String(isOn));
    this.#soundButton.title = trouble || `Turn the sound ${isOn ? "off" : "on"} (M)`;
    setText(this.#soundWord, trouble ? "No sound" : isOn ? "Sound on" : "Sound off");
  }
}
