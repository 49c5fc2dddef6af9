// SPDX-License-Identifier: Apache-2.0
//
// The sound of a recording, handed to the loudspeaker in step with the picture.
//
// Why so        The server sends some seconds ahead, and the picture is shown by the clock of all players. So blocks of
//               sound wait here until it is their turn, by the picture that was shown last and the time since.

import { AudioPlayer, type AudioPart } from "../live/audio_player";

/** Beyond this, sound is unintelligible. */
const kMaxRate = 2;
const kFeedMs = 20;
/** What the loudspeaker's buffer holds beside one block, and what it takes until it is heard. */
const kDelayMs = 90;
/** Some ten seconds; the server sends two ahead. */
const kMaxWaiting = 500;
const kMaxBlockUs = 200_000;
/** A picture that stays longer than this has lost its sound. */
const kMaxPictureMs = 1_500;

export class RecordedSound {
  readonly player: AudioPlayer;
  #waiting: { part: AudioPart; body: Uint8Array }[] = [];
  #run = {};
  #rate = 1;
  #blockUs = 0;
  #lastUs = 0;
  #shown: { timestampUs: number; atMs: number } | null = null;
  #timer: ReturnType<typeof setInterval> | undefined;

  /** `changed` is called when existence, state or error of the sound has changed. */
  constructor(changed: () => void) {
    this.player = new AudioPlayer(changed);
  }

  /** Another stream begins, at that rate. Call what is returned at its end, which may come after others have begun. */
  begin(rate: number): () => void {
    this.stop();
    const run = (this.#run = {});
    this.#rate = rate;
    this.player.speed = Math.max(1, rate);
    return () => {
      if (run === this.#run) this.stop();
    };
  }

  stop(): void {
    clearInterval(this.#timer);
    this.#timer = undefined;
    this.#waiting = [];
    this.#shown = null;
  }

  take(part: AudioPart, body: Uint8Array): void {
    this.#blockUs = Math.min(Math.max(0, part.timestampUs - this.#lastUs), kMaxBlockUs);
    this.#lastUs = part.timestampUs;
    this.#waiting.push({ part, body });
    if (this.#waiting.length > kMaxWaiting) this.#waiting.shift();
  }

  /** A picture of that timestamp is on the screen from now on. */
  follow(timestampUs: number): void {
    this.#shown = { timestampUs, atMs: performance.now() };
    this.#timer ??= setInterval(() => this.#feed(), kFeedMs);
    this.#feed();
  }

  #feed(): void {
    if (!this.#shown) return;
    const sinceMs = Math.min(performance.now() - this.#shown.atMs, kMaxPictureMs);
    const dueUs = this.#shown.timestampUs + ((sinceMs + kDelayMs) * 1000 + this.#blockUs) * this.#rate;
    const isHeard = this.#rate >= 1 && this.#rate <= kMaxRate;
    while (this.#waiting[0] && this.#waiting[0].part.timestampUs <= dueUs) {
      const { part, body } = this.#waiting.shift()!;
      // What came from before the first picture is past.
      if (isHeard && part.timestampUs >= this.#shown.timestampUs - kMaxBlockUs) this.player.take(part, body);
    }
  }
}
