// SPDX-License-Identifier: Apache-2.0
//
// Plays one recording after another in one place on the screen: play, pause, step, seek, rate.
//
// Why so        The server streams from any frame on, and knows neither pause nor seek: so a pause closes the stream, and
//               every seek opens another. While paused there is no connection at all. A held
//               key or a dragged playhead asks for more frames than can be fetched: then only the last is.
//
//               The stream of a finished recording repeats its last frame for ever; the first repeat is the end. That of a
//               growing recording continues as it grows, and ends with it.

import { delay } from "../wire/delay";
import { newStreamKey, type Footage, type Recordings, type Start } from "../wire/recordings";
import { ServerError } from "../wire/server";
import { FrameClock } from "./frame_clock";
import { readFrames, type RecordedFrame } from "./frame_stream";
import type { PlayerState } from "./player_state";

const kTailDelayMs = 1_000;
/** The server waits longer for what is still being recorded, and not at all when another player takes over. */
const kTailSilenceMs = 1_500;
/** A list rounds a recording's end to seconds. */
const kExactUntilMs = 1_000;
const kCannotPlay = 200;
/** A frame is decoded from the key frame before it on, so a step back keeps this many that are passed for the next steps. */
const kStepBackFrames = 12;

export class Player {
  /** Draws a frame unless it is not wanted any more; the next is fetched when it is done. */
  show: (frame: RecordedFrame, signal: AbortSignal) => Promise<void> = async () => undefined;
  readonly #recordings: Recordings;
  readonly #changed: () => void;
  #footage: Footage | null = null;
  #clock = new FrameClock(0, 0);
  #state: PlayerState = { kind: "empty" };
  #index = 0;
  #rate = 1;
  #key = 0;
  #lastFrameMs = 0;
  #run = new AbortController();
  /** Where playing begins, until its first frame is shown. */
  #opening: Start | null = null;
  /** While paused: the frame requested last, until it is shown; and the request that is under way. */
  #wanted: Start | null = null;
  #fetching: AbortSignal | null = null;
  /** What the last step back to the server has passed. */
  readonly #kept = new Map<number, RecordedFrame>();

  /** `changed` is called with every frame and every other change. */
  constructor(recordings: Recordings, changed: () => void) {
    this.#recordings = recordings;
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
    return this.#index;
  }

  get rate(): number {
    return this.#rate;
  }

