// SPDX-License-Identifier: Apache-2.0
//
// Chooses how a recording is streamed: as it was recorded where this browser can decode that, else as pictures.
//
// Why so        A stream of pictures of a finished recording repeats its last frame for ever; the first repeat is the
//               end.

import { isSameFootage, type Footage } from "../wire/footage";
import { isTemporary } from "../wire/outage";
import type { Recordings } from "../wire/recordings";
import { ServerError } from "../wire/server";
import { readFrames, type RecordedFrame } from "./frame_stream";
import { RecordedSound } from "./recorded_sound";
import { kNotStreamed } from "./video_decoding";
import { readVideo } from "./video_stream";

/** Faster, most frames are dropped, which is less work for the server. */
const kMaxVideoRate = 2;

/** What cameras send: the main profile, up to level 5. */
const kH265 = "hev1.1.6.L150.B0";

export interface StreamStart {
  index: number;
  rate: number;
  key: number;
}

/** What the server may stream to this browser; whether it can decode a recording shows with that. */
async function streamedCodecs(): Promise<string> {
  const { supported } = await VideoDecoder.isConfigSupported({ codec: kH265 }).catch(() => ({ supported: false }));
  return supported ? "H264,H265" : "H264";
}

export class FootageStream {
  readonly sound: RecordedSound;
  readonly #recordings: Recordings;
  /** What cannot be streamed, or not be decoded here. */
  #refused: Footage | null = null;
  #isVideo = false;

  /** `changed` is called when existence, state or error of the sound has changed. */
  constructor(recordings: Recordings, changed: () => void) {
    this.#recordings = recordings;
    this.sound = new RecordedSound(changed);
  }

  /** Whether the stream that runs can continue at that rate, and is of the kind that is best for it. */
  canChangeTo(footage: Footage, rate: number): boolean {
    return !this.#isVideo && !this.#takesVideo(footage, rate);
  }

  /**
   * Hands frames to `take` until that returns false or the stream ends; resolves with whether it is known to have ended
   * after the last frame. Rejects with a ServerError.
   */
  async read(
    footage: Footage,
    { index, rate, key }: StreamStart,
    take: (frame: RecordedFrame) => Promise<boolean>,
    signal: AbortSignal,
    maxSilenceMs: number,
  ): Promise<boolean> {
    this.#isVideo = this.#takesVideo(footage, rate);
    let shown: number | null = null;
    if (this.#isVideo) {
      const keep = (frame: RecordedFrame) => {
        shown = frame.index;
        return take(frame);
      };
      const codecs = await streamedCodecs();
      const open = (until: AbortSignal) => this.#recordings.stream(footage, { index, rate, key, codecs }, until);
      try {
        return await readVideo(open, { from: index, rate }, keep, this.sound, signal);
      } catch (error) {
        if (!(error instanceof ServerError) || isTemporary(error)) throw error;
        // Any other failure will be told by the pictures, too.
        if (error.status === kNotStreamed) this.#refused = footage;
        this.#isVideo = false;
      }
      if (signal.aborted) return false;
    }
    const extent = footage.isGrowing ? "growing" : "all";
    const open = (until: AbortSignal) => this.#recordings.play(footage, { index: shown ?? index }, extent, rate, key, until);
    // What is on the screen comes again, which is not its repetition at the end.
    let isAgain = shown !== null;
    let before = -1;
    let isWhole = false;
    const takeNew = async (frame: RecordedFrame) => {
      isWhole = frame.index === before && !footage.isGrowing;
      before = frame.index;
      if (!isAgain) return !isWhole && take(frame);
      isAgain = false;
      return true;
    };
    await readFrames(open, takeNew, signal, maxSilenceMs);
    return isWhole;
  }

  #takesVideo(footage: Footage, rate: number): boolean {
    return !isSameFootage(footage, this.#refused) && rate <= kMaxVideoRate && typeof VideoDecoder !== "undefined";
  }
}
