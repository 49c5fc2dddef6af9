// SPDX-License-Identifier: Apache-2.0
//
// The footage that a player has open, as far as it is known: a recording may grow, and of a mark nobody tells how many
// frames it has before one of them is asked for.

import type { Footage } from "../wire/footage";
import type { FrameStart, Recordings } from "../wire/recordings";
import type { Start } from "./start";
import { StillReader } from "./still_reader";

export class OpenFootage {
  readonly stills: StillReader;
  readonly #recordings: Recordings;
  #footage: Footage;
  #frameCount: number;

  constructor(recordings: Recordings, footage: Footage) {
    this.#recordings = recordings;
    this.#footage = footage;
    this.#frameCount = footage.frameCount;
    this.stills = new StillReader(recordings);
  }

  get footage(): Footage {
    return this.#footage;
  }

  /** 0 when that is not known. */
  get frameCount(): number {
    return this.#frameCount;
  }

  /** The same footage as the server has it now. */
  update(footage: Footage): void {
    this.#footage = footage;
    this.#frameCount = Math.max(this.#frameCount, footage.frameCount);
  }

  /** The number of the frame there is that is nearest to that one. */
  nearest(index: number): number {
    const last = this.#footage.isGrowing || this.#frameCount === 0 ? Infinity : this.#frameCount - 1;
    return Math.max(0, Math.min(index, last));
  }

  /** The frame to begin with; rejects with a ServerError. */
  async locate(start: Start): Promise<FrameStart> {
    if ("index" in start) return start;
    const { index, frameCount } = await this.#recordings.frameAt(this.#footage, start.atMs);
    this.#frameCount = frameCount;
    return { index };
  }
}
