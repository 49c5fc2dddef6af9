// SPDX-License-Identifier: Apache-2.0
//
// Plays one recording after another in one place on the screen: play, pause, step, seek, rate.
//
// Why so        The server streams from any frame on, and knows neither pause nor seek: so a pause closes the stream,
//               and every seek opens another. While paused there is no connection at all. A held key or a dragged
//               playhead asks for more frames than can be fetched: then only the last is.
//
//               The stream of a finished recording repeats its last frame for ever; the first repeat is the end. That
//               of a growing recording continues as it grows, and ends with it. Where the connection is lost, another
//               stream goes on from the frame on the screen.

import { delay } from "../wire/delay";
import { isSameFootage, type Footage } from "../wire/footage";
import { newStreamKey, type FrameStart, type Recordings } from "../wire/recordings";
import { ServerError } from "../wire/server";
import { isPassing, reasonOf } from "./failure_reason";
import { readFrames, type RecordedFrame } from "./frame_stream";
import type { PlayerState } from "./player_state";
import { kMaxFrameMs, ShownFrame } from "./shown_frame";
import { startAt, startOfStep, type Start } from "./start";
import { StillReader } from "./still_reader";
import { streamEnd } from "./stream_end";

const kTailDelayMs = 1_000;
/** At rate 1 a frame comes at least every second; opening a stream takes longer where the server is busy. */
const kMaxSilenceMs = 8_000;
/** Between attempts to get a lost stream back. */
const kRetryMs = 1_000;

export class Player {
  /**
   * Resolves when a frame of a stream, of that Unix time in milliseconds, is to be shown; with false where it is to be
   * left out.
   */
  pace: (positionMs: number, signal: AbortSignal) => Promise<boolean> = () => Promise.resolve(true);
  /** Draws a frame unless it is not wanted any more; the next is fetched when it is done. */
  show: (frame: RecordedFrame, signal: AbortSignal) => Promise<void> = async () => undefined;
  readonly #recordings: Recordings;
  readonly #changed: () => void;
  #footage: Footage | null = null;
  #state: PlayerState = { kind: "empty" };
  readonly #shown = new ShownFrame();
  /** As far as is known; 0 when it is not. */
  #frameCount = 0;
  #rate = 1;
  #key = 0;
  #lastFrameMs = 0;
  #run = new AbortController();
  /** Where playing begins, until its first frame is shown. */
  #opening: Start | null = null;
  /** While paused: the frame requested last, until it is shown; and the request that is under way. */
  #wanted: Start | null = null;
  #fetching: AbortSignal | null = null;
  readonly #stills: StillReader;

  /** `changed` is called with every frame and every other change. */
  constructor(recordings: Recordings, changed: () => void) {
    this.#recordings = recordings;
    this.#stills = new StillReader(recordings);
    this.#changed = changed;
  }

  get footage(): Footage | null {
    return this.#footage;
  }

  get state(): PlayerState {
    return this.#state;
  }

  /** Of the frame on the screen. */
  get index(): number {
    return this.#shown.index;
  }

  get rate(): number {
    return this.#rate;
  }

  /** How many frames there are; 0 when that is not known. */
  get frameCount(): number {
    return this.#frameCount;
  }

  /**
   * Unix milliseconds at which the frame on the screen was taken; before the first one, of the time that was asked for.
   */
  get timeMs(): number {
    return this.#shown.capturedMs;
  }

  /** The same, but going on while the last picture of a slow camera is repeated. */
  get positionMs(): number {
    return this.#shown.positionMs;
  }

