// SPDX-License-Identifier: Apache-2.0
//
// One player on the stage: its picture with camera and time, and the reason where there is no picture.

import type { Player } from "../../playback/player";
import type { PlayerState } from "../../playback/player_state";
import { draw, element, setText } from "../widgets/dom";
import { icon } from "../widgets/icons";
import { magnify } from "../widgets/magnify";
import { clockTime, preciseTime, shortDate } from "../widgets/text";

export class PlayerTile {
  readonly root: HTMLElement;
  readonly player: Player;
  readonly #canvas = element("canvas", { role: "img" });
  readonly #time = element("time", { class: "stage-time" });
  readonly #sentence = element("p", { class: "message-sentence", role: "status" });
  readonly #again = element("button", { type: "button", class: "button" });

  /** `onAgain` is called when the user wants to play what has stopped. */
  constructor(name: string, player: Player, onAgain: () => void) {
    this.player = player;
    player.show = async ({ jpeg }, signal) => {
      const image = await createImageBitmap(jpeg);
      // A pause while it was being decoded keeps the previous frame, whose number the player reports.
      if (!signal.aborted) {
        draw(this.#canvas, image);
        this.root.classList.add("has-picture");
      }
      image.close();
    };
    this.#again.addEventListener("click", onAgain);
    const message = element(
      "div",
      { class: "message" },
      element("div", { class: "spinner" }),
      icon("warning"),
      this.#sentence,
      this.#again,
    );
    const caption = element("p", { class: "stage-caption" }, element("span", {}, name), this.#time);
    this.root = element("figure", { class: "picture stage-picture" }, this.#canvas, caption, message);
    this.#canvas.setAttribute("aria-label", `Recording of ${name}`);
    magnify(this.root, this.#canvas);
    this.refresh(null);
  }

  /** `playheadMs` is named where nothing was recorded then. */
  refresh(playheadMs: number | null): void {
    const { state, footage, timeMs } = this.player;
    this.root.dataset["state"] = state.kind;
    // A picture of another time must not be taken for this one.
    if (state.kind === "empty") this.root.classList.remove("has-picture");
    setText(this.#time, footage ? `${shortDate(timeMs)} ${preciseTime(timeMs)}` : "");
    setText(this.#sentence, sentenceFor(state, playheadMs));
    const again = state.kind === "preempted" ? "Play here" : state.kind === "failed" ? "Try again" : "";
    setText(this.#again, again);
    this.#again.hidden = again === "";
  }
}

function sentenceFor(state: PlayerState, playheadMs: number | null): string {
  switch (state.kind) {
    case "empty":
      if (playheadMs === null) return "Choose an event, or a time on the timeline.";
      return `Nothing recorded at ${clockTime(playheadMs)}.`;
    case "failed":
      return state.reason;
    case "lost":
      return "The connection was lost. Playing goes on as soon as it is back.";
    case "preempted":
      return "Playback was stopped because another window of this session started playing.";
    default:
      return "";
  }
}
