// SPDX-License-Identifier: Apache-2.0
//
// Plays recordings of one or more cameras in step, from one recording to the next.
//
// Why so        Recordings of a camera follow each other without a gap, or with hours between. One clock says which
//               moment is shown; a camera that has nothing then joins as soon as it has. Where none has anything, the
//               clock continues with whatever comes next on any camera. One camera is active: steps are frames of it,
//               and a pause shows what each camera had at the time of its picture.

import type { Footage } from "../wire/footage";
import type { Recordings } from "../wire/recordings";
import type { FootageCache } from "./footage_cache";
import { covers, FootageLookup, kMaxGapS } from "./footage_lookup";
import { kActive, Tracks, type Track } from "./tracks";

/** How often at most a player that was left behind is brought back. */
const kRejoinIntervalMs = 5_000;
/** Ends of recordings are rounded up to seconds: this much later there is surely nothing. */
const kEndToleranceMs = 1_000;

export class SyncPlayback {
  readonly #lookup: FootageLookup;
  readonly #changed: () => void;
  readonly #skipped: (seconds: number) => void;
  readonly #tracks: Tracks;
  #activeTrack: Track | null = null;
  #playheadMs: number | null = null;
  #isPlaying = false;
  #isScrubbed = false;
  #isAdvancing = false;
  /** Counts how often the user went elsewhere. */
  #generation = 0;
  /** When a track was last brought to the playhead, and where the playhead was. */
  readonly #joined = new WeakMap<Track, { clockMs: number; atMs: number }>();

  /**
   * `changed` is called whenever there is something else to show; `skipped` when playing leaves out a gap of that
   * length.
   */
  constructor(recordings: Recordings, cache: FootageCache, changed: () => void, skipped: (seconds: number) => void) {
    this.#tracks = new Tracks(recordings, (track) => this.#follow(track));
    this.#lookup = new FootageLookup(recordings, cache);
    this.#changed = changed;
    this.#skipped = skipped;
  }

