// SPDX-License-Identifier: Apache-2.0
//
// Keeps video in sync with audio: the clock of what is audible, and the decoded frames that wait for it.
//
// Why so        The ear notices a gap, the eye hardly a dropped frame. So the audio plays through, and the video
//               follows it. Without audio each frame is shown at once.

/** Reports come about twenty times a second while audio plays. */
const kReportLimitMs = 500;

/** Which moment of the stream is audible. */
export class AudibleClock {
  #playedUs = 0;
  #contextTime = 0;
  #reportedMs = Number.NEGATIVE_INFINITY;

  /** The sample of stream time `playedUs` leaves the audio context at its time `contextTime`; null when none does. */
  report(playedUs: number | null, contextTime: number, nowMs: number): void {
    this.#playedUs = playedUs ?? 0;
    this.#contextTime = contextTime;
    this.#reportedMs = playedUs === null ? Number.NEGATIVE_INFINITY : nowMs;
  }

  /** Stream time in µs of what is audible now, at `audibleTime` of the audio context; null when nothing is. */
  audibleUs(audibleTime: number, nowMs: number): number | null {
    if (nowMs - this.#reportedMs > kReportLimitMs) return null;
    return this.#playedUs + (audibleTime - this.#contextTime) * 1e6;
  }
}

/**
 * Finds for each decoded audio chunk the timestamp that it was sent with.
 *
 * Why so        Decoders derive the timestamps of their output from the first one and the number of samples since. A
 *               camera's sample clock is never exact, so those drift away from the stream's timestamps by seconds a day.
 */
export class TimestampMatcher {
  #sentUs: number[] = [];
  /** How far the decoder's count was behind for the last chunk. */
  #behindUs = 0;

  sent(us: number): void {
    this.#sentUs.push(us);
  }

  /** The timestamp sent since the last chunk that is nearest to the corrected count. */
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

/** A decoder stalls when too many of its frames are held: rather show one too early. */
const kMaxQueuedFrames = 16;
/** A frame this far ahead of the audio belongs to no audio that will come. */
const kMaxAheadUs = 1_000_000;
const kMaxLateUs = 40_000;
/** A burst on the network is over sooner. */
const kMinLateMs = 1500;

export class FrameQueue<Frame extends Timed> {
  readonly #queued: Frame[] = [];
  readonly #postponeAudio: (us: number) => void;
  #lateSinceMs: number | null = null;
  #minLateUs = 0;

  /** `postponeAudio` is called when frames keep coming later than their audio, with by how many microseconds. */
  constructor(postponeAudio: (us: number) => void) {
    this.#postponeAudio = postponeAudio;
  }

  get isEmpty(): boolean {
    return this.#queued.length === 0;
  }

  push(frame: Frame): void {
    this.#queued.push(frame);
  }

  /**
   * The frame to show at `audibleUs` (null: nothing is audible, so the newest); null while none is due. Closes the
   * frames that it overtakes; the caller closes the one returned.
   */
  take(audibleUs: number | null, nowMs: number): Frame | null {
    const isDue = ({ timestamp }: Frame) =>
      audibleUs === null ||
      this.#queued.length > kMaxQueuedFrames ||
      timestamp <= audibleUs ||
      timestamp > audibleUs + kMaxAheadUs;
    let due: Frame | null = null;
    while (this.#queued[0] && isDue(this.#queued[0])) {
      due?.close();
      due = this.#queued.shift()!;
    }
    if (due && audibleUs !== null) this.#checkLateness(audibleUs - due.timestamp, nowMs);
    return due;
  }

  clear(): void {
    for (const frame of this.#queued.splice(0)) frame.close();
  }

  #checkLateness(lateUs: number, nowMs: number): void {
    if (lateUs <= kMaxLateUs) {
      this.#lateSinceMs = null;
    } else if (this.#lateSinceMs === null) {
      this.#lateSinceMs = nowMs;
      this.#minLateUs = lateUs;
    } else {
      this.#minLateUs = Math.min(this.#minLateUs, lateUs);
      if (nowMs - this.#lateSinceMs < kMinLateMs) return;
      this.#lateSinceMs = null;
      this.#postponeAudio(this.#minLateUs);
    }
  }
}
