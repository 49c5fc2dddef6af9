// SPDX-License-Identifier: Apache-2.0
//
// Plays footage from a frame on to its end, in as many streams as that takes.
//
// Why so        The stream of a growing recording continues as it grows, and ends with it. Where the connection is
//               lost, another stream continues from the frame on the screen.

import { delay } from "../wire/delay";
import { isTemporary } from "../wire/outage";
import { newStreamKey, type Recordings } from "../wire/recordings";
import { asServerError, ServerError } from "../wire/server";
import type { FootageStream } from "./footage_stream";
import { kMaxSilenceMs, type RecordedFrame } from "./frame_stream";
import type { OpenFootage } from "./open_footage";
import { kMaxFrameMs, type ShownFrame } from "./shown_frame";
import { streamEnd } from "./stream_end";

const kTailDelayMs = 1_000;
/** Between attempts to get a lost stream back. */
export const kRetryMs = 1_000;
/**
 * After this many lost streams in a row that showed nothing new, the recording counts as ended, even if its file claims
 * more.
 */
const kMaxSilentStreams = 2;

/** Where the frames go. */
export interface PlaybackSink {
  readonly shown: ShownFrame;
  /** Shows a frame when it is due, or drops it; the next is fetched when that is done. */
  take(frame: RecordedFrame): Promise<void>;
  /** The connection was lost; it is tried again until it is back. */
  lost(): void;
  /** At the end of what is recorded so far, playback cannot be faster than the camera. */
  slowedTo(rate: number): void;
}

export class Playback {
  readonly #recordings: Recordings;
  readonly #streams: FootageStream;
  readonly #opened: OpenFootage;
  readonly #sink: PlaybackSink;
  #rate: number;
  #isStreaming = false;
  /** The key of the stream that sends frames; 0 while none does. */
  #key = 0;
  #silentStreams = 0;

  constructor(recordings: Recordings, streams: FootageStream, opened: OpenFootage, rate: number, sink: PlaybackSink) {
    this.#recordings = recordings;
    this.#streams = streams;
    this.#opened = opened;
    this.#rate = rate;
    this.#sink = sink;
  }

  /**
   * Plays to the end, or until another player of this session takes over. Rejects with a ServerError where it cannot
   * continue; resolves with null when `signal` is aborted.
   */
  async run(from: number, signal: AbortSignal): Promise<"ended" | "preempted" | null> {
    const { shown } = this.#sink;
    while (!signal.aborted) {
      const end = await this.#playStream(shown.hasBegun ? shown.index : from, signal);
      if (end === "ended" || end === "preempted") return signal.aborted ? null : end;
      if (end === "lost" && !signal.aborted) this.#sink.lost();
      if (end === "lost") await delay(kRetryMs, signal);
    }
    return null;
  }

  /** Changes a running stream without interruption; rejects where that takes another playback. */
  async setRate(rate: number): Promise<void> {
    this.#rate = rate;
    if (this.#isStreaming && !this.#streams.canChangeTo(this.#opened.footage, rate)) throw new Error("another stream is needed");
    if (this.#key !== 0) await this.#recordings.setRate(this.#key, rate);
  }

  async #playStream(from: number, signal: AbortSignal): Promise<"ended" | "preempted" | "lost" | "more"> {
    const { shown } = this.#sink;
    const begunMs = performance.now();
    this.#isStreaming = true;
    try {
      return await this.#whatFollows(await this.#showFrames(from, signal), signal);
    } catch (error) {
      const failure = asServerError(error);
      // A stream that has shown a picture can be opened again.
      if (!shown.hasBegun || !isTemporary(failure)) throw failure;
      return this.#isOver(from, performance.now() - begunMs) ? "ended" : "lost";
    } finally {
      this.#isStreaming = false;
      this.#key = 0;
    }
  }

  /** Whether the recording counts as ended after a stream that began at `from` was lost after `ms`. */
  #isOver(from: number, ms: number): boolean {
    const isStill = this.#key !== 0 && this.#sink.shown.index === from;
    const isSilent = isStill && ms >= kMaxSilenceMs && !this.#opened.footage.isGrowing;
    this.#silentStreams = isSilent ? this.#silentStreams + 1 : 0;
    return this.#silentStreams >= kMaxSilentStreams;
  }

  /** Resolves with whether the stream is known to have ended after the last frame. */
  #showFrames(from: number, signal: AbortSignal): Promise<boolean> {
    const key = newStreamKey();
    const rate = this.#rate;
    return this.#streams.read(
      this.#opened.footage,
      { index: from, rate, key },
      async (frame) => {
        // The rate may have been changed while the stream was being opened.
        if (this.#key === 0 && this.#rate !== rate) this.#recordings.setRate(key, this.#rate).catch(() => undefined);
        this.#key = key;
        await this.#sink.take(frame);
        return !signal.aborted;
      },
      signal,
      kMaxSilenceMs + kMaxFrameMs * Math.max(0, -rate),
    );
  }

  /** After the server has ended the stream. */
  async #whatFollows(isWhole: boolean, signal: AbortSignal): Promise<"ended" | "preempted" | "lost" | "more"> {
    const { index, ageMs } = this.#sink.shown;
    const last = { index, ageMs, rate: this.#rate, frameCount: this.#opened.frameCount, isWhole };
    const end = await streamEnd(this.#recordings, this.#opened.footage, last);
    if (signal.aborted || end.kind === "lost") return "lost";
    if (end.kind === "removed") throw new ServerError(404, 0, "");
    this.#opened.update(end.footage);
    if (end.kind !== "more" || !end.footage.isGrowing) return end.kind;
    if (this.#rate > 1) this.#sink.slowedTo((this.#rate = 1));
    await delay(kTailDelayMs, signal);
    return "more";
  }
}