  /** Unix milliseconds of the frame on the screen. */
  get timeMs(): number {
    return (this.#footage?.start ?? 0) * 1000 + this.#clock.msOf(this.#index);
  }

  /** Changes to a recording, `sinceStartMs` after its start. */
  open(footage: Footage, sinceStartMs: number, isPlaying: boolean): void {
    const isSame = this.#footage?.kind === footage.kind && this.#footage.id === footage.id;
    if (!isSame) {
      this.#clock = new FrameClock(footage.frameCount, durationMs(footage));
      this.#kept.clear();
    }
    this.#take(footage);
    const start = this.#startAt(sinceStartMs);
    if (isPlaying) void this.#play(start);
    else this.#showStill(start);
  }

  play(): void {
    if (!this.#footage || this.#state.kind === "playing") return;
    void this.#play(this.#wanted ?? this.#opening ?? { index: this.#state.kind === "ended" ? 0 : this.#index });
  }

  pause(): void {
    if (this.#state.kind !== "playing" && this.#state.kind !== "opening") return;
    // Before the first frame there is no picture yet that could stay. A still that is being fetched is as good as a pause.
    if (this.#opening) return this.#showStill(this.#opening);
    if (this.#fetching) return;
    this.#begin();
    this.#become({ kind: "paused" });
  }

  step(by: number): void {
    if (!this.#footage) return;
    const from = this.#wanted && "index" in this.#wanted ? this.#wanted.index : this.#index;
    const last = this.#footage.isGrowing || !this.#footage.frameCount ? Infinity : this.#footage.frameCount - 1;
    const index = Math.max(0, Math.min(from + by, last));
    const start: Start = by < 0 ? { index, from: Math.max(0, index - kStepBackFrames + 1) } : { index };
    if (index !== this.#index || this.#state.kind !== "paused") this.#showStill(start);
  }

  /** Changes a running stream, without interruption where the server can do that. */
  setRate(rate: number): void {
    if (rate === this.#rate) return;
    this.#rate = rate;
    this.#changed();
    if (this.#state.kind !== "playing") return;
    const run = this.#run;
    this.#recordings.setRate(this.#key, rate).catch(() => {
      if (run === this.#run && this.#state.kind === "playing") void this.#play({ index: this.#index });
    });
  }

  /** Closes the connection, and goes back to having nothing to play. */
  close(): void {
    this.#begin();
    this.#kept.clear();
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
    this.#clock.extend(footage.frameCount, durationMs(footage));
  }

  #startAt(ms: number): Start {
    const footage = this.#footage!;
    const timeMs = Math.round(Math.max(0, Math.min(ms, durationMs(footage))));
    if (timeMs === 0) return { index: 0 };
    // The server finds times in recordings only, not in marks.
    return footage.kind === "event" ? { timeMs } : { index: this.#clock.indexOf(timeMs) };
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
  async #fetch(start: Start, signal: AbortSignal): Promise<boolean> {
    const footage = this.#footage!;
    const kept = "index" in start ? this.#kept.get(start.index) : undefined;
    if (kept) {
      await this.#showFrame(kept, signal);
      return !signal.aborted;
    }
    this.#kept.clear();
    let isShown = false;
    const open = (until: AbortSignal) => this.#recordings.play(footage, start, "one", 1, newStreamKey(), until);
    const take = async (frame: RecordedFrame) => {
      if ("index" in start && start.from !== undefined) this.#kept.set(frame.index, frame);
      if ("index" in start && frame.index < start.index) return true;
      await this.#showFrame(frame, signal);
      isShown = true;
      return false;
    };
    try {
      await readFrames(open, take, signal);
    } catch (error) {
      if (!signal.aborted) await this.#fail(error as ServerError, signal);
      return false;
    }
    if (isShown && "timeMs" in start && start.timeMs < durationMs(footage) - kExactUntilMs) {
      this.#clock.learn(this.#index, start.timeMs);
    }
    if (!isShown && !signal.aborted) await this.#fail(new ServerError(0, 0, "The connection was lost."), signal);
    return isShown;
  }

  async #play(start: Start): Promise<void> {
    const signal = this.#begin();
    this.#opening = start;
    this.#kept.clear();
    this.#become({ kind: "opening" });
    let next = start;
    if ("timeMs" in start) {
      if (!(await this.#fetch(start, signal)) || signal.aborted) return;
      next = { index: this.#index };
    }
    for (let index = (next as { index: number }).index; !signal.aborted; index = this.#index) {
      const failure = await this.#stream(index, signal).catch((error: ServerError) => error);
      if (signal.aborted) return;
      if (failure) return this.#fail(failure, signal);
      if (this.#state.kind === "ended" || !(await this.#continues(signal))) return;
    }
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
        await this.#showFrame(frame, signal);
        return !signal.aborted;
      },
      signal,
    );
  }

  async #showFrame(frame: RecordedFrame, signal: AbortSignal): Promise<void> {
    // A frame that cannot be decoded is left out, and counts as shown.
    await this.show(frame, signal).catch(() => undefined);
    if (signal.aborted) return;
    this.#lastFrameMs = performance.now();
    this.#opening = null;
    this.#index = frame.index;
    this.#changed();
  }

  /**
   * Whether there is more to play after the server has ended the stream; else the state says why not. The server cannot be
   * asked whether this player was preempted, so that is concluded from how the stream ended.
   */
  async #continues(signal: AbortSignal): Promise<boolean> {
    const before = this.#footage!;
    const wasAtTail = before.isGrowing && performance.now() - this.#lastFrameMs >= kTailSilenceMs;
    const footage = await this.#recordings.find(before).catch(() => before);
    if (signal.aborted) return false;
    if (!footage) {
      await this.#fail(new ServerError(404, 0, ""), signal);
      return false;
    }
    this.#take(footage);
    const isAtEnd = !footage.isGrowing && this.#index + Math.max(1, this.#rate) >= footage.frameCount;
    if (!wasAtTail || isAtEnd) {
      this.#become({ kind: wasAtTail ? "ended" : "preempted" });
      return false;
    }
    // At the end of what is recorded so far, playback cannot be faster than the camera.
    if (footage.isGrowing && this.#rate > 1) this.#rate = 1;
    if (footage.isGrowing) await delay(kTailDelayMs, signal);
    return !signal.aborted;
  }

  /** Tells a recording that retention has deleted from one that cannot be played. */
  async #fail(error: ServerError, signal: AbortSignal): Promise<void> {
    let reason = error.message;
    if (error.status === kCannotPlay || error.status === 404) {
      const footage = await this.#recordings.find(this.#footage!).catch(() => this.#footage);
      if (signal.aborted) return;
      if (!footage) reason = "The recording no longer exists.";
      else if (error.status === 404) reason = "The recording cannot be played.";
    }
    this.#begin();
    this.#become({ kind: "failed", reason });
  }
}

function durationMs({ start, stop }: Footage): number {
  return Math.max(0, stop - start) * 1000;
}
