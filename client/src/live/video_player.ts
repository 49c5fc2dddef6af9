// SPDX-License-Identifier: Apache-2.0
//
// Decodes compressed video and shows its frames: at once, or in sync with the audio while that is audible.

import { frameInfoOf, type VideoCodec } from "./annexb";
import type { AudioPlayer } from "./audio_player";
import { FrameQueue } from "./av_clock";
import { FrameGate } from "./frame_gate";
import type { Capture } from "./media_part";
import type { Frame } from "./source";
import { kUndecodable, unsupported, type Unplayable } from "./unplayable";

/** Damage now and then is no reason to give up a stream. */
const kMaxErrors = 3;
const kErrorWindowMs = 30_000;
/** Longer than the interval of two key frames. */
const kMaxFirstPictureMs = 12_000;
/** A decoder that takes this many frames without returning one never will. */
const kMaxUnanswered = 500;

interface Arrival extends Capture {
  arrivedMs: number;
}

export class VideoPlayer {
  readonly #show: (frame: Frame) => void;
  readonly #giveUp: (unplayable: Unplayable) => void;
  readonly #audio: AudioPlayer | null;
  readonly #gate = new FrameGate();
  readonly #queue: FrameQueue<VideoFrame>;
  readonly #arrivals = new Map<number, Arrival>();
  readonly #startedMs = performance.now();
  #decoder: VideoDecoder | null = null;
  #codecString = "";
  #errors: number[] = [];
  #hasShown = false;
  #animationFrame = 0;
  #closed = false;

  /** `giveUp` is called when the stream cannot be played; nothing is shown after that. */
  constructor(show: (frame: Frame) => void, giveUp: (unplayable: Unplayable) => void, audio: AudioPlayer | null) {
    this.#show = show;
    this.#giveUp = giveUp;
    this.#audio = audio;
    this.#queue = new FrameQueue((us) => audio?.postpone(us));
  }

  take(codec: VideoCodec, timestamp: number, data: Uint8Array, capture: Capture): void {
    if (this.#closed) return;
    const nowMs = performance.now();
    const hasWaitedEnough = !this.#hasShown && nowMs - this.#startedMs > kMaxFirstPictureMs;
    if (hasWaitedEnough || this.#arrivals.size > kMaxUnanswered) return this.#end(kUndecodable);
    const { isKey, codecString } = frameInfoOf(codec, data);
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
    cancelAnimationFrame(this.#animationFrame);
    this.#queue.clear();
    this.#dropDecoder();
  }

  #configure(codec: VideoCodec, codecString: string): void {
    this.#dropDecoder();
    this.#codecString = codecString;
    const decoder = new VideoDecoder({
      output: (frame) => this.#receive(frame),
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
    this.#errors = [...this.#errors.filter((atMs) => nowMs - atMs < kErrorWindowMs), nowMs];
    this.#dropDecoder();
    // Browsers do not agree on the error for a codec that they do not support.
    const { supported } = await VideoDecoder.isConfigSupported(configOf(codecString));
    if (this.#closed) return;
    if (!supported) this.#end(unsupported(codec));
    else if (this.#errors.length >= kMaxErrors) this.#end(kUndecodable);
  }

  #end(unplayable: Unplayable): void {
    this.close();
    this.#giveUp(unplayable);
  }

  #receive(frame: VideoFrame): void {
    if (this.#closed) return frame.close();
    this.#queue.push(frame);
    this.#present();
  }

  #present(): void {
    cancelAnimationFrame(this.#animationFrame);
    const nowMs = performance.now();
    const image = this.#queue.take(this.#audio?.audibleUs(nowMs) ?? null, nowMs);
    if (image) {
      const arrival = this.#arrivalOf(image.timestamp);
      this.#hasShown = true;
      this.#show({ image, capturedMs: arrival.capturedMs, ageMs: arrival.ageMs + nowMs - arrival.arrivedMs });
    }
    if (!this.#queue.isEmpty) this.#animationFrame = requestAnimationFrame(() => this.#present());
  }

  /** Forgets all up to this frame: those that have not been shown by now never will be. */
  #arrivalOf(timestamp: number): Arrival {
    const arrival = this.#arrivals.get(timestamp) ?? { capturedMs: Date.now(), ageMs: 0, arrivedMs: performance.now() };
    for (const earlier of this.#arrivals.keys()) if (earlier <= timestamp) this.#arrivals.delete(earlier);
    return arrival;
  }
}

function configOf(codec: string): VideoDecoderConfig {
  return { codec, optimizeForLatency: true };
}
