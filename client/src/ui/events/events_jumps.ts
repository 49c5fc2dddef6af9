// SPDX-License-Identifier: Apache-2.0
//
// Ways to another moment than the one that is played: an event, the one before or after, a few seconds on, a time that
// is typed; and to other cameras of the same moment.

import type { Direction, EventWalk } from "../../playback/event_walk";
import type { SyncPlayback } from "../../playback/sync_playback";
import type { Footage } from "../../wire/footage";
import { asServerError } from "../../wire/server";
import { textField } from "../widgets/fields";
import { openDialog } from "../widgets/form_dialog";
import { notify } from "../widgets/notice";
import { eventText } from "./event_list";
import type { Overview } from "./overview";
import type { Stage } from "./stage";
import { layoutFor, planOf } from "./stage_layout";
import { kTimeExamples, typedTime } from "./typed_time";

/** The most cameras that are asked what they have at a moment. */
const kMaxLookedUp = 64;

export class EventsJumps {
  readonly #playback: SyncPlayback;
  readonly #overview: Overview;
  readonly #stage: Stage;
  readonly #walk: EventWalk;
  readonly #leaving: () => void;
  /** Where the last jump leads that is under way; null for none. */
  #towardsMs: number | null = null;

  /** `leaving` is called before another moment is shown, to which Back does not lead. */
  constructor(playback: SyncPlayback, overview: Overview, stage: Stage, walk: EventWalk, leaving: () => void) {
    this.#playback = playback;
    this.#overview = overview;
    this.#stage = stage;
    this.#walk = walk;
    this.#leaving = leaving;
  }

  open(footage: Footage, isPlaying = true, atMs = footage.start * 1000): void {
    this.#leaving();
    this.show(footage, isPlaying, atMs);
  }

  /** As `open`, for what the address names. */
  show(footage: Footage, isPlaying: boolean, atMs: number): void {
    this.#overview.reveal(footage, atMs);
    this.#stage.include(footage.camera);
    this.#playback.open(footage, atMs, isPlaying);
  }

  /** To the previous or next event. */
  async skip(by: Direction): Promise<void> {
    try {
      const next = await this.#walk.find(by);
      if (!next) return notify(`There is no ${by > 0 ? "later" : "earlier"} event of these cameras and kinds.`);
      notify(eventText(next, (camera) => this.#overview.nameOf(camera)));
      this.open(next, this.#playback.isPlaying);
    } catch (error) {
      notify(asServerError(error).message);
    }
  }

  /** By so many milliseconds, but not beyond the present. */
  by(ms: number): void {
    const fromMs = this.#towardsMs ?? this.#playback.playheadMs;
    if (fromMs !== null) void this.to(Math.min(fromMs + ms, Date.now()));
  }

  /**
   * To a time of the cameras on the stage, once it is known what they have then. With `isLeaving` Back leads to what is
   * left.
   */
  async to(atMs: number, isPlaying = this.#playback.isPlaying, isLeaving = false): Promise<void> {
    this.#towardsMs = atMs;
    await this.#overview.cache.load(this.#stage.cameras, atMs / 1000 - 1, atMs / 1000 + 1, true);
    if (this.#towardsMs !== atMs) return;
    this.#towardsMs = null;
    if (isLeaving) this.#leaving();
    this.#overview.timeline.reveal(atMs);
    this.#playback.seek(atMs, this.#stage.active ?? undefined, isPlaying);
  }

  /** Asks for a time in a dialog, which goes away with `host`. */
  ask(host: HTMLElement): void {
    const field = textField("Time", { maxlength: "40" }, `For example ${kTimeExamples}.`);
    const attempt = async () => {
      const atMs = typedTime(field.value, Date.now());
      if (atMs === null) return `Please type a time: ${kTimeExamples}.`;
      if (atMs > Date.now()) return "That time is still to come.";
      return this.to(atMs, this.#playback.isPlaying, true);
    };
    void openDialog(host, { title: "Go to a time", content: [field.root], submit: "Go", attempt });
  }

  /**
   * Shows what other cameras have at the moment of an event, or (null) at the one that is shown; as many as there is
   * room for.
   */
  async sameMoment(footage: Footage | null): Promise<void> {
    const atMs = footage ? footage.moment * 1000 : this.#playback.playheadMs;
    if (atMs === null) return;
    const listed = this.#overview.filter.cameras.map(({ id }) => id);
    const first = footage?.camera ?? this.#stage.active ?? listed[0];
    if (first === undefined) return;
    const all = [...new Set([first, ...listed, ...this.#overview.cameras.map(({ id }) => id)])].slice(0, kMaxLookedUp);
    await this.#overview.cache.load(all, atMs / 1000 - 1, atMs / 1000 + 1);
    const recorded = all.filter((camera) => camera === first || this.#playback.footageAt(camera, atMs));
    const cameras = [...new Set([...recorded, ...all])].slice(0, this.#stage.maxPlayers);
    const isPlaying = footage !== null || this.#playback.isPlaying;
    this.#leaving();
    this.#stage.show(planOf(layoutFor(cameras.length), cameras, this.#stage.maxPlayers));
    if (footage) this.show(footage, isPlaying, atMs);
  }
}
