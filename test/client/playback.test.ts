// SPDX-License-Identifier: Apache-2.0
//
// Recordings: times and frames, days and segments, the timeline's scale, and a player against a server of its own.

import { segmentsOf } from "../../client/src/playback/coverage";
import { midnight, midnights, questionsFor } from "../../client/src/playback/recorded_days";
import { FrameClock } from "../../client/src/playback/frame_clock";
import { Player } from "../../client/src/playback/player";
import { TimeScale } from "../../client/src/ui/timeline/time_scale";
import { Recordings, type Footage, type Runs } from "../../client/src/wire/recordings";
import { Server } from "../../client/src/wire/server";
import { FakeArchive } from "./fake_archive";

const kHourMs = 3_600_000;

test.each<[string, Runs, [number, number, boolean][]]>([
  ["holes are left out", [[0, 2], [1, 3], [0, 1], [2, 1]], [[110, 125, false], [130, 135, true]]],
  ["the last step is cut at the end of the span", [[1, 100]], [[100, 200, false]]],
  ["nothing of a run that lies behind it", [[0, 20], [1, 5]], []],
  ["a damaged count moves nothing backwards", [[1, -3], [1, 1]], [[100, 105, false]]],
])("segments: %s", (_name, runs, segments) => {
  expect(segmentsOf(100, 200, 5, runs).map(({ startS, stopS, isEvent }) => [startS, stopS, isEvent])).toEqual(segments);
});

test("a frame that was fetched by its time bends the line, and every index leads back to itself", () => {
  const clock = new FrameClock(1000, 100_000);
  expect([clock.indexOf(50_000), clock.msOf(500)]).toEqual([500, 50_000]);
  clock.learn(200, 50_000);
  expect([clock.msOf(200), clock.indexOf(25_000), clock.indexOf(75_000)]).toEqual([50_000, 100, 600]);
  for (let index = 0; index < 1500; index += 7) expect(clock.indexOf(clock.msOf(index))).toBe(index);
  // Knowledge that contradicts older knowledge takes its place.
  clock.learn(300, 40_000);
  expect(clock.msOf(300)).toBe(40_000);
  expect(new FrameClock(0, 0).msOf(0)).toBe(0);
});

test("days are asked for in runs of 24 hours, cut where the clock is changed and at what the server answers at once", () => {
  const day = 24 * kHourMs;
  const spring = [0, day, 2 * day - kHourMs, 3 * day - kHourMs];
  expect(questionsFor(spring)).toEqual([
    { startMs: 0, count: 2 },
    { startMs: 2 * day - kHourMs, count: 2 },
  ]);
  const many = Array.from({ length: 130 }, (_, index) => index * day);
  expect(questionsFor(many).map(({ count }) => count)).toEqual([128, 2]);
  const start = midnight(Date.UTC(2026, 2, 20, 15));
  expect(midnights(start + kHourMs, start + 3 * day + 1)).toEqual([0, 1, 2, 3].map((days) => midnight(start, days)));
});

test("zooming leaves the time under the pointer in place, and ends at seconds and at a month", () => {
  const scale = TimeScale.of(0, 24 * kHourMs, 1000);
  expect(scale.zoomed(0.25, 300).msAt(300)).toBeCloseTo(scale.msAt(300));
  expect(scale.zoomed(1e-9, 500).spanMs).toBe(15_000);
  const widest = scale.zoomed(1e9, 500).spanMs / (24 * kHourMs);
  expect([widest > 31, widest < 46]).toEqual([true, true]);
  expect(scale.panned(100).startMs).toBe(-100 * scale.msPerPx);
});

test("marks on the axis never overlap and stay where they are while it is dragged, at every zoom", () => {
  for (let msPerPx = 15; msPerPx < 4_000_000; msPerPx *= 1.7) {
    const scale = new TimeScale(Date.UTC(2026, 2, 27), msPerPx, 1000);
    const at = scale.ticks().map(({ atMs }) => atMs);
    const apart = at.slice(1).map((ms, index) => (ms - at[index]!) / scale.msPerPx);
    expect(Math.min(...apart, Infinity), `${msPerPx} ms a pixel`).toBeGreaterThan(60);
    expect(at.length, `${msPerPx} ms a pixel`).toBeGreaterThan(1);
    const moved = scale.panned(-37).ticks().map(({ atMs }) => atMs);
    const common = at.filter((ms) => ms > scale.panned(-37).startMs);
    expect(moved.slice(0, common.length)).toEqual(common);
  }
});

