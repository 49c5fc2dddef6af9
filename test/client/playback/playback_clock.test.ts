// SPDX-License-Identifier: Apache-2.0
//
// One clock for players whose servers send at their own pace, in a time that the tests move.

import { PlaybackClock } from "../../../client/src/playback/playback_clock";

/** A stream as the server sends it: a frame each `periodMs`, and more of them at a higher rate left out. */
interface Stream {
  framesPerSecond: number;
  /** Until its first frame comes. */
  opensInMs: number;
  /** How much slower than it should it sends. */
  drag?: number;
  /** Until a new rate reaches it. */
  rateTakesMs?: number;
  /** From when on, and for how long, nothing comes. */
  breaks?: { fromMs: number; forMs: number };
}

const kStartMs = 1_000_000;
const who = {};

describe("the clock of several players", () => {
  beforeEach(() => void vi.useFakeTimers());
  afterEach(() => void vi.useRealTimers());

  class Shown {
    atMs = NaN;
    isLeftBehind = false;
    readonly intervalMs: number;
    readonly #clock: PlaybackClock;
    readonly #stream: Stream;
    readonly #end = new AbortController();
    #rate = 1;

    constructor(clock: PlaybackClock, stream: Stream) {
      this.#clock = clock;
      this.#stream = stream;
      this.intervalMs = 1000 / stream.framesPerSecond;
      clock.join(this, kStartMs, this.intervalMs);
      void this.#play();
    }

    setRate(rate: number): void {
      setTimeout(() => (this.#rate = rate), this.#stream.rateTakesMs ?? 0);
    }

    close(): void {
      this.#end.abort();
      this.#clock.leave(this);
    }

    async #play(): Promise<void> {
      const { opensInMs, drag = 1, breaks } = this.#stream;
      const wait = (ms: number) => new Promise((resolve) => setTimeout(resolve, ms));
      const beganMs = performance.now();
      await wait(opensInMs);
      for (let index = 0; !this.#end.signal.aborted; index += Math.max(1, this.#rate)) {
        const sinceMs = performance.now() - beganMs;
        if (breaks && sinceMs >= breaks.fromMs && sinceMs < breaks.fromMs + breaks.forMs) await wait(breaks.forMs);
        const dueMs = performance.now() + this.intervalMs * drag * Math.max(1, -this.#rate);
        const atMs = kStartMs + index * this.intervalMs;
        if (await this.#clock.due(this, atMs, this.#end.signal)) this.atMs = atMs;
        this.isLeftBehind = this.#clock.isLeftBehind(this);
        await wait(dueMs - performance.now());
      }
    }
  }

  const apart = (shown: readonly Shown[]) => Math.max(...shown.map(({ atMs }) => atMs)) - Math.min(...shown.map(({ atMs }) => atMs));

  test.each<[string, Stream[], number]>([
    ["nine that open one after the other", Array.from({ length: 9 }, (_, at) => ({ framesPerSecond: 25, opensInMs: 90 * at })), 59_000],
    ["cameras of other frame rates", [5, 12.5, 25, 30].map((framesPerSecond) => ({ framesPerSecond, opensInMs: 50 })), 59_500],
    ["one whose server is ten per cent too slow", [{ framesPerSecond: 25, opensInMs: 0 }, { framesPerSecond: 25, opensInMs: 0, drag: 1.1 }], 54_000],
    ["one whose server is too fast", [{ framesPerSecond: 25, opensInMs: 0 }, { framesPerSecond: 10, opensInMs: 0, drag: 0.8 }], 59_500],
    ["one that stops for a second", [{ framesPerSecond: 25, opensInMs: 0 }, { framesPerSecond: 25, opensInMs: 0, breaks: { fromMs: 7_000, forMs: 1_000 } }], 58_500],
  ])("%s stay in step for a minute", async (_, streams, leastMs) => {
    const clock = new PlaybackClock();
    clock.set(kStartMs, true);
    const shown = streams.map((stream) => new Shown(clock, stream));
    await vi.advanceTimersByTimeAsync(4_000);
    const slowestMs = Math.max(...shown.map(({ intervalMs }) => intervalMs));
    let most = 0;
    for (let step = 0; step < 560; step += 1) {
      await vi.advanceTimersByTimeAsync(100);
      most = Math.max(most, apart(shown));
    }
    expect(most).toBeLessThanOrEqual(slowestMs + 0.001);
    // They play at the pace of life, but for what the slowest makes the others wait.
    expect(clock.atMs - kStartMs).toBeGreaterThan(leastMs);
    expect(clock.atMs - kStartMs).toBeLessThanOrEqual(60_000);
    for (const one of shown) one.close();
  });

  test.each([4, 16, -4])("they are in step soon after a change to rate %i and back, which reaches each at its own time", async (rate) => {
    const clock = new PlaybackClock();
    clock.set(kStartMs, true);
    const shown = [0, 150, 400].map((rateTakesMs) => new Shown(clock, { framesPerSecond: 25, opensInMs: 10, rateTakesMs }));
    for (const next of [rate, 1]) {
      clock.setRate(next);
      for (const one of shown) one.setRate(next);
      await vi.advanceTimersByTimeAsync(2_000);
      const before = clock.atMs;
      for (let step = 0; step < 30; step += 1) {
        await vi.advanceTimersByTimeAsync(100);
        expect(apart(shown)).toBeLessThanOrEqual(40 * Math.max(1, next) + 0.001);
      }
      const speed = (clock.atMs - before) / 3_000;
      expect(speed).toBeGreaterThan((next < 0 ? -1 / next : next) * 0.95);
      expect(speed).toBeLessThan((next < 0 ? -1 / next : next) * 1.05);
    }
    for (const one of shown) one.close();
  });

  test("one that does not come is waited for, then left behind, and told so when it comes back", async () => {
    const clock = new PlaybackClock();
    clock.set(kStartMs, true);
    const steady = new Shown(clock, { framesPerSecond: 25, opensInMs: 0 });
    const broken = new Shown(clock, { framesPerSecond: 25, opensInMs: 0, breaks: { fromMs: 2_000, forMs: 5_000 } });
    await vi.advanceTimersByTimeAsync(3_000);
    expect(apart([steady, broken])).toBeLessThanOrEqual(40);
    await vi.advanceTimersByTimeAsync(2_000);
    expect(apart([steady, broken])).toBeGreaterThan(1_000);
    const stoppedMs = broken.atMs;
    await vi.advanceTimersByTimeAsync(4_000);
    // What it sends now is of a time that is over.
    expect([broken.isLeftBehind, broken.atMs]).toEqual([true, stoppedMs]);
    for (const one of [steady, broken]) one.close();
  });

  test("where nobody has anything for a while, the clock does not wait", async () => {
    const clock = new PlaybackClock();
    const end = new AbortController().signal;
    clock.set(kStartMs, true);
    clock.join(who, kStartMs, 40);
    await clock.due(who, kStartMs, end);
    const next = clock.due(who, kStartMs + 90_000, end);
    await vi.advanceTimersByTimeAsync(20);
    expect(await next).toBe(true);
    expect(clock.atMs).toBeGreaterThanOrEqual(kStartMs + 90_000);
  });

  test("nothing is shown while the clock stands, nor of what is aborted", async () => {
    const clock = new PlaybackClock();
    const end = new AbortController();
    clock.set(kStartMs, true);
    clock.join(who, kStartMs, 40);
    clock.stop();
    const isDue = clock.due(who, kStartMs, end.signal);
    await vi.advanceTimersByTimeAsync(500);
    expect(clock.atMs).toBe(kStartMs);
    end.abort();
    expect(await isDue).toBe(false);
  });
});