  /** Changes to a recording, at that time. */
  open(footage: Footage, atMs: number, isPlaying: boolean): void {
    const isSame = isSameFootage(footage, this.#footage);
    if (!isSame) {
      this.#frameCount = footage.frameCount;
      this.#shown.reset(Math.max(atMs, footage.start * 1000));
      this.#stills.forget();
    }
    this.#take(footage);
    const start = startAt(footage, atMs);
    if (isPlaying) void this.#play(start);
    else this.#showStill(start);
  }

  /** Plays on; the first frame is due at its own time, or at that one if it is later. */
  play(dueFromMs = -Infinity): void {
    if (!this.#footage || this.#state.kind === "playing") return;
    const start = this.#wanted ?? this.#opening ?? { index: this.#state.kind === "ended" ? 0 : this.index };
    void this.#play(start, dueFromMs);
  }

  pause(): void {
    if (!["playing", "opening", "lost"].includes(this.#state.kind)) return;
    // Before the first frame there is no picture yet that could stay. A still that is being fetched is as good as a
    // pause.
    if (this.#opening) return this.#showStill(this.#opening);
    if (this.#fetching) return;
    this.#begin();
    this.#become({ kind: "paused" });
  }

  step(by: number): void {
    if (!this.#footage) return;
    const from = this.#wanted && "index" in this.#wanted ? this.#wanted.index : this.index;
    const last = this.#footage.isGrowing || this.#frameCount === 0 ? Infinity : this.#frameCount - 1;
    const index = Math.max(0, Math.min(from + by, last));
    if (index !== this.index || this.#state.kind !== "paused") this.#showStill(startOfStep(index, by));
  }

  /** Changes a running stream, without interruption where the server can do that. */
  setRate(rate: number): void {
    if (rate === this.#rate) return;
    this.#rate = rate;
    this.#changed();
    if (this.#state.kind !== "playing") return;
    const run = this.#run;
    this.#recordings.setRate(this.#key, rate).catch(() => {
      if (run === this.#run && this.#state.kind === "playing") void this.#play({ index: this.index });
    });
  }

  /** Closes the connection, and goes back to having nothing to play. */
  close(): void {
    this.#begin();
    this.#stills.forget();
    this.#footage = null;
    this.#become({ kind: "empty" });
  }

  #begin(): AbortSignal {
    this.#run.abort();
    this.#run = new AbortController();
    this.#opening = this.#wanted = this.#fetching = null;
    return this.#run.signal;
  }

  #become(state: PlayerState): void {
    this.#state = state;
    this.#changed();
  }

  #take(footage: Footage): void {
    this.#footage = footage;
    this.#frameCount = Math.max(this.#frameCount, footage.frameCount);
  }

  /**
   * The frame to begin with; null when the server does not say, which has become the state, or where it is not wanted
   * any more.
   */
  async #locate(start: Start, signal: AbortSignal): Promise<FrameStart | null> {
    if ("index" in start) return start;
    const footage = this.#footage!;
    const found = await this.#recordings.frameAt(footage, start.atMs).catch((error: ServerError) => error);
    if (signal.aborted) return null;
    if (found instanceof ServerError) await this.#fail(found, signal);
    else if (isSameFootage(footage, this.#footage)) this.#frameCount = found.frameCount;
    return found instanceof ServerError ? null : { index: found.index };
  }

  #showStill(start: Start): void {
    if (!this.#fetching) return void this.#fetchStills(start);
    this.#wanted = start;
  }

  async #fetchStills(first: Start): Promise<void> {
    const signal = this.#begin();
    this.#fetching = signal;
    this.#wanted = first;
    this.#become({ kind: "opening" });
    for (let start: Start | null = null; start !== this.#wanted; ) {
      start = this.#wanted!;
      if (!(await this.#fetch(start, signal)) || signal.aborted) return;
    }
    this.#wanted = this.#fetching = null;
    this.#become({ kind: "paused" });
  }

  /** Shows one frame; false when that failed, which has become the state. */
  async #fetch(wanted: Start, signal: AbortSignal): Promise<boolean> {
    const footage = this.#footage!;
    const start = await this.#locate(wanted, signal);
    if (!start) return false;
    const show = (frame: RecordedFrame) => this.#showFrame(frame, signal);
    const read = this.#stills.read(footage, start, show, signal, kMaxSilenceMs);
    const failure = await read.catch((error: ServerError) => error);
    if (failure && !signal.aborted) await this.#fail(failure, signal);
    return !failure;
  }

  async #play(start: Start, dueFromMs = -Infinity): Promise<void> {
    const signal = this.#begin();
    this.#opening = start;
    this.#shown.begin("atMs" in start ? start.atMs : dueFromMs);
    this.#stills.forget();
    this.#become({ kind: "opening" });
    const first = await this.#locate(start, signal);
    if (!first) return;
    this.#opening &&= first;
    for (let index = first.index; !signal.aborted; index = this.#opening ? first.index : this.index) {
      const failure = await this.#stream(index, signal).catch((error: ServerError) => error);
      if (signal.aborted || this.#state.kind === "ended") return;
      // A stream that has shown a picture can be had again.
      if (failure && (this.#opening || !isPassing(failure))) return this.#fail(failure, signal);
      if (failure) await this.#awaitReturn(signal);
      else if (!(await this.#continues(signal))) return;
    }
  }

  async #awaitReturn(signal: AbortSignal): Promise<void> {
    if (this.#state.kind !== "lost") this.#become({ kind: "lost" });
    await delay(kRetryMs, signal);
  }

  /** Plays from a frame on to the end of the stream. */
  async #stream(from: number, signal: AbortSignal): Promise<void> {
    const footage = this.#footage!;
    const key = (this.#key = newStreamKey());
    const rate = this.#rate;
    const extent = footage.isGrowing ? "growing" : "all";
    let before = -1;
    await readFrames(
      (until) => this.#recordings.play(footage, { index: from }, extent, rate, key, until),
      async (frame) => {
        if (frame.index === before && !footage.isGrowing) {
          this.#become({ kind: "ended" });
          return false;
        }
        // The rate may have been changed while the stream was being opened.
        if (before < 0 && this.#rate !== rate) this.#recordings.setRate(key, this.#rate).catch(() => undefined);
        before = frame.index;
        this.#state = { kind: "playing" };
        if (await this.pace(this.#shown.positionOf(frame), signal)) await this.#showFrame(frame, signal);
        return !signal.aborted;
      },
      signal,
      kMaxSilenceMs + kMaxFrameMs * Math.max(0, -rate, -this.#rate),
    );
  }

  async #showFrame(frame: RecordedFrame, signal: AbortSignal): Promise<void> {
    // A frame that cannot be decoded is left out, and counts as shown.
    await this.show(frame, signal).catch(() => undefined);
    if (signal.aborted) return;
    this.#lastFrameMs = performance.now();
    this.#opening = null;
    this.#shown.take(frame);
    this.#changed();
  }

  /** Whether there is more to play after the server has ended the stream; else the state says why not. */
  async #continues(signal: AbortSignal): Promise<boolean> {
    const ageMs = performance.now() - this.#lastFrameMs;
    const last = { index: this.index, ageMs, rate: this.#rate, frameCount: this.#frameCount };
    const end = await streamEnd(this.#recordings, this.#footage!, last);
    if (signal.aborted) return false;
    if (end.kind === "lost") {
      await this.#awaitReturn(signal);
      return !signal.aborted;
    }
    if (end.kind === "removed") {
      await this.#fail(new ServerError(404, 0, ""), signal);
      return false;
    }
    this.#take(end.footage);
    if (end.kind !== "more") {
      this.#become({ kind: end.kind });
      return false;
    }
    // At the end of what is recorded so far, playback cannot be faster than the camera.
    if (end.footage.isGrowing && this.#rate > 1) this.#rate = 1;
    if (end.footage.isGrowing) await delay(kTailDelayMs, signal);
    return !signal.aborted;
  }

  async #fail(error: ServerError, signal: AbortSignal): Promise<void> {
    const reason = await reasonOf(error, this.#footage!, this.#recordings);
    if (signal.aborted) return;
    this.#begin();
    this.#become({ kind: "failed", reason });
  }
}
