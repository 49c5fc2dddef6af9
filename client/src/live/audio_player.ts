// SPDX-License-Identifier: Apache-2.0
//
// Plays the sound of one camera: off until the user wants it, then decoded and played from a jitter buffer.

import { AudibleClock, TimestampMatcher } from "./av_clock";
import type { MediaPart } from "./media_part";
import type { SpeakerCommand, SpeakerReport } from "./speaker_worklet";
import workletAddress from "./speaker_worklet.ts?worker&url";

export type AudioPart = Extract<MediaPart, { kind: "audio" }>;

/** Some seconds of audio. */
const kMaxQueued = 200;
/** Longer than a headset takes to wake up. */
const kMaxStartMs = 8_000;
/** Longer than any chunk of audio. */
const kMaxGapUs = 300_000;

/** The audio context with the worklet in it. */
class Speaker {
  readonly clock = new AudibleClock();
  readonly #context: AudioContext;
  #node: AudioWorkletNode | null = null;

  /** Call it while handling a click or key: browsers let no page play sound by itself. */
  constructor(rate: number) {
    this.#context = new AudioContext({ sampleRate: rate, latencyHint: "interactive" });
  }

  async start(): Promise<void> {
    // Where there is no sound device, Firefox waits for one without end.
    const late = new Promise<never>((_, reject) => setTimeout(reject, kMaxStartMs));
    const ready = this.#context.resume().then(() => this.#context.audioWorklet.addModule(workletAddress));
    await Promise.race([ready, late]);
    this.#node = new AudioWorkletNode(this.#context, "speaker", { numberOfInputs: 0, outputChannelCount: [2] });
    this.#node.port.onmessage = ({ data }: MessageEvent<SpeakerReport>) =>
      this.clock.report(data.playedUs, data.contextTime, performance.now());
    this.#node.connect(this.#context.destination);
  }

  send(command: SpeakerCommand): void {
    this.#node?.port.postMessage(command, "channels" in command ? command.channels.map(({ buffer }) => buffer) : []);
  }

  audibleUs(nowMs: number): number | null {
    const { contextTime = 0, performanceTime = 0 } = this.#context.getOutputTimestamp();
    // Without a timestamp of the output, the latency that the context reports has to do.
    const audibleTime =
      performanceTime > 0
        ? contextTime + (nowMs - performanceTime) / 1000
        : this.#context.currentTime - (this.#context.outputLatency || this.#context.baseLatency);
    return this.clock.audibleUs(audibleTime, nowMs);
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
  #timestamps = new TimestampMatcher();
  #exists = false;
  #lastUs = 0;
  #error = "";
  /** How many times as fast as life it is played. The stream's time passes as slowly for what is heard. */
  speed = 1;

  /** `changed` is called when existence, state or error of the sound has changed. */
  constructor(changed: () => void) {
    this.#changed = changed;
  }

  /** Whether the camera has sent any sound. */
  get exists(): boolean {
    return this.#exists;
  }

  get isOn(): boolean {
    return this.#speaker !== null;
  }

  /** Why it cannot be played; empty when it can. */
  get error(): string {
    return this.#error;
  }

  /** Call it while handling a click or key. */
  async switchOn(): Promise<void> {
    if (this.#speaker || !this.#config) return;
    this.#error = "";
    let speaker: Speaker | null = null;
    try {
      speaker = this.#speaker = new Speaker(this.#config.sampleRate);
      this.#changed();
      await speaker.start();
    } catch {
      // Switching off meanwhile makes the start fail as well.
      if (this.#speaker === speaker) this.#fail("The browser plays no sound: is there a sound device?");
    }
  }

  switchOff(): void {
    this.#dropDecoder();
    this.#speaker?.close();
    this.#speaker = null;
    this.#changed();
  }

  take(part: AudioPart, body: Uint8Array): void {
    if (!this.#exists || !sameConfig(part.config, this.#config)) {
      this.#exists = true;
      this.#config = part.config;
      this.#error = part.config ? "" : `The sound (${part.codec}) cannot be played`;
      this.#dropDecoder();
      this.#changed();
    }
    if (this.#speaker && this.#config) this.#decode(this.#speaker, this.#config, part.timestampUs, body);
  }

  /** Stream time in µs of what is audible now; null when nothing is. */
  audibleUs(nowMs: number): number | null {
    return this.#speaker?.audibleUs(nowMs) ?? null;
  }

  /** Delays the sound by this much more, for video that comes later than it. */
  postpone(us: number): void {
    this.#speaker?.send({ postponeMs: us / 1000 });
  }

  #decode(speaker: Speaker, config: AudioDecoderConfig, timestamp: number, data: Uint8Array): void {
    const stepUs = timestamp - this.#lastUs;
    this.#lastUs = timestamp;
    try {
      // A decoder would join the audio on both sides of a gap.
      if (stepUs < 0 || stepUs > kMaxGapUs || (this.#decoder?.decodeQueueSize ?? 0) > kMaxQueued) this.#dropDecoder();
      if (!this.#decoder) {
        const timestamps = (this.#timestamps = new TimestampMatcher());
        this.#decoder = new AudioDecoder({
          output: (decoded) => speaker.send(chunkOf(decoded, timestamps.decoded(decoded.timestamp), this.speed)),
          error: () => this.#fail("The sound cannot be decoded"),
        });
        this.#decoder.configure(config);
      }
      this.#timestamps.sent(timestamp);
      this.#decoder.decode(new EncodedAudioChunk({ type: "key", timestamp, data }));
    } catch {
      this.#fail("The sound cannot be decoded");
    }
  }

  #dropDecoder(): void {
    if (this.#decoder && this.#decoder.state !== "closed") this.#decoder.close();
    this.#decoder = null;
  }

  #fail(error: string): void {
    this.#error = error;
    this.switchOff();
  }
}

function chunkOf(decoded: AudioData, timestampUs: number, speed: number): SpeakerCommand {
  const channels = Array.from({ length: Math.min(decoded.numberOfChannels, 2) }, (_, planeIndex) => {
    const samples = new Float32Array(decoded.numberOfFrames);
    decoded.copyTo(samples, { planeIndex, format: "f32-planar" });
    return samples;
  });
  const chunk = { timestampUs: timestampUs / speed, rate: decoded.sampleRate * speed, channels };
  decoded.close();
  return chunk;
}

function sameConfig(one: AudioDecoderConfig | null, other: AudioDecoderConfig | null): boolean {
  const key = (config: AudioDecoderConfig | null) =>
    config && [config.codec, config.sampleRate, config.numberOfChannels, String(config.description ?? "")].join();
  return key(one) === key(other);
}
