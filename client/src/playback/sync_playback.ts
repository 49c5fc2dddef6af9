// SPDX-License-Identifier: Apache-2.0
//
// Plays recordings of one or more cameras in sync, each in a player of its own, from one recording to the next.
//
// Why so        Recordings of a camera follow each other without a gap, or with hours between. One player leads: its time is
//               the playhead. Where its camera has no more, the playhead moves on to whatever comes next on any camera; the
//               others join as soon as they have something at the playhead, and are realigned when they drift apart. A pause
//               shows what each camera had at the time of the leading one's picture.

import type { Footage } from "../wire/footage";
import type { Recordings } from "../wire/recordings";
import type { FootageCache } from "./footage_cache";
import { Player } from "./player";

export interface Track {
  readonly camera: number;
  readonly player: Player;
}

/** Recordings this close to each other play as one. */
const kMaxGapS = 3;
/** How far a player may be from the playhead, and how often at most it is brought back. */
const kMaxApartMs = 1_500;
const kRejoinIntervalMs = 5_000;
/** How far ahead the next recording is looked for in what is known, before the server is asked. */
const kLookAheadS = 600;

export class SyncPlayback {
  readonly #recordings: Recordings;
  readonly #cache: FootageCache;
  readonly #changed: () => void;
  readonly #skipped: (seconds: number) => void;
  #tracks: Track[] = [];
  #lead: Track | null = null;
  #playheadMs: number | null = null;
  #isPlaying = false;
  #rate = 1;
  #isAdvancing = false;
  /** When a track was last brought to the playhead, and where the playhead was. */
  readonly #joined = new Map<Track, { clockMs: number; atMs: number }>();

  /** `changed` is called whenever there is something else to show; `skipped` when playing leaves out a gap of that length. */
  constructor(recordings: Recordings, cache: FootageCache, changed: () => void, skipped: (seconds: number) => void) {
    this.#recordings = recordings;
    this.#cache = cache;
    this.#changed = changed;
    this.#skipped = skipped;
  }

  get tracks(): readonly Track[] {
    return this.#tracks;
  }

  get lead(): Track | null {
    return this.#lead;
  }

  /** Unix milliseconds of what is shown; null before anything is. */
  get playheadMs(): number | null {
    return this.#playheadMs;
  }

  get isPlaying(): boolean {
    return this.#isPlaying;
  }

  get rate(): number {
    return this.#rate;
  }

