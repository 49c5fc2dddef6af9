// SPDX-License-Identifier: Apache-2.0
//
// Holds decoded audio for as long as it takes to play it without gaps, although it comes in bursts.
//
// Algorithm     Nothing plays until the target amount is buffered. Then samples go out at the rate they came in,
//               inaudibly faster or slower, by one per cent, where the amount grows or shrinks, since no two clocks
//               agree. Where it grows all the same, the oldest is dropped, so that audio is never late by more than a
//               moment.
//
// Target        One chunk, since the next comes only when it is complete, and what the network and two threads add.
//               After an underrun it grows; after half a minute without one it shrinks again, so that one bad moment
//               does not delay video and audio for hours.

export interface AudioChunk {
  /** Stream time of the first sample, µs. */
  timestampUs: number;
  /** Samples a second. */
  rate: number;
  /** One array a channel, of equal lengths. */
  channels: Float32Array[];
}

const kBaseDelayMs = 40;
const kGrowMs = 40;
const kShrinkMs = 20;
const kStableSeconds = 30;
const kMaxExtraMs = 400;
const kMaxSurplusMs = 250;
/** Timestamps that jump further than this belong to another stream. */
const kMaxJumpUs = 1_000_000;
const kCorrection = 0.01;

const lengthOf = (chunk: AudioChunk) => chunk.channels[0]?.length ?? 0;
const durationMs = (chunk: AudioChunk) => (lengthOf(chunk) / chunk.rate) * 1000;

export class JitterBuffer {
  readonly #outputRate: number;
  #chunks: AudioChunk[] = [];
  /** Position in the first chunk, in samples; a fraction lies between two of them. */
  #at = 0;
  #playing = false;
  #maxChunkMs = 0;
  /** Beyond the base: because of underruns, and because the video comes later. */
  #underrunDelayMs = 0;
  #videoDelayMs = 0;
  /** Played since the last underrun. */
  #stableSeconds = 0;

  constructor(outputRate: number) {
    this.#outputRate = outputRate;
  }

  push(chunk: AudioChunk): void {
    if (lengthOf(chunk) === 0) return;
    const last = this.#chunks.at(-1);
    const expectedUs = last ? last.timestampUs + durationMs(last) * 1000 : chunk.timestampUs;
    if (Math.abs(chunk.timestampUs - expectedUs) > kMaxJumpUs) this.#empty();
    this.#chunks.push(chunk);
    this.#maxChunkMs = Math.max(this.#maxChunkMs, durationMs(chunk));
    if (this.#bufferedMs() > this.#targetMs() + kMaxSurplusMs) this.#discard(this.#bufferedMs() - this.#targetMs());
  }

  /**
   * Fills the arrays, one an output channel, with the next samples. Returns the stream time of the first; null for
   * silence.
   */
  pull(output: Float32Array[]): number | null {
    for (const channel of output) channel.fill(0);
    const bufferedMs = this.#bufferedMs();
    if (!this.#playing) this.#begin(bufferedMs - this.#targetMs());
    const first = this.#chunks[0];
    if (!this.#playing || !first) return null;
    const startUs = first.timestampUs + (this.#at / first.rate) * 1e6;
    const speed = this.#speed(bufferedMs);
    const length = output[0]?.length ?? 0;
    this.#countStableTime(length / this.#outputRate);
    for (let index = 0; index < length; index += 1) {
      const chunk = this.#chunks[0];
      if (!chunk) {
        this.#playing = false;
        this.#stableSeconds = 0;
        this.#underrunDelayMs = Math.min(this.#underrunDelayMs + kGrowMs, kMaxExtraMs);
        break;
      }
      output.forEach((channel, number) => (channel[index] = this.#sample(chunk, number)));
      this.#advance((chunk.rate / this.#outputRate) * speed);
    }
    return startUs;
  }

  /** Delays the audio by this much more, up to a limit, for good. */
  postpone(milliseconds: number): void {
    const videoDelayMs = Math.min(this.#videoDelayMs + milliseconds, kMaxExtraMs);
    // Nothing plays until more is buffered.
    if (videoDelayMs > this.#videoDelayMs) this.#playing = false;
    this.#videoDelayMs = videoDelayMs;
  }

  /**
   * Skips what the chunk that reached the target has brought beyond it, which would delay audio and video for good. A
   * surplus of more than a chunk came in a burst, after which there will be less.
   */
  #begin(surplusMs: number): void {
    const first = this.#chunks[0];
    if (!first || surplusMs < 0) return;
    this.#playing = true;
    this.#advance(Math.floor((Math.min(surplusMs, this.#maxChunkMs) / 1000) * first.rate));
  }

  #countStableTime(seconds: number): void {
    this.#stableSeconds += seconds;
    if (this.#stableSeconds < kStableSeconds) return;
    this.#stableSeconds = 0;
    this.#underrunDelayMs = Math.max(this.#underrunDelayMs - kShrinkMs, 0);
  }

  #targetMs(): number {
    return kBaseDelayMs + this.#maxChunkMs + Math.min(this.#underrunDelayMs + this.#videoDelayMs, kMaxExtraMs);
  }

  #bufferedMs(): number {
    const first = this.#chunks[0];
    if (!first) return 0;
    return this.#chunks.reduce((sum, chunk) => sum + durationMs(chunk), 0) - (this.#at / first.rate) * 1000;
  }

  #speed(bufferedMs: number): number {
    if (bufferedMs > this.#targetMs() * 1.3) return 1 + kCorrection;
    return bufferedMs < this.#targetMs() * 0.5 ? 1 - kCorrection : 1;
  }

  /** Interpolated between the two samples around the position. */
  #sample(chunk: AudioChunk, number: number): number {
    const channel = chunk.channels[number] ?? chunk.channels[0]!;
    const before = Math.floor(this.#at);
    const here = channel[before]!;
    const part = this.#at - before;
    if (part === 0) return here;
    const following = this.#chunks[1]?.channels;
    const next = channel[before + 1] ?? (following?.[number] ?? following?.[0])?.[0] ?? here;
    return here + (next - here) * part;
  }

  #advance(samples: number): void {
    this.#at += samples;
    while (this.#chunks[0] && this.#at >= lengthOf(this.#chunks[0])) this.#at -= lengthOf(this.#chunks.shift()!);
    if (this.#chunks.length === 0) this.#at = 0;
  }

  #discard(milliseconds: number): void {
    let restMs = milliseconds;
    while (this.#chunks[0] && durationMs(this.#chunks[0]) <= restMs) restMs -= durationMs(this.#chunks.shift()!);
    this.#at = 0;
  }

  #empty(): void {
    this.#chunks = [];
    this.#at = 0;
    this.#playing = false;
  }
}
