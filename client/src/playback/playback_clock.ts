// SPDX-License-Identifier: Apache-2.0
//
// One clock for players that show the same moment of several cameras.
//
// Why so        The server paces each stream by itself: streams begin when they have been opened, follow a change of
//               the rate when it has reached them, and a busy server or a slow connection delays each by something
//               else. So a frame waits here until it is due, and the clock waits for players whose next frame has not
//               come. That wait is made once: from then on the frames of this player come early enough. A player that
//               is waited for in vain is left behind, and has to join again.
// Invariants    (1) Only `set` turns the clock back. (2) Of a player that is not left behind, the frame on the screen
//               is the one of the clock's time, or that before it while the next is on its way.

/**
 * How long all wait for one, in milliseconds: for the first frame of a stream, and, beyond the time between two, for
 * each that follows.
 */
const kMaxOpeningMs = 3_000;
const kMaxWaitMs = 1_500;
/** Frames are at most so far apart, in a recording that has no gap. */
const kMaxIntervalMs = 1_000;
/** Timers are not more exact than this. */
const kToleranceMs = 0.5;

interface Member {
  /** The frame that waits until it is due. */
  held: { atMs: number; release: (isDue: boolean) => void } | null;
  /** The frame on the screen; null before the first. */
  shownMs: number | null;
  intervalMs: number;
  /** Where the player joins, and when it was asked to. */
  joinMs: number;
  /** Since when the clock stands still for it, by the machine's clock; null while it does not. */
  awaitedSinceMs: number | null;
  isLeftBehind: boolean;
}

/** How much faster than life a rate is. */
export function speedOf(rate: number): number {
  return rate < 0 ? -1 / rate : rate;
}

export class PlaybackClock {
  readonly #members = new Map<object, Member>();
  #atMs = 0;
  #sinceMs = 0;
  #speed = 1;
  #isRunning = false;
  #timer: ReturnType<typeof setTimeout> | undefined;

  /** Unix milliseconds. */
  get atMs(): number {
    this.#settle();
    return this.#atMs;
  }

  /** Goes to a time and runs from there, or stands still. All players have to join again. */
  set(atMs: number, isRunning: boolean): void {
    for (const who of [...this.#members.keys()]) this.leave(who);
    this.#atMs = atMs;
    this.#sinceMs = performance.now();
    this.#isRunning = isRunning;
    this.#plan();
  }

  stop(): void {
    this.#settle();
    this.#isRunning = false;
    this.#plan();
  }

  setRate(rate: number): void {
    this.#settle();
    this.#speed = speedOf(rate);
    this.#plan();
  }

  /**
   * The clock does not pass this time before the player's first frame has come. `intervalMs`: between two frames, or
   * so.
   */
  join(who: object, atMs: number, intervalMs: number): void {
    this.leave(who);
    const rest = { held: null, shownMs: null, awaitedSinceMs: null, isLeftBehind: false };
    this.#members.set(who, { ...rest, joinMs: atMs, intervalMs: this.#bounded(intervalMs) });
    this.#plan();
  }

  leave(who: object): void {
    this.#settle();
    this.#members.get(who)?.held?.release(false);
    this.#members.delete(who);
    this.#plan();
  }

  /** Whether the player would have to join again to be in step. */
  isLeftBehind(who: object): boolean {
    return this.#members.get(who)?.isLeftBehind ?? false;
  }

  /**
   * Resolves when the player's next frame is to be shown; with false where it is not: it comes too late, or was
   * aborted.
   */
  due(who: object, frameMs: number, signal: AbortSignal): Promise<boolean> {
    const member = this.#members.get(who);
    if (!member || signal.aborted) return Promise.resolve(!signal.aborted);
    this.#settle();
    if (member.isLeftBehind && frameMs < this.#atMs - member.intervalMs) return Promise.resolve(false);
    member.isLeftBehind = false;
    member.awaitedSinceMs = null;
    if (member.shownMs !== null && frameMs > member.shownMs) member.intervalMs = this.#bounded(frameMs - member.shownMs);
    return new Promise((resolve) => {
      const release = (isDue: boolean) => {
        signal.removeEventListener("abort", giveUp);
        member.held = null;
        if (isDue) member.shownMs = frameMs;
        resolve(isDue);
      };
      const giveUp = () => release(false);
      signal.addEventListener("abort", giveUp);
      member.held = { atMs: frameMs, release };
      this.#jump();
      this.#plan();
    });
  }

  /** Brings the clock's time up to date. */
  #settle(): void {
    const nowMs = performance.now();
    if (this.#isRunning) {
      const freeMs = this.#atMs + (nowMs - this.#sinceMs) * this.#speed;
      this.#atMs = Math.max(this.#atMs, Math.min(freeMs, this.#limitMs()));
      for (const member of this.#members.values()) this.#await(member, nowMs);
    }
    this.#sinceMs = nowMs;
  }

  #await(member: Member, nowMs: number): void {
    if (member.held || member.isLeftBehind || limitOf(member) > this.#atMs) return;
    member.awaitedSinceMs ??= nowMs;
    member.isLeftBehind = nowMs - member.awaitedSinceMs >= patienceFor(member);
  }

  /** A fast stream leaves frames out. */
  #bounded(intervalMs: number): number {
    return Math.min(intervalMs, kMaxIntervalMs * Math.max(1, this.#speed));
  }

  #limitMs(): number {
    return Math.min(...[...this.#members.values()].map(limitOf));
  }

  /** Where nobody has anything to show for a while, nobody has to wait. */
  #jump(): void {
    const following = [...this.#members.values()].filter(({ isLeftBehind }) => !isLeftBehind);
    const nextMs = Math.min(...following.map(({ held }) => held?.atMs ?? -Infinity));
    const isFar = Number.isFinite(nextMs) && nextMs - this.#atMs > kMaxIntervalMs * Math.max(1, this.#speed);
    if (isFar) this.#atMs = nextMs;
  }

  /** Shows what is due, and wakes up when there is something to do next. */
  #plan(): void {
    clearTimeout(this.#timer);
    if (!this.#isRunning) return;
    for (const { held } of this.#members.values()) if (held && held.atMs <= this.#atMs + kToleranceMs) held.release(true);
    const limitMs = this.#limitMs();
    const delayTo = (atMs: number) => (atMs - this.#atMs) / this.#speed;
    const delays = [...this.#members.values()].flatMap((member) => {
      const { held, awaitedSinceMs, isLeftBehind } = member;
      if (held) return held.atMs <= limitMs ? delayTo(held.atMs) : [];
      if (isLeftBehind) return [];
      return awaitedSinceMs === null ? delayTo(limitOf(member)) : awaitedSinceMs + patienceFor(member) - performance.now();
    });
    if (delays.length === 0) return;
    const wake = () => {
      this.#settle();
      this.#plan();
    };
    this.#timer = setTimeout(wake, Math.max(0, Math.min(...delays)));
  }
}

/** As far as the clock goes without another frame of this player. */
function limitOf({ held, shownMs, intervalMs, joinMs, isLeftBehind }: Member): number {
  if (isLeftBehind) return Infinity;
  if (held) return held.atMs + intervalMs;
  return shownMs === null ? joinMs : shownMs + intervalMs;
}

/** At the end of what is still being recorded, a fast stream's next frame comes only when it has been taken. */
function patienceFor({ shownMs, intervalMs }: Member): number {
  return shownMs === null ? kMaxOpeningMs : kMaxWaitMs + Math.min(intervalMs, kMaxIntervalMs);
}
