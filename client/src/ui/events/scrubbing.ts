// SPDX-License-Identifier: Apache-2.0
//
// The playhead is dragged: stills of its time on the stage, and playing from where it is let go.

import { ScrubStills } from "../../playback/scrub_stills";
import type { SyncPlayback } from "../../playback/sync_playback";
import type { Recordings } from "../../wire/recordings";
import type { Stage } from "./stage";

export class Scrubbing {
  readonly #playback: SyncPlayback;
  readonly #stage: Stage;
  readonly #stills: ScrubStills;
  #atMs: number | null = null;

  constructor(recordings: Recordings, playback: SyncPlayback, stage: Stage) {
    this.#playback = playback;
    this.#stage = stage;
    this.#stills = new ScrubStills(recordings, (camera, still) => stage.showStill(camera, still));
  }

  to(atMs: number): void {
    this.#atMs = atMs;
    this.#playback.scrub(atMs);
    this.refresh();
  }

  /** Call it when more is known of what was recorded: where the playhead rests, there may be a picture after all. */
  refresh(): void {
    const atMs = this.#atMs;
    if (atMs === null) return;
    this.#stills.request(this.#stage.stillsAt(atMs, (camera) => this.#playback.footageAt(camera, atMs)));
  }

  /** Plays from there. */
  release(atMs: number): void {
    this.close();
    this.#playback.seek(atMs, this.#stage.active ?? undefined, true);
  }

  close(): void {
    this.#atMs = null;
    this.#stills.stop();
    this.#stage.showPlayers();
  }
}