describe("a player", () => {
  const archive = new FakeArchive();
  const seen: number[] = [];
  let player: Player;
  const footage = (id: number, more: Partial<Footage> = {}): Footage => {
    const given = { id, kind: "event", camera: 1, start: 1000, stop: 1010, moment: 1000, frameCount: 100 };
    return { ...given, isGrowing: false, reason: 1, text: "", isSaved: true, ...more } as Footage;
  };
  const until = (kind: string) => vi.waitFor(() => expect(player.state.kind).toBe(kind), { timeout: 6000, interval: 5 });
  const untilFrame = (index: number) => vi.waitFor(() => expect(player.index).toBeGreaterThanOrEqual(index), 3000);

  beforeEach(() => {
    vi.stubGlobal("fetch", archive.fetch);
    archive.recorded = [
      { id: 7, camera: 1, start: 1000, stop: 1010, frames: 100 },
      { id: 8, camera: 1, start: 1000, stop: 1010, frames: 100, kind: "alert" },
    ];
    archive.asked.length = seen.length = 0;
    player = new Player(new Recordings(new Server(() => undefined)), () => undefined);
    player.show = async () => void seen.push(player.index);
  });

  afterEach(async () => {
    player.close();
    await vi.waitFor(() => expect(archive.streams).toEqual([]));
  });

  test("plays from the frame of a time to the end, and closes when the last frame repeats", async () => {
    player.open(footage(7), 9_400, true);
    await until("ended");
    expect(archive.asked).toEqual(["event7 time 9400 to -1 at 1", "event7 frame 94 to -1 at 1"]);
    expect(player.index).toBe(99);
    expect(archive.streams).toEqual([]);
    player.play();
    await until("playing");
    expect(archive.asked[2]).toBe("event7 frame 0 to -1 at 1");
  });

  test("pause closes the stream; steps fetch single frames within the recording and end at the last one asked for", async () => {
    player.open(footage(7), 0, true);
    await untilFrame(3);
    player.pause();
    await vi.waitFor(() => expect(archive.streams).toEqual([]));
    const at = player.index;
    for (let press = 0; press < 5; press += 1) player.step(1);
    await vi.waitFor(() => expect([player.index, player.state.kind]).toEqual([at + 5, "paused"]));
    // A held key asks for fewer frames than it is pressed: the one under way, and the last.
    expect(archive.asked.slice(1)).toEqual([1, 5].map((by) => `event7 frame ${at + by} to ${at + by} at 1`));
    player.step(-1000);
    await vi.waitFor(() => expect([player.index, player.state.kind]).toEqual([0, "paused"]));
  });

  test("a frame that is being decoded at a pause is told to be unwanted: picture and number stay the same", async () => {
    let drawn = -1;
    player.show = async (frame, signal) => {
      if (frame.index === 3) setTimeout(() => player.pause(), 0);
      await new Promise((resolve) => setTimeout(resolve, 5));
      if (!signal.aborted) drawn = frame.index;
    };
    player.open(footage(7), 0, true);
    await until("paused");
    await new Promise((resolve) => setTimeout(resolve, 20));
    expect([drawn, player.index]).toEqual([2, 2]);
  });

  test("a mark is found by frame, since the server knows no times in it", async () => {
    player.open(footage(8, { kind: "alert" }), 5_000, false);
    await until("paused");
    expect(archive.asked).toEqual(["alert8 frame 50 to 50 at 1"]);
  });

  test("the rate changes within the stream; where the server refuses, another is opened at the frame shown", async () => {
    player.open(footage(7), 0, true);
    await untilFrame(2);
    player.setRate(4);
    await vi.waitFor(() => expect(archive.streams[0]?.rate).toBe(4));
    expect(archive.asked).toHaveLength(1);
    vi.stubGlobal("fetch", (address: string, init: object) =>
      address.includes("SetRate") ? Promise.resolve(new Response("{}", { status: 409 })) : archive.fetch(address, init),
    );
    player.setRate(-2);
    await vi.waitFor(() => expect(archive.asked.at(-1)).toMatch(/^event7 frame \d+ to -1 at -2$/));
  });

  test("one that another player replaces says so, leaves the session to it, and plays again on demand", async () => {
    player.open(footage(7), 0, true);
    await untilFrame(2);
    archive.streams[0]!.preempt();
    await until("preempted");
    expect(archive.asked).toHaveLength(1);
    player.play();
    await until("playing");
  });

  test.each([
    ["gone", () => (archive.recorded = []), "The recording is gone."],
    ["not playable", () => (archive.recorded[0]!.frames = 0), "The recording cannot be played."],
  ])("a recording that is %s is named as such", async (_name, happens, reason) => {
    happens();
    player.open(footage(7), 0, true);
    await until("failed");
    expect(player.state).toEqual({ kind: "failed", reason });
  });

  test("what is being recorded is followed over a pause of the camera, from where it stood, to its end", async () => {
    Object.assign(archive.recorded[0]!, { frames: 20, isGrowing: true });
    player.open(footage(7, { isGrowing: true, frameCount: 20 }), 0, true);
    await untilFrame(19);
    await vi.waitFor(() => expect(archive.asked.length).toBe(2), { timeout: 6000 });
    expect(archive.asked).toEqual(["event7 frame 0 to 1000000000 at 1", "event7 frame 19 to 1000000000 at 1"]);
    archive.recorded[0]!.frames = 40;
    await untilFrame(39);
    archive.recorded[0]!.isGrowing = false;
    await until("ended");
    expect(player.index).toBe(39);
  }, 20_000);
});
