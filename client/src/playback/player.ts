// SPDX-License-Identifier: Apache-2.0
//
// Plays one recording after another in one place on the screen: play, pause, step, seek, rate.
//
// Why so        The server streams from any frame on, and knows neither pause nor seek: so a pause closes the stream,
//               and every seek opens another. While paused there is no connection at all. A held key or a dragged
//               playhead asks for more frames than can be fetched: then only the last is.

import type { AudioPlayer } from "../live/audio_player";
import { delay } from "../wire/delay";
import { isSameFootage, type Footage } from "../wire/footage";
import { isAway } from "../wire/outage";
import type { Recordings } from "../wire/recordings";
import { asServerError } from "../wire/server";
import { reasonOf } from "./failure_reason";
import { FootageStream } from "./footage_stream";
import type { RecordedFrame } from "./frame_stream";
import { OpenFootage } from "./open_footage";
import { kRetryMs, Playback, type PlaybackSink } from "./playback";
import type { PlayerState } from "./player_state";
import { ShownFrame } from "./shown_frame";
import { startAt, startOfStep, type Start } from "./start";

export class Player {
  /**
   * Resolves when a frame of a stream, of that Unix time in milliseconds, is to be shown; with false where it is to be
   * dropped.
   */
  pace: (positionMs: number, signal: AbortSignal) => Promise<boolean> = () => Promise.resolve(true);
  /** Draws a frame unless it is not wanted any more; the next is fetched when it is done. */
  show: (frame: RecordedFrame, signal: AbortSignal) => Promise<void> = async () => undefined;
  readonly #recordings: Recordings;
  readonly #changed: () => void;
  #opened: OpenFootage | null = null;
  #state: PlayerState = { kind: "empty" };
  readonly #shown = new ShownFrame();
  #rate = 1;
  #run = new AbortController();
  #playback: Playback | null = null;
  /** Where playing begins, until its first frame is shown. */
  #opening: Start | null = null;
  /** While stills are being fetched: the one that was requested last. */
  #wanted: Start | null = null;
  readonly #streams: FootageStream;

  /** `changed` is called with every frame and every other change. */
  constructor(recordings: Recordings, changed: () => void) {
    this.#recordings = recordings;
    this.#streams = new FootageStream(recordings, changed);
    this.#changed = changed;
  }

  get footage(): Footage | null {
    return this.#opened?.footage ?? null;
  }

  get state(): PlayerState {
    return this.#state;
  }

  /** The number of the frame on the screen. */
  get index(): number {
    return this.#shown.index;
  }

  get rate(): number {
    return this.#rate;
  }

  get sound(): AudioPlayer {
    return this.#streams.sound.player;
  }

