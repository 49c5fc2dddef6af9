// SPDX-License-Identifier: Apache-2.0
//
// One player on the stage: its picture with camera and time, and the reason where there is no picture. While the
// playhead is dragged it shows stills.

import type { Player } from "../../playback/player";
import type { PlayerState } from "../../playback/player_state";
import type { Snapshot } from "../../wire/camera";
import type { Still } from "../../wire/recordings";
import { iconButton } from "../widgets/button";
import { draw, element, setText } from "../widgets/dom";
import { icon } from "../widgets/icons";
import { magnify } from "../widgets/magnify";
import { clockTime, preciseTime, shortDate } from "../widgets/text";

/** Hardly to be told from what is shown. */
const kSnapshotQuality = 0.95;

export interface PlayerTileActions {
  /** Plays what has stopped. */
  again(): void;
  /** The tile was clicked: its camera becomes active. */
  choose(): void;
  /** Shows it large, or all again; false where it is the only one. */
  enlarge(): boolean;
  close(): void;
}

export class PlayerTile {
  readonly root: HTMLElement;
  readonly player: Player;
  readonly #canvas = element("canvas", { role: "img" });
  readonly #time = element("time", { class: "stage-time" });
  readonly #sentence = element("p", { class: "message-sentence", role: "status" });
  readonly #again = element("button", { type: "button", class: "button" });
  readonly #large: HTMLButtonElement;
  /** The still that is shown while the playhead is dragged: undefined while it is not, null where there is none. */
  #still: Still | null | undefined;
  #stills = 0;
  /** The number of the still that was drawn last. */
  #drawn = 0;

  constructor(name: string, player: Player, actions: PlayerTileActions) {
    this.player = player;
    // What a pause still asked for may come when the playhead is dragged already.
    player.show = ({ picture }, signal) => this.#draw(picture, () => !signal.aborted && this.#still === undefined);
    this.#again.addEventListener("click", actions.again);
    this.#large = iconButton("fit", `${name} large`, () => actions.enlarge(), "Enter");
    const close = iconButton("close", `Close ${name}`, () => actions.close());
    close.classList.add("stage-close");
    const buttons = element("div", { class: "stage-buttons" }, this.#large, close);
    const message = element(
      "div",
      { class: "message" },
      element("div", { class: "spinner" }),
      icon("warning"),
      this.#sentence,
      this.#again,
    );
    const caption = element("p", { class: "stage-caption" }, element("span", {}, name), this.#time);
    this.root = element("figure", { class: "picture stage-picture" }, this.#canvas, caption, message, buttons);
    this.#canvas.setAttribute("aria-label", `Recording of ${name}`);
    this.root.addEventListener("pointerdown", actions.choose);
    magnify(this.root, this.#canvas, actions.enlarge);
    this.refresh(null);
  }

  /** What is shown, in full size; null where nothing is. */
  snapshot(): Promise<Snapshot> | null {
    if (!this.root.classList.contains("has-picture")) return null;
    const takenMs = this.#still?.capturedMs ?? this.player.timeMs;
    return new Promise((resolve, reject) => {
      const take = (jpeg: Blob | null) => (jpeg ? resolve({ jpeg, takenMs }) : reject(new Error("no picture")));
      this.#canvas.toBlob(take, "image/jpeg", kSnapshotQuality);
    });
  }

  /** How wide a picture is drawn, in pixels of the screen. */
  get widthPx(): number {
    return Math.round(this.root.clientWidth * devicePixelRatio);
  }

  set isLarge(isLarge: boolean) {
    this.root.classList.toggle("is-large", isLarge);
    this.#large.setAttribute("aria-pressed", String(isLarge));
  }

  set isActive(isActive: boolean) {
    this.root.classList.toggle("is-active", isActive);
  }

  /** `playheadMs` is named where nothing was recorded then. */
  refresh(playheadMs: number | null): void {
    const { state, footage, timeMs } = this.player;
    const isScrubbed = this.#still !== undefined;
    this.root.dataset["state"] = isScrubbed ? (this.#still ? "paused" : "empty") : state.kind;
    // A picture of another time must not be taken for this one.
    if (this.root.dataset["state"] === "empty") this.root.classList.remove("has-picture");
    const shownMs = isScrubbed ? this.#still?.capturedMs : footage ? timeMs : undefined;
    setText(this.#time, shownMs === undefined ? "" : `${shortDate(shownMs)} ${preciseTime(shownMs)}`);
    setText(this.#sentence, sentenceFor(isScrubbed ? { kind: "empty" } : state, playheadMs));
    const again = isScrubbed ? "" : state.kind === "preempted" ? "Play here" : state.kind === "failed" ? "Try again" : "";
    setText(this.#again, again);
    this.#again.hidden = again === "";
  }

  /** Shows a still in place of what the player has, null for none then, until `showPlayer`. */
  async showStill(still: Still | null): Promise<void> {
    const number = (this.#stills += 1);
    // One that takes longer to decode than the next to come is still newer than what is seen.
    const isNewer = () => number > this.#drawn;
    if (still) await this.#draw(still.jpeg, isNewer).catch(() => undefined);
    if (!isNewer()) return;
    this.#drawn = number;
    this.#still = still;
  }

  showPlayer(): void {
    this.#drawn = this.#stills;
    this.#still = undefined;
  }

  /** Null draws nothing: the picture stays. */
  async #draw(picture: Blob | VideoFrame | null, isWanted: () => boolean): Promise<void> {
    if (!(picture instanceof Blob)) return this.#put(picture, isWanted);
    const image = await createImageBitmap(picture);
    // A pause while it was being decoded keeps the previous frame, whose number the player reports.
    this.#put(image, isWanted);
    image.close();
  }

  #put(image: ImageBitmap | VideoFrame | null, isWanted: () => boolean): void {
    if (!image || !isWanted()) return;
    draw(this.#canvas, image);
    this.root.classList.add("has-picture");
  }
}

function sentenceFor(state: PlayerState, playheadMs: number | null): string {
  switch (state.kind) {
    case "empty":
      if (playheadMs === null) return "Choose an event, or a time on the timeline.";
      return `No recording at ${clockTime(playheadMs)}.`;
    case "failed":
      return state.reason;
    case "lost":
      return "The connection was lost. Playback continues as soon as it is back.";
    case "preempted":
      return "Playback was stopped because another window of this session started playing.";
    default:
      return "";
  }
}
