// SPDX-License-Identifier: Apache-2.0
//
// A player against a server of its own.

import { Player } from "../../../client/src/playback/player";
import type { Footage } from "../../../client/src/wire/footage";
import { Recordings } from "../../../client/src/wire/recordings";
import { Server } from "../../../client/src/wire/server";
import { FakeArchive } from "../support/fake_archive";

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
      { id: 8, camera: 1, start: 1000, stop: 1010, frames: 25, kind: "alert" },
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
    player.open(footage(7), 1_009_400, true);
    await until("ended");
    expect(archive.asked).toEqual(["event7 frame 94 to -1 at 1"]);
    expect([player.index, player.timeMs]).toEqual([99, 1_009_900]);
    expect(archive.streams).toEqual([]);
    player.play();
    await until("playing");
    expect(archive.asked[1]).toBe("event7 frame 0 to -1 at 1");
  });

  test("a picture that was taken before the playhead is due at the playhead, also after a pause", async () => {
    const dueMs: number[] = [];
    player.pace = async (positionMs) => dueMs.push(positionMs) > 0;
    player.open(footage(7), 1_005_070, true);
    await untilFrame(51);
    player.pause();
    const pausedMs = player.timeMs;
    expect(dueMs[0]).toBe(1_005_070);
    dueMs.length = 0;
    player.play(pausedMs + 30);
    await vi.waitFor(() => expect(dueMs[0]).toBe(pausedMs + 30));
  });

  test("pause closes the stream; steps stay within the recording and end at the last one asked for", async () => {
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
    await vi.waitFor(() => expect([player.index, player.state.kind, ...archive.streams]).toEqual([0, "paused"]));
    player.open(footage(7), 1_004_000, false);
    await vi.waitFor(() => expect([player.index, player.state.kind]).toEqual([40, "paused"]));
    archive.asked.length = seen.length = 0;
    for (let index = 39; index >= 27; index -= 1) {
      player.step(-1);
      await vi.waitFor(() => expect([player.index, player.state.kind]).toEqual([index, "paused"]));
    }
    // Steps back fetch frames ahead of need, whose decoding they share.
    expect(archive.asked).toEqual(["event7 frame 28 to 39 at 1", "event7 frame 16 to 27 at 1"]);
    expect(seen).toHaveLength(13);
  });

  test("a frame that is being decoded at a pause is told to be unwanted: picture and number stay the same", async () => {
    let drawn = -1;
    player.show = async (frame, signal) => {
      await new Promise((resolve) => setTimeout(resolve, 5));
      if (frame.index === 3) player.pause();
      if (!signal.aborted) drawn = frame.index;
    };
    player.open(footage(7), 0, true);
    await until("paused");
    await new Promise((resolve) => setTimeout(resolve, 20));
    expect([drawn, player.index]).toEqual([2, 2]);
  });

  test("a pause, and playing on, while a time is being looked for goes to that time", async () => {
    player.open(footage(7), 1_005_000, true);
    player.pause();
    await until("paused");
    expect(player.index).toBe(50);
    player.open(footage(7), 1_002_000, false);
    player.pause();
    player.play();
    await until("playing");
    expect(player.index).toBeLessThan(30);
    player.close();
  });

  test("a mark's frames have the times that they were taken at, whatever its camera's rate, and end where they end", async () => {
    player.open(footage(8, { kind: "alert", frameCount: 0 }), 1_005_000, false);
    await until("paused");
    expect(archive.asked).toEqual(["alert8 frame 12 to 12 at 1"]);
    expect([player.timeMs, player.frameCount]).toEqual([1_004_800, 25]);
    player.step(100);
    await vi.waitFor(() => expect([player.index, player.timeMs, player.state.kind]).toEqual([24, 1_009_600, "paused"]));
  });

  test.each(["lose", "stall"] as const)("a connection that was lost (%s) is told, and had back at the frame shown", async (how) => {
    player.open(footage(7), 0, true);
    await untilFrame(3);
    archive.isAway = true;
    archive.streams[0]![how]();
    await vi.waitFor(() => expect(player.state.kind).toBe("lost"), 12_000);
    const at = player.index;
    archive.isAway = false;
    await until("playing");
    expect(archive.asked.at(-1)).toBe(`event7 frame ${at} to -1 at 1`);
    archive.isAway = true;
    archive.streams[0]!.lose();
    await until("lost");
    player.pause();
    expect(player.state.kind).toBe("paused");
    archive.isAway = false;
  }, 30_000);

  test("what is opened while the server is away is played when it is back", async () => {
    archive.isAway = true;
    player.open(footage(7), 1_002_000, true);
    await until("lost");
    archive.isAway = false;
    await untilFrame(20);
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
    ["gone", () => (archive.recorded = []), "The recording no longer exists."],
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