  /** Plays these cameras, in this order; those that stay play on. */
  setCameras(cameras: readonly number[]): void {
    const before = this.#tracks;
    this.#tracks = cameras.map((camera) => before.find((track) => track.camera === camera) ?? this.#newTrack(camera));
    for (const track of before) if (!this.#tracks.includes(track)) track.player.close();
    if (!this.#lead || !this.#tracks.includes(this.#lead)) this.#lead = this.#tracks[0] ?? null;
    for (const track of this.#tracks) if (!before.includes(track)) this.#join(track, this.#isPlaying);
    this.#changed();
  }

  /** Plays a recording of one of the cameras, and what the others have at that time. */
  open(footage: Footage, atMs = footage.start * 1000, isPlaying = true): void {
    const track = this.#tracks.find(({ camera }) => camera === footage.camera);
    if (!track) return;
    this.#lead = track;
    this.#playheadMs = atMs;
    this.#isPlaying = isPlaying;
    track.player.setRate(this.#rate);
    track.player.open(footage, atMs, isPlaying);
    for (const other of this.#tracks) if (other !== track) this.#join(other, isPlaying);
    this.#changed();
  }

  /** Goes to a time, preferably in what is being played, then on `camera`. */
  seek(atMs: number, camera = this.#lead?.camera, isPlaying = this.#isPlaying): void {
    const current = this.#lead?.player.footage;
    const isInMark = current && current.kind !== "event" && current.camera === camera && covers(current, atMs);
    const order = [...this.#tracks].sort((one) => (one.camera === camera ? -1 : 1));
    for (const track of order) {
      const footage = isInMark ? current : this.#at(track.camera, atMs);
      if (footage) return this.open(footage, atMs, isPlaying);
    }
    // None of the cameras has a recording there.
    this.#playheadMs = atMs;
    this.#isPlaying = false;
    for (const track of this.#tracks) track.player.close();
    this.#changed();
  }

  play(): void {
    if (this.#playheadMs === null) return;
    this.#isPlaying = true;
    const lead = this.#lead?.player;
    if (!lead?.footage) void this.#advance();
    else if (lead.state.kind === "ended") void this.#advance(() => lead.play());
    else for (const { player } of this.#tracks) player.play();
    this.#changed();
  }

  pause(): void {
    this.#isPlaying = false;
    for (const { player } of this.#tracks) player.pause();
    this.#changed();
  }

  /** Pauses, and moves by frames of the leading camera. */
  step(by: number): void {
    if (!this.#lead) return;
    if (this.#isPlaying) this.pause();
    this.#lead.player.step(by);
  }

  setRate(rate: number): void {
    this.#rate = rate;
    for (const { player } of this.#tracks) player.setRate(rate);
    this.#changed();
  }

  /** Call it a few times a second: lets cameras join, and realigns those that have drifted. */
  tick(): void {
    const playheadMs = this.#playheadMs;
    if (!this.#isPlaying || playheadMs === null) return;
    void this.#cache.load(
      this.#tracks.map(({ camera }) => camera),
      playheadMs / 1000,
      playheadMs / 1000 + 600,
    );
    for (const track of this.#tracks) {
      if (track === this.#lead || performance.now() - (this.#joined.get(track)?.clockMs ?? -Infinity) < kRejoinIntervalMs) continue;
      const { state, positionMs } = track.player;
      const isIdle = state.kind === "empty" || state.kind === "ended";
      const isApart = state.kind === "playing" && Math.abs(positionMs - playheadMs) > kMaxApartMs;
      if (isIdle || isApart) this.#join(track, true);
    }
  }

  close(): void {
    this.#isPlaying = false;
    for (const { player } of this.#tracks) player.close();
  }

  #newTrack(camera: number): Track {
    const track: Track = { camera, player: new Player(this.#recordings, () => this.#follow(track)) };
    track.player.setRate(this.#rate);
    return track;
  }

  #follow(track: Track): void {
    if (!this.#tracks.includes(track)) return;
    const { state, timeMs, positionMs, footage, rate } = track.player;
    if (track === this.#lead && footage) {
      if (state.kind === "playing") this.#playheadMs = positionMs;
      if (state.kind === "paused") this.#playheadMs = timeMs;
      if (state.kind === "ended" && this.#isPlaying) void this.#advance();
      if (state.kind === "failed" || state.kind === "preempted") this.#isPlaying = false;
      // A player slows down when it comes to the end of what is still being recorded.
      if (state.kind === "playing" && rate !== this.#rate) this.#rate = rate;
      if (state.kind === "paused" && !this.#isPlaying) this.#alignOthers();
    }
    this.#changed();
  }

  #alignOthers(): void {
    for (const other of this.#tracks) {
      if (other === this.#lead || this.#playheadMs === null) continue;
      if (this.#joined.get(other)?.atMs !== this.#playheadMs) this.#join(other, false);
    }
  }

  /** Shows what the camera has at the playhead. What is not known of it is looked up first. */
  #join(track: Track, isPlaying: boolean, isKnown = false): void {
    const atMs = this.#playheadMs;
    if (atMs === null) return;
    const joined = { clockMs: performance.now(), atMs };
    this.#joined.set(track, joined);
    const footage = this.#at(track.camera, atMs);
    if (footage) return track.player.open(footage, atMs, isPlaying);
    if (track.player.footage) track.player.close();
    if (isKnown) return;
    void this.#cache.load([track.camera], atMs / 1000, atMs / 1000 + 1, true).then(() => {
      // Meanwhile it may have joined elsewhere.
      const isWanted = this.#joined.get(track) === joined && this.#tracks.includes(track) && track !== this.#lead;
      if (isWanted && this.#at(track.camera, atMs)) this.#join(track, this.#isPlaying, true);
    });
  }

  #at(camera: number, atMs: number): Footage | null {
    return this.#events(camera, atMs / 1000, atMs / 1000).findLast((event) => covers(event, atMs)) ?? null;
  }

  #events(camera: number, fromS: number, toS: number): Footage[] {
    return this.#cache.get(camera, fromS, toS).footage.filter(({ kind, isSaved }) => kind === "event" && isSaved);
  }

  /** Plays what comes after the playhead; where nothing does, calls `otherwise`, or stops. */
  async #advance(otherwise?: () => void): Promise<void> {
    if (this.#isAdvancing) return;
    this.#isAdvancing = true;
    try {
      const current = this.#lead?.player.footage ?? null;
      const next = current && current.kind !== "event" ? null : await this.#next(current);
      // Meanwhile the user may have gone elsewhere.
      if (!this.#isPlaying || (this.#lead?.player.footage ?? null) !== current) return;
      const gapS = next && current ? next.start - current.stop : 0;
      if (gapS > kMaxGapS) this.#skipped(gapS);
      // Another camera's may have begun long before; of the same one, ends are rounded up.
      const fromS = current && next?.camera !== current.camera ? current.stop : 0;
      if (next) this.open(next, Math.max(next.start, fromS) * 1000);
      else if (otherwise) otherwise();
      else this.#isPlaying = false;
    } finally {
      this.#isAdvancing = false;
      this.#changed();
    }
  }

  async #next(current: Footage | null): Promise<Footage | null> {
    const fromS = current?.stop ?? (this.#playheadMs ?? 0) / 1000;
    const cameras = this.#tracks.map(({ camera }) => camera);
    await this.#cache.load(cameras, fromS - 1, fromS + kLookAheadS, true);
    const candidates = cameras.flatMap((camera) => {
      const events = this.#events(camera, fromS - 1, fromS + kLookAheadS);
      const isNext = ({ id, start, stop }: Footage) => id !== current?.id && stop > fromS && start >= (current?.start ?? fromS);
      return events.find(isNext) ?? [];
    });
    const followsAtOnce = candidates.find(({ camera, start }) => camera === current?.camera && start <= fromS + kMaxGapS);
    const known = followsAtOnce ?? candidates.sort((one, other) => one.start - other.start)[0];
    if (known) return known;
    const place = { atS: Math.floor(fromS), id: current?.id };
    return this.#recordings.next({ cameras, kinds: ["continuous", "alarm"], ...place }, false).catch(() => null);
  }
}

function covers({ start, stop, isGrowing }: Footage, atMs: number): boolean {
  return start * 1000 <= atMs && atMs < stop * 1000 + (isGrowing ? kMaxGapS * 1000 : 0);
}
