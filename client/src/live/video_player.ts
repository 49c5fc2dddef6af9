// SPDX-License-Identifier: Apache-2.0
//
// Decodes a compressed stream and shows its pictures: at once, or in step with the sound while that is heard.

import { factsOf, type VideoCodec } from "./annexb";
import { PictureQueue } from "./av_clock";
import { FrameGate } from "./frame_gate";
import type { Capture } from "./media_part";
import { kUndecodable, unsupported, type Unplayable } from "./unplayable";
import type { AudioPlayer } from "./audio_player";
import type { Frame } from "./source";

/** A damaged piece now and then is no reason to give up a stream. */
const kMostErrors = 3;
const kErrorsForgottenMs = 30_000;
/** Longer than the distance of two key frames. */
const kFirstPictureLimitMs = 12_000;
/** A decoder that takes so many pictures without giving one never will. */
const kMostUnanswered = 500;

interface Arrival extends Capture {
  arrivedMs: number;
}

export class VideoPlayer {
  readonly #show: (frame: Frame) => void;
  readonly #giveUp: (unplayable: Unplayable) => void;
  readonly #sound: AudioPlayer | null;
  readonly #gate = new FrameGate();
  readonly #queue: PictureQueue<VideoFrame>;
  readonly #arrivals = new Map<number, Arrival>();
  readonly #startedMs = performance.now();
  #decoder: VideoDecoder | null = null;
  #codecString = "";
  #errors: number[] = [];
  #hasShown = false;
  #nextTurn = 0;
  #closed = false;

  /** `giveUp` is called when the stream cannot be played; nothing is shown after that. */
  constructor(show: (frame: Frame) => void, giveUp: (unplayable: Unplayable) => void, sound: AudioPlayer | null) {
    this.#show = show;
    this.#giveUp = giveUp;
    this.#sound = sound;
    this.#queue = new PictureQueue((us) => sound?.wait(us));
  }

  take(codec: VideoCodec, timestamp: number, data: Uint8Array, capture: Capture): void {
    if (this.#closed) return;
    const nowMs = performance.now();
    const hasWaitedEnough = !this.#hasShown && nowMs - this.#startedMs > kFirstPictureLimitMs;
    if (hasWaitedEnough || this.#arrivals.size > kMostUnanswered) return this.#end(kUndecodable);
    const { isKey, codecString } = factsOf(codec, data);
    if (isKey && codecString && codecString !== this.#codecString) this.#configure(codec, codecString);
    if (!this.#decoder) return;
    const admission = this.#gate.admit(isKey, this.#decoder.decodeQueueSize);
    if (admission === "drop") return;
    if (admission === "restart") {
      this.#decoder.reset();
      this.#decoder.configure(configOf(this.#codecString));
      this.#arrivals.clear();
    }
    this.#arrivals.set(timestamp, { ...capture, arrivedMs: nowMs });
    this.#decoder.decode(new EncodedVideoChunk({ type: isKey ? "key" : "delta", timestamp, data }));
  }

  close(): void {
    this.#closed = true;
    cancelAnimationFrame(this.#nextTurn);
    this.#queue.clear();
    this.#dropDecoder();
  }

  #configure(codec: VideoCodec, codecString: string): void {
    this.#dropDecoder();
    this.#codecString = codecString;
    const decoder = new VideoDecoder({
      output: (picture) => this.#receive(picture),
      error: () => void (decoder === this.#decoder && this.#recover(codec, codecString)),
    });
    decoder.configure(configOf(codecString));
    this.#decoder = decoder;
  }

  #dropDecoder(): void {
    if (this.#decoder && this.#decoder.state !== "closed") this.#decoder.close();
    this.#decoder = null;
    this.#codecString = "";
    this.#gate.begin();
    this.#arrivals.clear();
  }

  /** The next key frame gets a new decoder, unless that has not helped. */
  async #recover(codec: VideoCodec, codecString: string): Promise<void> {
    const nowMs = performance.now();
    this.#errors = [...this.#errors.filter((atMs) => nowMs - atMs < kErrorsForgottenMs), nowMs];
    this.#dropDecoder();
    // Browsers do not agree on the error that tells a codec they do not know.
    const { supported } = await VideoDecoder.isConfigSupported(configOf(codecString));
    if (this.#closed) return;
    if (!supported) this.#end(unsupported(codec));
    else if (this.#errors.length >= kMostErrors) this.#end(kUndecodable);
  }

  #end(unplayable: Unplayable): void {
    this.close();
    this.#giveUp(unplayable);
  }

  #receive(picture: VideoFrame): void {
    if (this.#closed) return picture.close();
    this.#queue.push(picture);
    this.#present();
  }

  #present(): void {
    cancelAnimationFrame(this.#nextTurn);
    const nowMs = performance.now();
    const image = this.#queue.take(this.#sound?.heardUs(nowMs) ?? null, nowMs);
    if (image) {
      const arrival = this.#arrivalOf(image.timestamp);
      this.#hasShown = true;
      this.#show({ image, capturedMs: arrival.capturedMs, ageMs: arrival.ageMs + nowMs - arrival.arrivedMs });
    }
    if (!this.#queue.isEmpty) this.#nextTurn = requestAnimationFrame(() => this.#present());
  }

  /** Forgets all up to this picture: those that have not been shown by now never will be. */
  #arrivalOf(timestamp: number): Arrival {
    const arrival = this.#arrivals.get(timestamp) ?? { capturedMs: Date.now(), ageMs: 0, arrivedMs: performance.now() };
    for (const earlier of this.#arrivals.keys()) if (earlier <= timestamp) this.#arrivals.delete(earlier);
    return arrival;
  }
}

function configOf(codec: string): VideoDecoderConfig {
  return { codec, optimizeForLatency: true };
}
