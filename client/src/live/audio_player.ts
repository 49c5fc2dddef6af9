// SPDX-License-Identifier: Apache-2.0
//
// The sound of one camera: silent until the user wants it, then decoded and played from a jitter buffer.

import { HeardClock, SentTimes } from "./av_clock";
import type { MediaPart } from "./media_part";
import workletAddress from "./speaker_worklet.ts?worker&url";
import type { SpeakerOrder, SpeakerReport } from "./speaker_worklet";

export type SoundPart = Extract<MediaPart, { kind: "sound" }>;

/** Some seconds of sound. */
const kLongestQueue = 200;
/** No piece of sound is so long. */
const kGapUs = 300_000;

/** The audio context with the worklet in it. */
class Speaker {
  readonly clock = new HeardClock();
  readonly #context: AudioContext;
  #node: AudioWorkletNode | null = null;

  /** Call it while the user clicks: browsers let no page sound by itself. */
  constructor(rate: number) {
    this.#context = new AudioContext({ sampleRate: rate, latencyHint: "interactive" });
  }

  async start(): Promise<void> {
    await this.#context.resume();
    await this.#context.audioWorklet.addModule(workletAddress);
    this.#node = new AudioWorkletNode(this.#context, "speaker", { numberOfInputs: 0, outputChannelCount: [2] });
    this.#node.port.onmessage = ({ data }: MessageEvent<SpeakerReport>) =>
      this.clock.report(data.playedUs, data.contextTime, performance.now());
    this.#node.connect(this.#context.destination);
  }

  send(order: SpeakerOrder): void {
    this.#node?.port.postMessage(order, "channels" in order ? order.channels.map(({ buffer }) => buffer) : []);
  }

  heardUs(nowMs: number): number | null {
    const { contextTime = 0, performanceTime = 0 } = this.#context.getOutputTimestamp();
    // Without a time stamp of the output, what the context says of its delay has to do.
    const audibleTime =
      performanceTime > 0
        ? contextTime + (nowMs - performanceTime) / 1000
        : this.#context.currentTime - (this.#context.outputLatency || this.#context.baseLatency);
    return this.clock.heardUs(audibleTime, nowMs);
  }

  close(): void {
    this.#node?.disconnect();
    void this.#context.close();
  }
}

export class AudioPlayer {
  readonly #changed: () => void;
  #config: AudioDecoderConfig | null = null;
  #decoder: AudioDecoder | null = null;
  #speaker: Speaker | null = null;
  #times = new SentTimes();
  #heardOf = false;
  #lastUs = 0;
  #trouble = "";

  /** `changed` is told when the control for the sound has something new to say. */
  constructor(changed: () => void) {
    this.#changed = changed;
  }

  /** Whether the camera sends any. */
  get exists(): boolean {
    return this.#heardOf;
  }

  get isOn(): boolean {
    return this.#speaker !== null;
  }

  /** Why it cannot be heard, or empty. */
  get trouble(): string {
    return this.#trouble;
  }

  /** Call it while the user clicks. */
  async switchOn(): Promise<void> {
    if (this.#speaker || !this.#config) return;
    this.#trouble = "";
    let speaker: Speaker | null = null;
    try {
      speaker = this.#speaker = new Speaker(this.#config.sampleRate);
      this.#changed();
      await speaker.start();
    } catch {
      // Switching off meanwhile makes the start fail as well.
      if (this.#speaker === speaker) this.#fail("This browser plays no sound");
    }
  }

  switchOff(): void {
    this.#dropDecoder();
    this.#speaker?.close();
    this.#speaker = null;
    this.#changed();
  }

  take(part: SoundPart, body: Uint8Array): void {
    if (!this.#heardOf || !sameConfig(part.config, this.#config)) {
      this.#heardOf = true;
      this.#config = part.config;
      this.#trouble = part.config ? "" : `The sound (${part.codec}) cannot be played`;
      this.#dropDecoder();
      this.#changed();
    }
    if (this.#speaker && this.#config) this.#decode(this.#speaker, this.#config, part.timestampUs, body);
  }

  /** Stream time in µs of what is heard now; null when nothing is. */
  heardUs(nowMs: number): number | null {
    return this.#speaker?.heardUs(nowMs) ?? null;
  }

  /** Lets the sound come later, for a picture that comes after it. */
  wait(us: number): void {
    this.#speaker?.send({ waitMs: us / 1000 });
  }

  #decode(speaker: Speaker, config: AudioDecoderConfig, timestamp: number, data: Uint8Array): void {
    const stepUs = timestamp - this.#lastUs;
    this.#lastUs = timestamp;
    try {
      // A decoder would join what lies on both sides of a gap.
      if (stepUs < 0 || stepUs > kGapUs || (this.#decoder?.decodeQueueSize ?? 0) > kLongestQueue) this.#dropDecoder();
      if (!this.#decoder) {
        const times = (this.#times = new SentTimes());
        this.#decoder = new AudioDecoder({
          output: (decoded) => speaker.send(pieceOf(decoded, times.decoded(decoded.timestamp))),
          error: () => this.#fail("The sound cannot be decoded"),
        });
        this.#decoder.configure(config);
      }
      this.#times.sent(timestamp);
      this.#decoder.decode(new EncodedAudioChunk({ type: "key", timestamp, data }));
    } catch {
      this.#fail("The sound cannot be decoded");
    }
  }

  #dropDecoder(): void {
    if (this.#decoder && this.#decoder.state !== "closed") this.#decoder.close();
    this.#decoder = null;
  }

  #fail(trouble: string): void {
    this.#trouble = trouble;
    this.switchOff();
  }
}

function pieceOf(decoded: AudioData, timestampUs: number): SpeakerOrder {
  const channels = Array.from({ length: Math.min(decoded.numberOfChannels, 2) }, (_, planeIndex) => {
    const samples = new Float32Array(decoded.numberOfFrames);
    decoded.copyTo(samples, { planeIndex, format: "f32-planar" });
    return samples;
  });
  const piece = { timestampUs, rate: decoded.sampleRate, channels };
  decoded.close();
  return piece;
}

function sameConfig(one: AudioDecoderConfig | null, other: AudioDecoderConfig | null): boolean {
  const key = (config: AudioDecoderConfig | null) =>
    config && [config.codec, config.sampleRate, config.numberOfChannels, String(config.description ?? "")].join();
  return key(one) === key(other);
}
