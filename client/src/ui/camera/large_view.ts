// SPDX-License-Identifier: Apache-2.0
//
// One camera over the whole window, in the camera's full resolution.

import { AudioPlayer } from "../../live/audio_player";
import { SnapshotSource } from "../../live/snapshot_source";
import { StreamSource } from "../../live/stream_source";
import type { Camera } from "../../wire/camera";
import { Semaphore } from "../../wire/semaphore";
import type { Server } from "../../wire/server";
import { iconButton } from "../widgets/button";
import { element, setText } from "../widgets/dom";
import { fullScreenButton, toggleFullScreen } from "../widgets/full_screen";
import { icon } from "../widgets/icons";
import { magnify } from "../widgets/magnify";
import { notify } from "../widgets/notice";
import { signalText } from "../widgets/text";
import { LivePicture } from "./live_picture";
import { recordingsButtons } from "./recordings_buttons";

export interface LargeViewActions {
  back(): void;
  /** Goes to the next camera (1) or the previous one (-1); absent where there is no order. */
  step?(by: 1 | -1): void;
  snapshot(): void;
}

export class LargeView {
  readonly root: HTMLElement;
  readonly camera: Camera;
  readonly #actions: LargeViewActions;
  readonly #picture: LivePicture;
  readonly #source: StreamSource;
  readonly #audio = new AudioPlayer(() => this.#showSound());
  readonly #soundButton = element("button", {
    type: "button",
    class: "icon-button sound",
    "aria-label": "Sound",
    hidden: true,
  });
  readonly #soundLabel = element("span");
  readonly #state = element("span", { class: "large-state" });
  readonly #description = element("span", { class: "large-description" });
  readonly #name: HTMLElement;
  readonly #onVisibility = () => this.#playIfVisible();

  /** `still` is what the wall shows of this camera, as a first picture until the large one comes. */
  constructor(camera: Camera, server: Server, actions: LargeViewActions, still?: LivePicture) {
    this.camera = camera;
    this.#actions = actions;
    this.#source = new StreamSource(
      server,
      camera,
      false,
      new SnapshotSource(server, camera, new Semaphore(1)),
      this.#audio,
    );
    this.#picture = new LivePicture(
      () => this.#source.unplayable,
      () => server.signalLosses.of(camera),
      () => this.#showState(),
      true,
    );
    this.#picture.reported = () => server.alerts.kindAt(camera);
    magnify(this.#picture.root, this.#picture.canvas);
    if (still?.hasPicture) this.#picture.showStill(still.canvas);
    this.#name = element("h1", { class: "large-name", tabindex: "-1", title: camera.name }, camera.name);
    this.#soundButton.append(icon("soundOff"), icon("soundOn"), this.#soundLabel);
    this.#soundButton.addEventListener("click", () => this.toggleSound());
    this.root = element("section", { class: "large", "aria-label": camera.name }, this.#bar(), this.#picture.root);
    document.addEventListener("visibilitychange", this.#onVisibility);
    this.#playIfVisible();
    this.#picture.refresh();
  }

  focus(): void {
    this.#name.focus({ preventScroll: true });
  }

  /** Brings the screen up to date with the clock. */
  refresh(): void {
    this.#picture.refresh();
    this.#showState();
  }

  close(): void {
    document.removeEventListener("visibilitychange", this.#onVisibility);
    this.#picture.feed.stop();
    this.#audio.switchOff();
    this.root.remove();
  }

  /** Does what the key asks for; returns false for one that means nothing here. */
  pressKey(event: KeyboardEvent): boolean {
    switch (event.key.toLowerCase()) {
      case "escape":
        this.#actions.back();
        return true;
      case "arrowleft":
      case "arrowup":
        this.#actions.step?.(-1);
        return true;
      case "arrowright":
      case "arrowdown":
        this.#actions.step?.(1);
        return true;
      case "s":
        this.#actions.snapshot();
        return true;
      case "f":
        toggleFullScreen();
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
    if (this.#audio.error) notify(`${this.#audio.error}.`);
    if (this.#audio.isOn) this.#audio.switchOff();
    else void this.#audio.switchOn();
  }

  #bar(): HTMLElement {
    const stepButtons = [
      iconButton("previous", "Previous camera", () => this.#actions.step?.(-1), "←"),
      iconButton("next", "Next camera", () => this.#actions.step?.(1), "→"),
    ];
    const buttons = [
      this.#soundButton,
      ...(this.#actions.step ? stepButtons : []),
      ...recordingsButtons(this.camera),
      iconButton("snapshot", "Snapshot", () => this.#actions.snapshot(), "S"),
      fullScreenButton(),
    ];
    return element(
      "header",
      { class: "bar" },
      iconButton("back", "Back to all cameras", () => this.#actions.back(), "Esc"),
      element("span", { class: "dot" }),
      this.#name,
      this.#state,
      this.#description,
      element("div", { class: "large-buttons" }, ...buttons),
    );
  }

  #playIfVisible(): void {
    if (document.hidden) this.#picture.feed.stop();
    else this.#picture.feed.play(this.#source);
  }

  #showState(): void {
    const state = this.#picture.state();
    this.root.dataset["state"] = state.kind;
    const pollIntervalMs = this.#picture.feed.source?.pollIntervalMs;
    const isThere = state.kind !== "unavailable" && state.kind !== "absent";
    setText(this.#state, isThere ? signalText(state, pollIntervalMs) : "not available");
    setText(this.#description, this.#picture.description());
    if (this.#source.unplayable && this.#audio.isOn) this.#audio.switchOff();
    this.#showSound();
  }

  #showSound(): void {
    const { exists, isOn, error } = this.#audio;
    this.#soundButton.hidden = !exists || this.#source.unplayable !== null;
    this.#soundButton.setAttribute("aria-pressed", String(isOn));
    this.#soundButton.title = error || `Turn the sound ${isOn ? "off" : "on"} (M)`;
    setText(this.#soundLabel, error ? "No sound" : isOn ? "Sound on" : "Sound off");
  }
}
