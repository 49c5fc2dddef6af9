// SPDX-License-Identifier: Apache-2.0
//
// Keeps address and screen in step: opens what the address names, and writes what is shown into it, to the frame where
// a picture stands still.

import type { SyncPlayback } from "../../playback/sync_playback";
import { isSameFootage } from "../../wire/footage";
import type { Recordings } from "../../wire/recordings";
import { asServerError } from "../../wire/server";
import { notify } from "../widgets/notice";
import type { EventsJumps } from "./events_jumps";
import { parseEventsAddress, recordEventsAddress, type EventsAddress } from "./events_route";
import type { Overview } from "./overview";
import type { Stage } from "./stage";

/** Browsers refuse to change the address more often than a few times a second. */
const kRecordMs = { standing: 500, playing: 1_000 };

export interface ShownEvents {
  recordings: Recordings;
  playback: SyncPlayback;
  overview: Overview;
  stage: Stage;
  jumps: EventsJumps;
}

export class ShownAddress {
  readonly #shown: ShownEvents;
  /** Counts what the address has asked for; while it is being looked up, the address is not written. */
  #followed = 0;
  #isFollowing = false;
  /** What is shown next is an entry of its own in the history. */
  #isNewEntry = false;

  constructor(shown: ShownEvents) {
    this.#shown = shown;
  }

  /** Opens what the address names, unless it is being shown. */
  async follow(): Promise<void> {
    const address = parseEventsAddress(location.hash);
    if (!address) return;
    const followed = (this.#followed += 1);
    this.#isFollowing = true;
    try {
      await this.#open(address, () => followed === this.#followed);
    } catch (error) {
      notify(asServerError(error).message);
    } finally {
      if (followed === this.#followed) this.#isFollowing = false;
    }
  }

  /** Call it before another moment is shown, so that Back returns to exactly the picture that is left. */
  leave(): void {
    this.record(true);
    this.#isNewEntry = true;
  }

  record(isAtOnce = false): void {
    const { playback, stage, overview } = this.#shown;
    const { playheadMs, active, isPlaying, isScrubbed } = playback;
    if (playheadMs === null || isScrubbed || this.#isFollowing) return;
    const { plan, large } = stage;
    const footage = active?.player.footage ?? null;
    const address = { footage, atMs: playheadMs, isPlaying: false, stage: { plan, large }, filter: overview.choice };
    recordEventsAddress(address, this.#isNewEntry, isAtOnce ? 0 : isPlaying ? kRecordMs.playing : kRecordMs.standing);
    this.#isNewEntry = false;
  }

  async #open({ footage: wanted, atMs, isPlaying, stage, filter }: EventsAddress, isWanted: () => boolean): Promise<void> {
    const { recordings, playback, overview, jumps } = this.#shown;
    if (filter) overview.follow(filter);
    if (stage) this.#shown.stage.show(stage.plan, stage.large);
    // Back from what is being played ends it.
    if (!wanted && atMs === null) return playback.close();
    if (!wanted) return jumps.to(atMs!, isPlaying);
    if (atMs === null && isSameFootage(wanted, playback.active?.player.footage)) return;
    const footage = await recordings.find(wanted);
    if (!isWanted()) return;
    // An address that names a time leads to the picture of it.
    if (footage) jumps.show(footage, atMs === null, atMs ?? footage.start * 1000);
    else notify("This recording no longer exists, or you do not have permission to view it.");
  }
}
