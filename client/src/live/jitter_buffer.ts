// SPDX-License-Identifier: Apache-2.0
//
// Holds decoded sound for as long as it takes to play it without gaps, although it comes in bursts.
//
// Algorithm     Nothing plays until the wanted amount is here. Then samples go out at the rate they came in, one per cent
//               faster or slower where the amount grows or shrinks, since no two clocks agree: that is not heard.
//               Where it grows all the same, the oldest is left out, so that sound is never more than a moment late.
//               Running dry means that the wanted amount was too small: it grows.

export interface SoundPiece {
  /** Stream time of the first sample, µs. */
  timestampUs: number;
  /** Samples a second. */
  rate: number;
  /** One array a channel, of equal lengths. */
  channels: Float32Array[];
}

const kBaseMs = 80;
const kStepAfterGapMs = 40;
const kLongestExtraMs = 400;
const kSurplusMs = 250;
/** Stream time that jumps further than this is that of another stream. */
const kBreakUs = 1_000_000;
const kCorrection = 0.01;

const lengthOf = (piece: SoundPiece) => piece.channels[0]?.length ?? 0;
const durationMs = (piece: SoundPiece) => (lengthOf(piece) / piece.rate) * 1000;

export class JitterBuffer {
  readonly #outputRate: number;
  #pieces: SoundPiece[] = [];
  /** Of the first piece, in its samples; a fraction lies between two. */
  #at = 0;
  #playing = false;
  #longestPieceMs = 0;
  #extraMs = 0;

  constructor(outputRate: number) {
    this.#outputRate = outputRate;
  }

  push(piece: SoundPiece): void {
    if (lengthOf(piece) === 0) return;
    const last = this.#pieces.at(-1);
    const expectedUs = last ? last.timestampUs + durationMs(last) * 1000 : piece.timestampUs;
    if (Math.abs(piece.timestampUs - expectedUs) > kBreakUs) this.#empty();
    this.#pieces.push(piece);
    this.#longestPieceMs = Math.max(this.#longestPieceMs, durationMs(piece));
    if (this.#bufferedMs() > this.#wantedMs() + kSurplusMs) this.#leaveOut(this.#bufferedMs() - this.#wantedMs());
  }

  /** Fills the arrays, one an output channel, with the next samples. Returns the stream time of the first; null for silence. */
  pull(output: Float32Array[]): number | null {
    for (const channel of output) channel.fill(0);
    const bufferedMs = this.#bufferedMs();
    if (!this.#playing) this.#playing = bufferedMs > 0 && bufferedMs >= this.#wantedMs();
    const first = this.#pieces[0];
    if (!this.#playing || !first) return null;
    const startUs = first.timestampUs + (this.#at / first.rate) * 1e6;
    const speed = this.#speed(bufferedMs);
    for (let index = 0; index < (output[0]?.length ?? 0); index += 1) {
      const piece = this.#pieces[0];
      if (!piece) {
        this.#playing = false;
        this.wait(kStepAfterGapMs);
        break;
      }
      output.forEach((channel, number) => (channel[index] = this.#sample(piece, number)));
      this.#advance((piece.rate / this.#outputRate) * speed);
    }
    return startUs;
  }

  /** Lets the sound play so much later than so far, within reason. */
  wait(milliseconds: number): void {
    const extraMs = Math.min(this.#extraMs + milliseconds, kLongestExtraMs);
    // Until there is more, nothing plays.
    if (extraMs > this.#extraMs) this.#playing = false;
    this.#extraMs = extraMs;
  }

  #wantedMs(): number {
    return kBaseMs + 2 * this.#longestPieceMs + this.#extraMs;
  }

  #bufferedMs(): number {
    const first = this.#pieces[0];
    if (!first) return 0;
    return this.#pieces.reduce((sum, piece) => sum + durationMs(piece), 0) - (this.#at / first.rate) * 1000;
  }

  #speed(bufferedMs: number): number {
    if (bufferedMs > this.#wantedMs() * 1.3) return 1 + kCorrection;
    return bufferedMs < this.#wantedMs() * 0.5 ? 1 - kCorrection : 1;
  }

  /** On the straight line between the two samples around the position. */
  #sample(piece: SoundPiece, number: number): number {
    const channel = piece.channels[number] ?? piece.channels[0]!;
    const before = Math.floor(this.#at);
    const here = channel[before]!;
    const part = this.#at - before;
    if (part === 0) return here;
    const following = this.#pieces[1]?.channels;
    const next = channel[before + 1] ?? (following?.[number] ?? following?.[0])?.[0] ?? here;
    return here + (next - here) * part;
  }

  #advance(samples: number): void {
    this.#at += samples;
    while (this.#pieces[0] && this.#at >= lengthOf(this.#pieces[0])) this.#at -= lengthOf(this.#pieces.shift()!);
    if (this.#pieces.length === 0) this.#at = 0;
  }

  #leaveOut(milliseconds: number): void {
    let restMs = milliseconds;
    while (this.#pieces[0] && durationMs(this.#pieces[0]) <= restMs) restMs -= durationMs(this.#pieces.shift()!);
    this.#at = 0;
  }

  #empty(): void {
    this.#pieces = [];
    this.#at = 0;
    this.#playing = false;
  }
}
