// SPDX-License-Identifier: Apache-2.0
//
// Keeps the picture in step with the sound: the clock of what is heard, and the decoded pictures that wait for it.
//
// Why so        The ear notices a gap, the eye hardly a picture left out. So the sound runs through, and the picture
//               follows. Without sound each picture is shown at once.

/** Reports come about twenty times a second while sound plays. */
const kReportLimitMs = 500;

/** Which moment of the stream is heard. */
export class HeardClock {
  #playedUs = 0;
  #contextTime = 0;
  #reportedMs = Number.NEGATIVE_INFINITY;

  /** The sample of stream time `playedUs` leaves the audio context at its time `contextTime`; null when none does. */
  report(playedUs: number | null, contextTime: number, nowMs: number): void {
    this.#playedUs = playedUs ?? 0;
    this.#contextTime = contextTime;
    this.#reportedMs = playedUs === null ? Number.NEGATIVE_INFINITY : nowMs;
  }

  /** Stream time in µs of what is heard now, when `audibleTime` of the audio context is; null when nothing is. */
  heardUs(audibleTime: number, nowMs: number): number | null {
    if (nowMs - this.#reportedMs > kReportLimitMs) return null;
    return this.#playedUs + (audibleTime - this.#contextTime) * 1e6;
  }
}

/**
 * Finds for each decoded piece of sound the time that it was sent with.
 *
 * Why so        Decoders count the time of their output on from their first input, by its samples. A camera's samples are
 *               never as long as they should be, so that count leaves the stream's time by seconds a day.
 */
export class SentTimes {
  #sentUs: number[] = [];
  /** What the count was behind for the last piece. */
  #behindUs = 0;

  sent(us: number): void {
    this.#sentUs.push(us);
  }

  /** Of the times sent since the last piece, the one nearest to where the count would be. */
  decoded(countedUs: number): number {
    const expectedUs = countedUs + this.#behindUs;
    const distance = (us: number) => Math.abs(us - expectedUs);
    while (this.#sentUs.length > 1 && distance(this.#sentUs[1]!) < distance(this.#sentUs[0]!)) this.#sentUs.shift();
    const us = this.#sentUs.shift() ?? expectedUs;
    this.#behindUs = us - countedUs;
    return us;
  }
}

export interface Timed {
  /** Stream time, µs. */
  readonly timestamp: number;
  close(): void;
}

/** Decoders have few pictures to lend: rather one too early than none any more. */
const kMostWaiting = 16;
/** A picture so far ahead of the sound belongs to no sound that will come. */
const kFarAheadUs = 1_000_000;
const kLateUs = 40_000;
/** What a burst of the network delays is made good sooner. */
const kLateLimitMs = 1500;

export class PictureQueue<Picture extends Timed> {
  readonly #waiting: Picture[] = [];
  readonly #askSoundToWait: (us: number) => void;
  #lateSinceMs: number | null = null;
  #leastLateUs = 0;

  /** `askSoundToWait` is called when pictures keep coming after their sound, by so many microseconds. */
  constructor(askSoundToWait: (us: number) => void) {
    this.#askSoundToWait = askSoundToWait;
  }

  get isEmpty(): boolean {
    return this.#waiting.length === 0;
  }

  push(picture: Picture): void {
    this.#waiting.push(picture);
  }

  /**
   * The picture to show at `heardUs` (null: nothing is heard, so the newest); null while none is due. Closes those that
   * are too late beside it; the caller closes the one returned.
   */
  take(heardUs: number | null, nowMs: number): Picture | null {
    const isDue = ({ timestamp }: Picture) =>
      heardUs === null ||
      this.#waiting.length > kMostWaiting ||
      timestamp <= heardUs ||
      timestamp > heardUs + kFarAheadUs;
    let due: Picture | null = null;
    while (this.#waiting[0] && isDue(this.#waiting[0])) {
      due?.close();
      due = this.#waiting.shift()!;
    }
    if (due && heardUs !== null) this.#judge(heardUs - due.timestamp, nowMs);
    return due;
  }

  clear(): void {
    for (const picture of this.#waiting.splice(0)) picture.close();
  }

  #judge(lateUs: number, nowMs: number): void {
    if (lateUs <= kLateUs) {
      this.#lateSinceMs = null;
    } else if (this.#lateSinceMs === null) {
      this.#lateSinceMs = nowMs;
      this.#leastLateUs = lateUs;
    } else {
      this.#leastLateUs = Math.min(this.#leastLateUs, lateUs);
      if (nowMs - this.#lateSinceMs < kLateLimitMs) return;
      this.#lateSinceMs = null;
      this.#askSoundToWait(this.#leastLateUs);
    }
  }
}