  /** How many frames there are; 0 when that is not known. */
  get frameCount(): number {
    return this.#opened?.frameCount ?? 0;
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
    if (this.#opened && isSameFootage(footage, this.footage)) this.#opened.update(footage);
    else {
      this.#opened = new OpenFootage(this.#recordings, footage);
      this.#shown.reset(Math.max(atMs, footage.start * 1000));
    }
    const start = startAt(footage, atMs);
    if (isPlaying) void this.#play(start);
    else this.#showStill(start);
  }

  /** Plays on; the first frame is due at its own time, or at that one if it is later. */
  play(dueFromMs = -Infinity): void {
    if (!this.#opened || this.#state.kind === "playing") return;
    const start = this.#wanted ?? this.#opening ?? { index: this.#state.kind === "ended" ? 0 : this.index };
    void this.#play(start, dueFromMs);
  }

  pause(): void {
    if (!["playing", "opening", "lost"].includes(this.#state.kind)) return;
    // Before the first frame there is no picture yet that could stay. A still that is being fetched is as good as a
    // pause.
    if (this.#opening) return this.#showStill(this.#opening);
    if (this.#wanted) return;
    this.#begin();
    this.#become({ kind: "paused" });
  }

  step(by: number): void {
    if (!this.#opened) return;
    const from = this.#wanted && "index" in this.#wanted ? this.#wanted.index : this.index;
    const index = this.#opened.nearest(from + by);
    if (index !== this.index || this.#state.kind !== "paused") this.#showStill(startOfStep(index, by));
  }

  /** Changes a running stream, without interruption where the server can do that. */
  setRate(rate: number): void {
    if (rate === this.#rate) return;
    this.#rate = rate;
    this.#changed();
    const playback = this.#playback;
    playback?.setRate(rate).catch(() => {
      const isRunning = this.#state.kind === "playing" || this.#state.kind === "opening";
      if (playback === this.#playback && isRunning) void this.#play(this.#opening ?? { index: this.index });
    });
  }

  /** Closes the connection, and goes back to having nothing to play. */
  close(): void {
    this.#begin();
    this.#opened = null;
    this.#become({ kind: "empty" });
  }

  #begin(): AbortSignal {
    this.#run.abort();
    this.#run = new AbortController();
    this.#opening = this.#wanted = this.#playback = null;
    return this.#run.signal;
  }

  #become(state: PlayerState): void {
    this.#state = state;
    this.#changed();
  }

  #showStill(start: Start): void {
    if (this.#wanted) this.#wanted = start;
    else void this.#fetchStills(start);
  }

  async #fetchStills(first: Start): Promise<void> {
    const signal = this.#begin();
    this.#wanted = first;
    this.#become({ kind: "opening" });
    try {
      for (let start: Start | null = null; start !== this.#wanted; ) {
        start = this.#wanted!;
        await this.#fetchStill(start, signal);
        if (signal.aborted) return;
      }
      this.#wanted = null;
      this.#become({ kind: "paused" });
    } catch (error) {
      await this.#fail(error, signal);
    }
  }

  async #fetchStill(start: Start, signal: AbortSignal): Promise<void> {
    const opened = this.#opened!;
    const located = await opened.locate(start);
    if (signal.aborted) return;
    await opened.stills.read(opened.footage, located, (frame) => this.#showFrame(frame, signal), signal);
  }

  async #play(start: Start, dueFromMs = -Infinity): Promise<void> {
    const opened = this.#opened!;
    const signal = this.#begin();
    this.#opening = start;
    this.#shown.begin("atMs" in start ? start.atMs : dueFromMs);
    opened.stills.forget();
    this.#become({ kind: "opening" });
    while (!signal.aborted) {
      try {
        const first = await opened.locate(start);
        if (signal.aborted) return;
        this.#opening = first;
        this.#playback = new Playback(this.#recordings, this.#streams, opened, this.#rate, this.#sink(signal));
        const end = await this.#playback.run(first.index, signal);
        if (end) this.#become({ kind: end });
        return;
      } catch (error) {
        if (!isAway(asServerError(error))) return this.#fail(error, signal);
        if (!signal.aborted) this.#sink(signal).lost();
        await delay(kRetryMs, signal);
      }
    }
  }

  #sink(signal: AbortSignal): PlaybackSink {
    return {
      shown: this.#shown,
      take: async (frame) => {
        this.#state = { kind: "playing" };
        if (await this.pace(this.#shown.positionOf(frame), signal)) await this.#showFrame(frame, signal);
      },
      lost: () => {
        if (this.#state.kind !== "lost") this.#become({ kind: "lost" });
      },
      slowedTo: (rate) => {
        this.#rate = rate;
      },
    };
  }

  async #showFrame(frame: RecordedFrame, signal: AbortSignal): Promise<void> {
    // A frame that cannot be decoded is dropped, and counts as shown.
    await this.show(frame, signal).catch(() => undefined);
    if (signal.aborted) return;
    this.#opening = null;
    this.#shown.take(frame);
    this.#changed();
  }

  async #fail(error: unknown, signal: AbortSignal): Promise<void> {
    if (signal.aborted) return;
    const reason = await reasonOf(asServerError(error), this.footage!, this.#recordings);
    if (signal.aborted) return;
    this.#begin();
    this.#become({ kind: "failed", reason });
  }
}
