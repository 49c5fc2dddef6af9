// SPDX-License-Identifier: Apache-2.0
//
// One camera's live picture, with the message that lies over it while it is not live; used by tiles and the large view.

import { Feed } from "../../live/feed";
import type { SignalState } from "../../live/signal_state";
import type { Unplayable } from "../../live/unplayable";
import { capitalized } from "../../wire/sentence";
import type { SignalLoss } from "../../wire/signal_losses";
import { draw, element, setText } from "../widgets/dom";
import { icon } from "../widgets/icons";
import { signalText } from "../widgets/text";
import { unplayableHint } from "./unplayable_hint";

/**
 * Unavailable: the stream cannot be played here, and the server makes no still pictures to show in its place. Absent:
 * the server does not list the camera any more.
 */
export type PictureState = SignalState | { kind: "unavailable"; reason: string } | { kind: "absent"; reason: string };

/** An answer of the server that will not change by asking again. */
const kNoSuchApi = 404;

export class LivePicture {
  readonly canvas = element("canvas", { "aria-hidden": "true" });
  readonly feed: Feed;
  readonly root: HTMLElement;
  readonly #unplayable: () => Unplayable | null;
  readonly #signalLoss: () => SignalLoss | null;
  readonly #changed: () => void;
  readonly #canLink: boolean;
  /** Why the camera is absent; empty for one that is there. */
  absence = "";
  /** What was just reported of the camera, for which the picture has a frame; null for nothing. */
  reported: () => "alert" | "pos" | null = () => null;
  readonly #frame = element("p", { class: "picture-frame", hidden: true });
  readonly #sentence = element("p", { class: "message-sentence" });
  readonly #reason = element("p", { class: "message-reason" });
  readonly #hint = element("p", { class: "hint", role: "note" });
  #hintFor: Unplayable | null = null;
  /** State and reason that are on the screen. */
  #shown = "";
  #frames = 0;
  #rateSinceMs = performance.now();
  #framesPerSecond = 0;

  /**
   * `unplayable` says why still pictures are shown, `signalLoss` why the camera sends none; `changed` is called after
   * the state on the screen changed: call `refresh` once when you are ready for it. Links are shown where `canLink`,
   * which is not so within a button.
   */
  constructor(
    unplayable: () => Unplayable | null,
    signalLoss: () => SignalLoss | null,
    changed: () => void,
    canLink: boolean,
  ) {
    this.#unplayable = unplayable;
    this.#signalLoss = signalLoss;
    this.#canLink = canLink;
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
      icon("noSignal"),
      this.#sentence,
      this.#reason,
    );
    this.root = element("div", { class: "picture" }, this.canvas, message, this.#hint, this.#frame);
  }

  state(): PictureState {
    if (this.absence) return { kind: "absent", reason: this.absence };
    const state = this.feed.state();
    const unplayable = this.#unplayable();
    const isShown = state.kind === "live" || state.kind === "idle";
    const signalLoss = isShown ? null : this.#signalLoss();
    if (signalLoss) return { kind: "lost", sinceMs: signalLoss.sinceMs, reason: `Camera: ${signalLoss.cause}.` };
    if (!unplayable || isShown || this.feed.failure?.status !== kNoSuchApi) return state;
    return { kind: "unavailable", reason: unplayable.reason };
  }

  get hasPicture(): boolean {
    return this.root.classList.contains("has-picture");
  }

  /** Draws a picture that says nothing of the signal: the state stays as it is. */
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
    const isStream = this.feed.source?.pollIntervalMs === 0;
    if (this.state().kind !== "live" || !isStream || this.#framesPerSecond === 0) return "";
    return `${this.canvas.width} × ${this.canvas.height} · ${this.#framesPerSecond} fps`;
  }

  /** Brings the screen up to date with the clock. */
  refresh(): void {
    const state = this.state();
    const isThere = state.kind !== "unavailable" && state.kind !== "absent";
    const sentence = isThere ? signalText(state) : state.reason;
    setText(this.#sentence, capitalized(sentence));
    const noStills = "The server has no still pictures of this camera.";
    setText(this.#reason, state.kind === "lost" ? state.reason : state.kind === "unavailable" ? noStills : "");
    this.#showHint(isThere ? this.#unplayable() : null);
    const reported = this.reported();
    this.#frame.hidden = reported === null;
    setText(this.#frame, reported === null ? "" : reported === "pos" ? "POS" : "Alert");
    const shown = state.kind === "lost" ? `${state.kind} ${state.reason}` : state.kind;
    if (shown !== this.#shown) {
      this.#shown = shown;
      this.root.dataset["state"] = state.kind;
      this.#changed();
    }
  }

  #showHint(unplayable: Unplayable | null): void {
    if (this.#hintFor === unplayable) return;
    this.#hintFor = unplayable;
    // The wall shows a remedy once for all its tiles.
    const isShownHere = unplayable && (this.#canLink || !unplayable.remedy);
    this.#hint.replaceChildren(...(isShownHere ? unplayableHint(unplayable) : []));
  }
}