  get #active(): Track | null {
    return this.#activeTrack;
  }

  /** Where its sound was on, that of the next one is. */
  set #active(track: Track | null) {
    const before = this.#activeTrack;
    this.#activeTrack = track;
    if (track === before || !before?.player.sound.isOn) return;
    before.player.sound.switchOff();
    void track?.player.sound.switchOn();
  }

  get tracks(): readonly Track[] {
    return this.#tracks.all;
  }

  get active(): Track | null {
    return this.#active;
  }

  /** Unix milliseconds of what is shown; null before anything is. */
  get playheadMs(): number | null {
    return this.#playheadMs;
  }

  get isPlaying(): boolean {
    return this.#isPlaying;
  }

  /** The playhead is being dragged. */
  get isScrubbed(): boolean {
    return this.#isScrubbed;
  }

  get rate(): number {
    return this.#tracks.rate;
  }

  /** What the camera has at a time, as far as is known. */
  footageAt(camera: number, atMs: number): Footage | null {
    return this.#lookup.at(camera, atMs);
  }

  /** Plays these cameras; those that stay play on, and the players of the others end. */
  setCameras(cameras: readonly number[]): void {
    const added = this.#tracks.setCameras(cameras);
    this.#active = this.#tracks.of(this.#active?.camera) ?? this.tracks[0] ?? null;
    for (const track of added) this.#join(track, this.#isPlaying);
    this.#changed();
  }

  setActive(camera: number): void {
    this.#active = this.#tracks.of(camera) ?? this.#active;
    this.#changed();
  }

  /** Plays a recording of one of the cameras, and what the others have at that time. */
  open(footage: Footage, atMs = footage.start * 1000, isPlaying = true): void {
    const track = this.#tracks.of(footage.camera);
    if (!track) return;
    this.#active = track;
    this.#goTo(atMs, isPlaying);
    this.#tracks.start(track, footage, atMs, isPlaying);
    for (const other of this.tracks) if (other !== track) this.#join(other, isPlaying);
    this.#changed();
  }

  /** Goes to a time of all cameras; `camera` becomes active. Within a mark that is played, where it has that time. */
  seek(atMs: number, camera = this.#active?.camera, isPlaying = this.#isPlaying): void {
    const current = this.#active?.player.footage;
    const isInMark = current && current.kind !== "event" && current.camera === camera && covers(current, atMs);
    const wanted = isInMark ? current : camera === undefined ? null : this.#lookup.at(camera, atMs);
    if (wanted) return this.open(wanted, atMs, isPlaying);
    this.#active = this.#tracks.of(camera) ?? this.#active;
    const hasAny = this.tracks.some((track) => this.#lookup.at(track.camera, atMs));
    this.#goTo(atMs, isPlaying && hasAny);
    for (const track of this.tracks) this.#join(track, this.#isPlaying);
    this.#changed();
  }

  /** The playhead is dragged: it moves, and nothing plays until `seek` or `open`. */
  scrub(atMs: number): void {
    const isFirst = !this.#isScrubbed;
    // First, so that no camera is brought to where the pause is.
    this.#isScrubbed = true;
    if (isFirst) this.pause();
    this.#playheadMs = atMs;
    this.#changed();
  }

  play(): void {
    const atMs = this.#playheadMs;
    if (atMs === null) return;
    const active = this.#active?.player;
    const ended = active?.state.kind === "ended" ? active.footage : null;
    this.#goTo(atMs, true);
    for (const track of this.tracks) {
      if (track.player.state.kind === "ended") void this.#goOn(track, false);
      else if (!this.#tracks.resume(track, atMs)) this.#join(track, true);
    }
    if (!this.#tracks.hasActive) void this.#advance(() => (ended ? this.open(ended) : this.pause()));
    this.#changed();
  }

  pause(): void {
    this.#isPlaying = false;
    this.#tracks.pause();
    this.#changed();
  }

  /** For the active camera. Call it while handling a click or key. */
  toggleSound(): void {
    const sound = this.#active?.player.sound;
    if (sound?.isOn) sound.switchOff();
    else void sound?.switchOn();
  }

  /** Pauses, and moves by frames of the active camera. */
  step(by: number): void {
    if (this.#isPlaying) this.pause();
    this.#active?.player.step(by);
  }

  setRate(rate: number): void {
    const before = this.rate;
    this.#tracks.setRate(rate);
    // What is on its way to the players leaves out frames that a slower rate shows.
    if (this.#isPlaying && before > 1 && rate < before) this.#reopen(this.#tracks.clock.atMs);
    this.#changed();
  }

  /** Call it a few times a second: lets cameras join that have something now, and those that were left behind. */
  tick(): void {
    if (!this.#isPlaying) return;
    const atMs = this.#tracks.clock.atMs;
    if (this.#active?.player.state.kind !== "playing") this.#playheadMs = atMs;
    void this.#lookup.load(this.#tracks.cameras, atMs);
    for (const track of this.tracks) {
      const { state, footage } = track.player;
      // A picture of another time must not be taken for one of now.
      if (state.kind === "ended" && footage && atMs > footage.stop * 1000 + kEndToleranceMs) track.player.close();
      const isDue = track.player.state.kind === "empty" && this.#lookup.at(track.camera, atMs);
      if (isDue || (this.#tracks.clock.isLeftBehind(track) && this.#mayRejoin(track))) this.#join(track, true);
    }
    if (!this.#tracks.hasActive) void this.#advance();
    this.#changed();
  }

  /** Ends all, and has nothing to show any more. */
  close(): void {
    this.#goTo(0, false);
    this.#playheadMs = null;
    this.#tracks.close();
  }

  /** The cache does not know the end of what is still being recorded, so the active camera's is opened again anyway. */
  #reopen(atMs: number): void {
    const { footage, state } = this.#active?.player ?? {};
    if (footage?.isGrowing && state && kActive.includes(state.kind)) this.open(footage, atMs);
    else this.seek(atMs);
  }

  #goTo(atMs: number, isPlaying: boolean): void {
    this.#generation += 1;
    this.#isScrubbed = false;
    this.#playheadMs = atMs;
    this.#isPlaying = isPlaying;
    this.#tracks.clock.set(atMs, isPlaying);
  }

  #follow(track: Track): void {
    const { state, timeMs, positionMs, footage, rate } = track.player;
    if (track === this.#active && footage && !this.#isScrubbed) {
      if (state.kind === "playing") this.#playheadMs = positionMs;
      if (state.kind === "paused") this.#playheadMs = timeMs;
      if (state.kind === "paused" && !this.#isPlaying) this.#alignOthers();
    }
    if (this.#isPlaying) {
      // A player slows down when it comes to the end of what is still being recorded.
      if (state.kind === "playing" && rate !== this.rate) return this.setRate(rate);
      if (state.kind === "ended") void this.#goOn(track, true);
      if (/failed|preempted/.test(state.kind) && !this.#tracks.hasActive) this.#isPlaying = false;
    }
    this.#changed();
  }

  #alignOthers(): void {
    for (const other of this.tracks) {
      if (other === this.#active || this.#playheadMs === null) continue;
      if (this.#joined.get(other)?.atMs !== this.#playheadMs) this.#join(other, false);
    }
  }

  #mayRejoin(track: Track): boolean {
    return performance.now() - (this.#joined.get(track)?.clockMs ?? -Infinity) >= kRejoinIntervalMs;
  }

  /** Shows what the camera has at the playhead. What is not known of it is looked up first. */
  #join(track: Track, isPlaying: boolean, isKnown = false): void {
    if (this.#playheadMs === null) return;
    const atMs = isPlaying ? this.#tracks.clock.atMs : this.#playheadMs;
    const joined = { clockMs: performance.now(), atMs };
    this.#joined.set(track, joined);
    const footage = this.#lookup.at(track.camera, atMs);
    if (footage) return this.#tracks.start(track, footage, atMs, isPlaying);
    if (track.player.footage) track.player.close();
    if (isKnown) return;
    void this.#lookup.load([track.camera], atMs, true).then(() => {
      // Meanwhile it may have joined elsewhere.
      const isWanted = this.#joined.get(track) === joined && this.tracks.includes(track) && !track.player.footage;
      if (isWanted && this.#lookup.at(track.camera, atMs)) this.#join(track, this.#isPlaying, true);
    });
  }

  /** Plays what follows a recording that has ended. A mark is played by itself: with `mayStop` its end is a pause. */
  async #goOn(track: Track, mayStop: boolean): Promise<void> {
    const ended = track.player.footage;
    if (ended?.kind !== "event") return mayStop && track === this.#active ? this.pause() : undefined;
    this.#tracks.awaitNext(track);
    const next = await this.#lookup.following(ended);
    const isWanted = this.#isPlaying && this.tracks.includes(track) && track.player.footage === ended;
    if (!isWanted || track.player.state.kind !== "ended") return;
    if (next) return this.#tracks.start(track, next, next.start * 1000, true);
    this.#tracks.clock.leave(track);
    if (!this.#tracks.hasActive) await this.#advance();
  }

  /** Plays what comes after the playhead; where nothing does, calls `otherwise`, or stops. */
  async #advance(otherwise = () => this.pause()): Promise<void> {
    if (this.#isAdvancing) return;
    this.#isAdvancing = true;
    try {
      const [generation, fromMs, ended] = [this.#generation, this.#tracks.clock.atMs, this.#tracks.ended];
      const ends = ended.map(({ stop }) => stop).filter((stop) => stop * 1000 <= fromMs + kEndToleranceMs);
      const fromS = Math.max(fromMs / 1000, ...ends);
      const current = this.#active?.player.footage ?? ended[0] ?? null;
      // After a mark nothing follows by itself.
      const isMark = current !== null && current.kind !== "event";
      const next = isMark ? null : await this.#lookup.next(this.#tracks.cameras, fromS, current);
      // Meanwhile the user may have gone elsewhere.
      if (!this.#isPlaying || this.#tracks.hasActive || this.#generation !== generation) return;
      if (!next) return otherwise();
      if (next.start - fromS > kMaxGapS && ended.length > 0) this.#skipped(next.start - fromS);
      this.open(next, Math.max(next.start, fromS) * 1000);
    } finally {
      this.#isAdvancing = false;
      this.#changed();
    }
  }
}
