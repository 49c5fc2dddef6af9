// SPDX-License-Identifier: Apache-2.0
//
// The transport controls below the stage: play, step, rate, what is playing and ways to another moment, download.

import type { EventWalk } from "../../playback/event_walk";
import { kRates } from "../../playback/player_state";
import type { SyncPlayback } from "../../playback/sync_playback";
import { downloadAddress } from "../../wire/exports";
import type { Footage } from "../../wire/footage";
import { iconButton } from "../widgets/button";
import { element, setText } from "../widgets/dom";
import { icon } from "../widgets/icons";
import { notify } from "../widgets/notice";
import { preciseTime, rateText, shortDate } from "../widgets/text";
import { eventText } from "./event_list";
import type { KeepButton } from "./keep_button";

export interface TransportActions {
  toggle(): void;
  step(by: number): void;
  /** To the previous (-1) or next (1) event. */
  skip(by: 1 | -1): void;
  rate(rate: number): void;
  /** By so many milliseconds. */
  jump(ms: number): void;
  /** For the active camera's picture. */
  snapshot(): void;
  /** To a time that is typed. */
  askTime(): void;
  /** Shows what other cameras have at this moment. */
  sameMoment(): void;
  live(): void;
  exportSpan(): void;
  /** Turns the sound of the active camera on or off. */
  sound(): void;
  fullScreen(): void;
}

export const kJumpMs = 10_000;
const kNoTime = "Go to a time";
const kSnapshot = "Snapshot";
const kDownload = "Download this recording";
const kMayNotDownload = "You may play the recordings of this camera, but not download them";

export class Transport {
  readonly root: HTMLElement;
  readonly #playback: SyncPlayback;
  readonly #walk: EventWalk;
  readonly #nameOf: (camera: number) => string;
  readonly #keeping: KeepButton;
  readonly #play: HTMLButtonElement;
  readonly #before: HTMLButtonElement;
  readonly #after: HTMLButtonElement;
  readonly #rate = element("select", { class: "rate input", "aria-label": "Rate", title: "Rate ([ and ])" });
  readonly #sound: HTMLButtonElement;
  #wasSoundOn = false;
  readonly #snapshot: HTMLButtonElement;
  readonly #time = element("time", { class: "transport-time" }, kNoTime);
  readonly #frame = element("span", { class: "transport-frame" });
  readonly #growing = element("span", { class: "transport-growing recording", hidden: true }, "recording");
  readonly #download = element("a", { class: "icon-button", role: "link", "aria-label": kDownload, title: kDownload });
  /** Whose recordings may not be taken away. */
  #denied: ReadonlySet<number> = new Set();

