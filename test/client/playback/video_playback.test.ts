// SPDX-License-Identifier: Apache-2.0
//
// A player of video as it was recorded, against a server and a decoder of its own.

import type { RecordedFrame } from "../../../client/src/playback/frame_stream";
import { Player } from "../../../client/src/playback/player";
import type { Footage } from "../../../client/src/wire/footage";
import { Recordings } from "../../../client/src/wire/recordings";
import { Server } from "../../../client/src/wire/server";
import { FakeArchive } from "../support/fake_archive";
import { FakeDecoder, FakePicture, stubDecoder } from "../support/fake_decoder";

describe("a player of video", () => {
  const archive = new FakeArchive();
  const shown: { index: number; isVideo: boolean }[] = [];
  let player: Player;
  const footage = (more: Partial<Footage> = {}): Footage => {
    const given = { id: 7, kind: "event", camera: 1, start: 1000, stop: 1010, moment: 1000, frameCount: 100 };
    return { ...given, isGrowing: false, reason: 1, text: "", isSaved: true, ...more } as Footage;
  };
  const until = (kind: string) => vi.waitFor(() => expect(player.state.kind).toBe(kind), { timeout: 6000, interval: 5 });
  const untilFrame = (index: number) => vi.waitFor(() => expect(player.index).toBeGreaterThanOrEqual(index), 3000);
  const indexes = (from: number, to: number) => Array.from({ length: to - from }, (_, at) => from + at);

  beforeEach(() => {
    vi.stubGlobal("fetch", archive.fetch);
    stubDecoder();
    archive.recorded = [{ id: 7, camera: 1, start: 1000, stop: 1010, frames: 100 }];
    archive.isVideo = true;
    archive.framesPerSecond = 100;
    archive.asked.length = archive.refused.length = shown.length = 0;
    player = new Player(new Recordings(new Server(() => undefined)), () => undefined);
    player.show = async ({ index, picture }: RecordedFrame) => void shown.push({ index, isVideo: !(picture instanceof Blob) });
  });

  afterEach(async () => {
    vi.restoreAllMocks();
    player.close();
    await vi.waitFor(() => expect([archive.streams, FakePicture.open]).toEqual([[], 0]));
  });

  test("shows the frames from that of a time on, not those that they are made from, up to the last", async () => {
    player.open(footage(), 1_009_500, true);
    await until("ended");
    expect(archive.asked).toEqual(["event7 video 95 at 1"]);
    expect(shown).toEqual(indexes(95, 100).map((index) => ({ index, isVideo: true })));
    expect([player.index, player.timeMs]).toEqual([99, 1_009_900]);
    player.play();
    await until("playing");
    expect(archive.asked[1]).toBe("event7 video 0 at 1");
  });

  test("pause closes the stream; steps are pictures, and playback continues as video", async () => {
    player.open(footage(), 0, true);
    await untilFrame(3);
    player.pause();
    await vi.waitFor(() => expect(archive.streams).toEqual([]));
    const at = player.index;
    player.step(1);
    await vi.waitFor(() => expect([player.index, player.state.kind]).toEqual([at + 1, "paused"]));
    expect(shown.at(-1)).toEqual({ index: at + 1, isVideo: false });
    player.play();
    await untilFrame(at + 3);
    expect(archive.asked.slice(1)).toEqual([`event7 frame ${at + 1} to ${at + 1} at 1`, `event7 video ${at + 1} at 1`]);
    expect(shown.at(-1)!.isVideo).toBe(true);
  });

  test("another rate is another stream, beyond twice as fast one of pictures", async () => {
    player.open(footage(), 0, true);
    await untilFrame(2);
    player.setRate(2);
    await vi.waitFor(() => expect(archive.asked[1]).toMatch(/^event7 video \d+ at 2$/));
    await until("playing");
    player.setRate(4);
    await vi.waitFor(() => expect(archive.asked[2]).toMatch(/^event7 frame \d+ to -1 at 4$/));
    await until("playing");
    player.setRate(-2);
    await vi.waitFor(() => expect(archive.asked[3]).toMatch(/^event7 video \d+ at -2$/));
  });

  test.each([
    ["the server has none of it", () => (archive.isVideo = false), 0],
    ["the browser does not know the codec", () => (FakeDecoder.isSupported = false), 0],
    ["a frame cannot be decoded", () => (FakeDecoder.brokenUs = 3_000_000), 20],
  ])("where %s, pictures are played from there on, and at once from then on", async (_name, happens, first) => {
    happens();
    player.open(footage(), 1_000_000, true);
    await untilFrame(40);
    const asked = [...archive.refused, ...archive.asked];
    expect(asked).toHaveLength(2);
    expect(shown.map(({ index }) => index).slice(0, 41)).toEqual(expect.arrayContaining(indexes(0, 41)));
    const picture = shown.find(({ isVideo }) => !isVideo)!;
    expect(picture.index).toBeGreaterThanOrEqual(first);
    expect(asked[1]).toBe(`event7 frame ${Math.max(0, picture.index - 1)} to -1 at 1`);
    player.open(footage(), 1_005_000, true);
    await vi.waitFor(() => expect(archive.asked.at(-1)).toBe("event7 frame 50 to -1 at 1"));
    expect(archive.refused.length + archive.asked.length).toBe(3);
  });

  test("a lost connection is had back at the frame shown; one that another player replaces says so", async () => {
    player.open(footage(), 0, true);
    await untilFrame(3);
    archive.isAway = true;
    archive.streams[0]!.lose();
    await until("lost");
    archive.isAway = false;
    const at = player.index;
    await until("playing");
    expect(archive.asked.at(-1)).toBe(`event7 video ${at} at 1`);
    await untilFrame(at + 1);
    archive.streams[0]!.preempt();
    await until("preempted");
  });

  test.each([
    ["are silent", 20_000, 2, "ended"],
    ["are cut", 100, 4, "lost"],
  ])("footage that claims to go on is not asked for without end: streams that %s", async (_how, lastMs, streams, end) => {
    const now = performance.now.bind(performance);
    let passedMs = 0;
    vi.spyOn(performance, "now").mockImplementation(() => now() + passedMs);
    Object.assign(archive, { isVideo: false, framesPerSecond: 0.01 });
    player.open(footage(), 0, true);
    for (let stream = 1; stream <= streams; stream += 1) {
      await vi.waitFor(() => expect([archive.asked.length, player.state.kind]).toEqual([stream, "playing"]));
      passedMs += lastMs;
      archive.streams[0]!.lose();
      await until(stream === streams ? end : "lost");
    }
  }, 30_000);

  test("what is being recorded is followed to its end in one stream", async () => {
    Object.assign(archive.recorded[0]!, { frames: 20, isGrowing: true });
    player.open(footage({ isGrowing: true, frameCount: 20 }), 0, true);
    await untilFrame(17);
    archive.recorded[0]!.frames = 40;
    await untilFrame(37);
    expect(player.state.kind).toBe("playing");
    archive.recorded[0]!.isGrowing = false;
    await until("ended");
    expect([player.index, archive.asked.length, player.footage!.isGrowing]).toEqual([39, 1, false]);
  });
});
