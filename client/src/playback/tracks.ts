// SPDX-License-Identifier: Apache-2.0
//
// The players of the cameras that are played in step, one for each, and the clock that they follow.

import type { Footage } from "../wire/footage";
import type { Recordings } from "../wire/recordings";
import { PlaybackClock } from "./playback_clock";
import { Player } from "./player";

export interface Track {
  readonly camera: number;
  readonly player: Player;
}

export const kActive: readonly string[] = ["opening", "playing", "lost"];

export class Tracks {
  readonly clock = new PlaybackClock();
  readonly #recordings: Recordings;
  readonly #changed: (track: Track) => void;
  #all: readonly Track[] = [];
  #rate = 1;

  /** `changed` is called for each frame and every other change of one that is among `all`. */
  constructor(recordings: Recordings, changed: (track: Track) => void) {
    this.#recordings = recordings;
    this.#changed = changed;
  }

  get all(): readonly Track[] {
    return this.#all;
  }

  get cameras(): number[] {
    return this.#all.map(({ camera }) => camera);
  }

  /** Whether any plays, or is about to. */
  get hasActive(): boolean {
    return this.#all.some(({ player }) => kActive.includes(player.state.kind));
  }

  /** The recordings that have ended and are still on the screen. */
  get ended(): Footage[] {
    return this.#all.flatMap(({ player }) => (player.state.kind === "ended" ? (player.footage ?? []) : []));
  }

  get rate(): number {
    return this.#rate;
  }

  of(camera: number | undefined): Track | null {
    return this.#all.find((track) => track.camera === camera) ?? null;
  }

  /** Keeps the players of cameras that stay, and ends those of the others at once. Returns the new ones. */
  setCameras(cameras: readonly number[]): Track[] {
    const before = this.#all;
    this.#all = cameras.map((camera) => this.of(camera) ?? this.#newTrack(camera));
    for (const track of before) {
      if (this.#all.includes(track)) continue;
      this.clock.leave(track);
      track.player.close();
      track.player.sound.switchOff();
    }
    return this.#all.filter((track) => !before.includes(track));
  }

  setRate(rate: number): void {
    this.#rate = rate;
    this.clock.setRate(rate);
    for (const { player } of this.#all) player.setRate(rate);
  }

  /** Shows a recording at that time; where it begins later, from its beginning. */
  start(track: Track, footage: Footage, atMs: number, isPlaying: boolean): void {
    if (isPlaying) this.#enter(track, footage, Math.max(atMs, footage.start * 1000));
    track.player.setRate(this.#rate);
    track.player.open(footage, atMs, isPlaying);
  }

  /** Plays on from the picture of a pause; false where the player shows none. */
  resume(track: Track, atMs: number): boolean {
    const { state, footage } = track.player;
    if (state.kind !== "paused" || !footage) return false;
    this.#enter(track, footage, atMs);
    track.player.play(atMs);
    return true;
  }

  /** The clock stays at the end of the recording while it is looked up what follows. */
  awaitNext(track: Track): void {
    this.clock.join(track, track.player.positionMs, 0);
  }

  pause(): void {
    this.clock.stop();
    for (const { player } of this.#all) player.pause();
  }

  close(): void {
    this.clock.set(0, false);
    for (const { player } of this.#all) {
      player.close();
      player.sound.switchOff();
    }
  }

  #enter(track: Track, { start, stop, frameCount }: Footage, atMs: number): void {
    this.clock.join(track, atMs, frameCount > 0 ? ((stop - start) * 1000) / frameCount : 0);
  }

  #newTrack(camera: number): Track {
    const track: Track = { camera, player: new Player(this.#recordings, () => this.#follow(track)) };
    track.player.pace = (positionMs, signal) => this.clock.due(track, positionMs, signal);
    track.player.setRate(this.#rate);
    return track;
  }

  #follow(track: Track): void {
    if (!this.#all.includes(track)) return;
    if (!kActive.includes(track.player.state.kind)) this.clock.leave(track);
    this.#changed(track);
  }
}