  constructor(
    playback: SyncPlayback,
    walk: EventWalk,
    nameOf: (camera: number) => string,
    keeping: KeepButton,
    actions: TransportActions,
  ) {
    this.#keeping = keeping;
    this.#playback = playback;
    this.#walk = walk;
    this.#nameOf = nameOf;
    this.#before = iconButton("eventBefore", "Previous event", () => actions.skip(-1));
    this.#after = iconButton("eventAfter", "Next event", () => actions.skip(1));
    this.#play = iconButton("play", "Play", () => actions.toggle(), "Space");
    this.#play.classList.add("play");
    this.#play.append(icon("pause"));
    this.#sound = iconButton("soundOff", "Sound", () => actions.sound());
    this.#snapshot = iconButton("snapshot", kSnapshot, () => actions.snapshot(), "S");
    this.#sound.classList.add("transport-sound");
    this.#sound.append(icon("soundOn"));
    this.#download.append(icon("download"));
    for (const rate of kRates) this.#rate.append(element("option", { value: String(rate) }, rateText(rate)));
    this.#rate.addEventListener("change", () => actions.rate(Number(this.#rate.value)));
    const buttons = element(
      "div",
      { class: "transport-buttons", role: "group", "aria-label": "Playback" },
      this.#before,
      iconButton("jumpBack", "Ten seconds back", () => actions.jump(-kJumpMs), "J"),
      iconButton("stepBack", "Previous frame", () => actions.step(-1), "←"),
      this.#play,
      iconButton("stepForward", "Next frame", () => actions.step(1), "→"),
      iconButton("jumpForward", "Ten seconds on", () => actions.jump(kJumpMs), "L"),
      this.#after,
      this.#rate,
      this.#sound,
    );
    const goTo = element("button", { type: "button", class: "transport-go", title: `${kNoTime} (T)` }, this.#time);
    goTo.addEventListener("click", () => actions.askTime());
    const about = element("div", { class: "transport-about" }, goTo, this.#growing, this.#frame);
    const live = element("button", { type: "button", class: "button transport-live", title: "To the live pictures (N)" }, "LIVE");
    live.addEventListener("click", () => actions.live());
    const side = element(
      "div",
      { class: "transport-side" },
      live,
      iconButton("sameMoment", "Same moment on all cameras", () => actions.sameMoment(), "A"),
      keeping.root,
      this.#snapshot,
      this.#download,
      iconButton("export", "Export a span of several cameras", () => actions.exportSpan(), "X"),
      iconButton("fullScreen", "Full screen", () => actions.fullScreen(), "F"),
    );
    this.root = element("div", { class: "transport" }, buttons, about, side);
    this.refresh();
  }

  refresh(): void {
    const { isPlaying, active, playheadMs, rate } = this.#playback;
    const footage = active?.player.footage ?? null;
    this.#play.setAttribute("aria-label", isPlaying ? "Pause" : "Play");
    this.#play.title = `${isPlaying ? "Pause" : "Play"} (Space)`;
    this.root.dataset["playing"] = String(isPlaying);
    if (this.#rate.value !== String(rate)) this.#rate.value = String(rate);
    setText(this.#time, playheadMs === null ? kNoTime : `${shortDate(playheadMs)} ${preciseTime(playheadMs)}`);
    this.#name(this.#before, "Previous event", this.#walk.peek(-1), "↑");
    this.#name(this.#after, "Next event", this.#walk.peek(1), "↓");
    this.#growing.hidden = !footage?.isGrowing;
    const frameCount = active?.player.frameCount ?? 0;
    const frames = footage && frameCount > 0 && !footage.isGrowing ? ` of ${frameCount}` : "";
    setText(this.#frame, footage ? `frame ${(active?.player.index ?? 0) + 1}${frames}` : "");
    this.#showSound();
    this.#keeping.show(footage);
    const mayDownload = !footage || !this.#denied.has(footage.camera);
    if (footage && mayDownload) this.#download.href = downloadAddress(footage);
    else this.#download.removeAttribute("href");
    this.#download.setAttribute("aria-disabled", String(!footage || !mayDownload));
    this.#download.setAttribute("aria-label", mayDownload ? kDownload : kMayNotDownload);
    this.#download.title = mayDownload ? kDownload : kMayNotDownload;
    this.#snapshot.disabled = !footage || !mayDownload;
  }

  /** No recording of these cameras can be downloaded from then on. */
  deny(denied: ReadonlySet<number>): void {
    this.#denied = denied;
    this.refresh();
  }

  isDenied(camera: number): boolean {
    return this.#denied.has(camera);
  }

  #showSound(): void {
    const { exists = false, isOn = false, error = "" } = this.#playback.active?.player.sound ?? {};
    this.#sound.hidden = !exists;
    this.#sound.setAttribute("aria-pressed", String(isOn));
    // The browser may find out long after the click.
    if (this.#wasSoundOn && !isOn && error) notify(`${error}.`);
    this.#wasSoundOn = isOn;
    this.#sound.title = error || `Turn the sound ${isOn ? "off" : "on"} (M)`;
  }

  #name(button: HTMLButtonElement, what: string, event: Footage | null | undefined, key: string): void {
    const told = event ? `: ${eventText(event, this.#nameOf)}` : event === null ? ": none" : "";
    const label = what + told;
    if (button.getAttribute("aria-label") === label) return;
    button.setAttribute("aria-label", label);
    button.title = `${label} (${key})`;
  }
}
