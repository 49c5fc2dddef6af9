// SPDX-License-Identifier: Apache-2.0
//
// Compressed picture and sound: what is read of a stream, keeping up and in step with it, and what is shown in its place.

import { factsOf, type VideoCodec } from "../../client/src/live/annexb";
import { HeardClock, PictureQueue, SentTimes } from "../../client/src/live/av_clock";
import { FrameGate, kLongestQueue } from "../../client/src/live/frame_gate";
import { JitterBuffer } from "../../client/src/live/jitter_buffer";
import { soundConfig } from "../../client/src/live/media_part";
import type { LiveSource } from "../../client/src/live/source";
import { StreamSource } from "../../client/src/live/stream_source";
import { VideoPlayer } from "../../client/src/live/video_player";
import type { Camera, Server } from "../../client/src/wire/server";

const bytes = (hex: string) => Uint8Array.from(Buffer.from(hex.replaceAll(" ", ""), "hex"));

// The parameter sets are those that x264 and x265 write; the other profiles follow the tables of ISO 14496-15.
const kSps = "00000001 674d401fda014016ec04400000030040";
const kHevcSps = "00000001 420101 01600000030090000003000003003f a0050201";

test.each<[string, VideoCodec, string, boolean, string | null]>([
  [
    "a key frame behind delimiter and parameter sets",
    "H264",
    `00000001 0910 ${kSps} 00000001 68ef 00000001 6588`,
    true,
    "avc1.4d401f",
  ],
  ["short start codes", "H264", "000001 6764001f 000001 68ef 000001 6588", true, "avc1.64001f"],
  ["a slice that builds on others", "H264", "00000001 419a", false, null],
  ["parameter sets alone are no key frame", "H264", `${kSps} 00000001 419a`, false, "avc1.4d401f"],
  ["what looks like a key frame within a slice", "H264", "00000001 419a000001 65", false, null],
  ["nothing", "H264", "", false, null],
  ["no unit at all", "H264", "00000000000002", false, null],
  ["IDR of H.265", "H265", `00000001 460110 ${kHevcSps} 00000001 2601af`, true, "hev1.1.6.L63.90"],
  ["clean random access of H.265", "H265", "00000001 2a01af", true, null],
  ["a leading picture of H.265", "H265", "00000001 1201af", false, null],
  ["ten bits, high tier", "H265", "000001 420101 22200000030 0b0000003000003 0099a0", false, "hev1.2.4.H153.B0"],
])("annex B: %s", (_name, codec, hex, isKey, codecString) => {
  expect(factsOf(codec, bytes(hex))).toEqual({ isKey, codecString });
});

test.each([
  ["AAC", "1188", "mp4a.40.2", 48000, 1],
  ["AAC", "1210", "mp4a.40.2", 44100, 2],
  ["AAC", "1408", "mp4a.40.2", 16000, 1],
  ["AAC", "2b8a0800", "mp4a.40.5", 22050, 1],
  ["AAC", "17801f4008", "mp4a.40.2", 16000, 1],
  ["AAC", "", null, 0, 0],
  ["AAC", "1680", null, 0, 0],
  ["PCMU", "", "ulaw", 8000, 1],
  ["PCMA", "", "alaw", 8000, 1],
  ["OPUS", "", "opus", 48000, 2],
  ["OPUS", "4f70757348656164 0101 3801 80bb0000 0000 00", "opus", 48000, 1],
  ["G726", "", null, 0, 0],
])("sound %s with configuration %s: %s", (codec, extra, codecString, sampleRate, numberOfChannels) => {
  const config = soundConfig(codec, bytes(extra));
  if (codecString === null) expect(config).toBe(null);
  else expect(config).toMatchObject({ codec: codecString, sampleRate, numberOfChannels });
});

test.each<[string, [isKey: boolean, queued: number, admission: string][]]>([
  [
    "starts at a key frame",
    [
      [false, 0, "drop"],
      [true, 0, "decode"],
      [false, 1, "decode"],
    ],
  ],
  [
    "a short backlog is no reason to leave anything out",
    [
      [true, 0, "decode"],
      [false, kLongestQueue, "decode"],
    ],
  ],
  [
    "behind: all is left out up to the next key frame, which throws the backlog away",
    [
      [true, 0, "decode"],
      [false, kLongestQueue + 1, "drop"],
      [false, 3, "drop"],
      [true, 2, "restart"],
      [false, 1, "decode"],
    ],
  ],
  [
    "behind, but caught up by the key frame",
    [
      [true, 0, "decode"],
      [false, kLongestQueue + 1, "drop"],
      [true, 0, "decode"],
    ],
  ],
  [
    "behind at the key frame itself",
    [
      [true, 0, "decode"],
      [true, kLongestQueue + 1, "restart"],
    ],
  ],
])("decoder %s", (_name, steps) => {
  const gate = new FrameGate();
  for (const [isKey, queued, admission] of steps) expect(gate.admit(isKey, queued)).toBe(admission);
});

test("what is heard follows the audio context, and falls silent with the reports", () => {
  const clock = new HeardClock();
  expect(clock.heardUs(1, 0)).toBe(null);
  clock.report(5_000_000, 2, 100);
  // Rendered at 2 s of the context, of which 1.95 s are audible: the output lags by 50 ms.
  expect(clock.heardUs(1.95, 100)).toBeCloseTo(4_950_000);
  expect(clock.heardUs(2.25, 400)).toBeCloseTo(5_250_000);
  expect(clock.heardUs(2.6, 601)).toBe(null);
  clock.report(null, 3, 700);
  expect(clock.heardUs(3, 700)).toBe(null);
});

test.each<[string, sent: number[], counted: number[], found: number[]]>([
  ["a camera whose samples are longer", [0, 21, 42, 63, 84], [0, 20, 40, 60, 80], [0, 21, 42, 63, 84]],
  ["a decoder that keeps the first piece to itself", [0, 20, 40], [20, 40], [20, 40]],
  ["a piece more than was sent", [0, 20], [0, 20, 40], [0, 20, 40]],
])("time of sound, sent before it is decoded: %s", (_name, sent, counted, found) => {
  const times = new SentTimes();
  for (const us of sent) times.sent(us);
  expect(counted.map((us) => times.decoded(us))).toEqual(found);
});

test.each<[string, pushed: number[], heardMs: number | null, shown: number | null, closed: number[]]>([
  ["nothing before its time", [40, 80], 39, null, []],
  ["the newest that is due, without those it overtakes", [0, 40, 80, 120], 85, 80, [0, 40]],
  ["the newest when nothing is heard", [0, 40, 80], null, 80, [0, 40]],
  ["a late one too, if it is the newest", [0], 500, 0, []],
  ["one of another time than the sound at once", [5000], 0, 5000, []],
  [
    "one too early rather than none: the decoder has no more to lend",
    Array.from({ length: 18 }, (_, n) => 100 + n),
    0,
    101,
    [100],
  ],
])("picture to show: %s", (_name, pushed, heardMs, shown, closed) => {
  const gone: number[] = [];
  const queue = new PictureQueue(() => undefined);
  for (const ms of pushed) queue.push({ timestamp: ms * 1000, close: () => gone.push(ms) });
  expect(queue.take(heardMs === null ? null : heardMs * 1000, 0)?.timestamp ?? null).toBe(
    shown === null ? null : shown * 1000,
  );
  expect(gone).toEqual(closed);
});

test("sound waits for pictures that keep coming late, as long as the least late of them; not for a burst", () => {
  const wait = vi.fn();
  const queue = new PictureQueue(wait);
  let nowMs = 0;
  const show = (pictures: number, lateMs: number, everyMs: number) => {
    for (let picture = 0; picture < pictures; picture += 1, nowMs += everyMs) {
      queue.push({ timestamp: 0, close: () => undefined });
      queue.take((lateMs + (picture % 3)) * 1000, nowMs);
    }
  };
  show(70, 300, 5);
  show(1, 20, 40);
  show(37, 120, 40);
  show(1, 20, 40);
  expect(wait).not.toHaveBeenCalled();
  show(40, 120, 40);
  expect(wait.mock.calls).toEqual([[120_000]]);
});

/** Plays pieces of 20 ms at 8 kHz, of which each sample is its own number; returns what `pull` gave, 10 ms at a time. */
class Player {
  readonly buffer: JitterBuffer;
  #pushed = 0;

  constructor(outputRate = 8000) {
    this.buffer = new JitterBuffer(outputRate);
  }

  push(pieces: number, jumpMs = 0): void {
    for (let piece = 0; piece < pieces; piece += 1, this.#pushed += 160) {
      const samples = Float32Array.from({ length: 160 }, (_, index) => this.#pushed + index);
      this.buffer.push({ timestampUs: this.#pushed * 125 + jumpMs * 1000, rate: 8000, channels: [samples] });
    }
  }

  /** The stream times in ms at which each 10 ms began. */
  pull(times: number): (number | null)[] {
    return Array.from({ length: times }, () => {
      const output = [new Float32Array(80), new Float32Array(80)];
      const startUs = this.buffer.pull(output);
      expect(output[1], "one channel is heard on both sides").toEqual(output[0]);
      if (startUs === null) expect(output[0]!.every((sample) => sample === 0)).toBe(true);
      return startUs === null ? null : startUs / 1000;
    });
  }
}

test("jitter: plays without a gap once enough is here, every sample once", () => {
  const player = new Player();
  player.push(5);
  expect(player.pull(2)).toEqual([null, null]);
  player.push(1);
  const heard: number[] = [];
  for (let turn = 0; turn < 50; turn += 1) {
    const output = [new Float32Array(160)];
    expect(player.buffer.pull(output)).toBe(turn * 20_000);
    heard.push(...output[0]!);
    player.push(1);
  }
  expect(heard).toEqual(heard.map((_, index) => index));
});

test("jitter: after running dry it gathers more than before", () => {
  const player = new Player();
  player.push(6);
  expect(player.pull(14).map((at) => at !== null)).toEqual([...Array<boolean>(13).fill(true), false]);
  player.push(7);
  expect(player.pull(1)).toEqual([null]);
  player.push(1);
  expect(player.pull(1)).toEqual([120]);
});

test("jitter: of a burst the oldest is left out", () => {
  const player = new Player();
  player.push(6);
  player.pull(1);
  player.push(50);
  expect(player.pull(1)[0]).toBeGreaterThanOrEqual(1120 - 120 - 250);
});

test("jitter: another stream's time empties it", () => {
  const player = new Player();
  player.push(6);
  player.pull(1);
  player.push(6, 60_000);
  expect(player.pull(1)).toEqual([60_120]);
});

test("jitter: a device of twice the rate hears what lies between two samples, also of two pieces", () => {
  const player = new Player(16_000);
  player.push(6);
  const output = [new Float32Array(1000)];
  player.buffer.pull(output);
  expect([...output[0]!]).toEqual(Array.from({ length: 1000 }, (_, index) => index / 2));
});

test("jitter: a clock that runs apart is followed, in both directions, without a gap", () => {
  for (const push of [1.003, 0.997]) {
    const player = new Player();
    player.push(6);
    player.pull(1);
    let pushed = 6;
    const delaysMs: number[] = [];
    for (let turn = 1; turn <= 6000; turn += 1) {
      const due = Math.floor(6 + push * turn * 0.5) - pushed;
      player.push(due);
      pushed += due;
      const output = [new Float32Array(80)];
      delaysMs.push(pushed * 20 - (player.buffer.pull(output) ?? NaN) / 1000);
    }
    expect(Math.min(...delaysMs)).toBeGreaterThan(0);
    expect(Math.max(...delaysMs)).toBeLessThan(250);
  }
});

describe("a stream that cannot be played", () => {
  const camera = { id: 2, name: "Parking", video_type: 3 } as Camera;
  const key = `Content-Type: image/H264\r\nX-Timestamp: 40000\r\nContent-Length: 13\r\n\r\n`;
  const picture = Buffer.from(bytes("000001 674d401f 000001 6588")).toString("latin1");
  /** What each decoder does with its first picture. */
  let fails: boolean[] = [];
  let isSupported = true;

  /** What the decoder was told; for pictures their time in ms. */
  const told: (string | number)[] = [];

  class Decoder {
    static decodeQueueSize = 0;
    static isMute = false;
    state = "configured";
    constructor(readonly how: { output: (frame: unknown) => void; error: (error: Error) => void }) {}
    get decodeQueueSize(): number {
      return Decoder.decodeQueueSize;
    }
    configure({ codec }: { codec: string }): void {
      told.push(codec);
    }
    reset(): void {
      told.push("reset");
    }
    decode({ timestamp }: { timestamp: number }): void {
      told.push(timestamp / 1000);
      if (Decoder.isMute) return;
      if (fails.shift()) queueMicrotask(() => this.how.error(new DOMException("damaged", "EncodingError")));
      else queueMicrotask(() => this.how.output({ timestamp, close: () => undefined }));
    }
    close(): void {
      this.state = "closed";
    }
    static isConfigSupported = async () => ({ supported: isSupported });
  }

  /** Gives three key frames, one after the other, and ends. */
  const server = {
    async live() {
      const body = new ReadableStream({
        async start(controller) {
          for (let part = 0; part < 3; part += 1) {
            controller.enqueue(Buffer.from(`--b\r\n${key}${picture}\r\n`, "latin1"));
            await new Promise((resolve) => setTimeout(resolve));
          }
          controller.close();
        },
      });
      return new Response(body, { headers: { "Content-Type": "multipart/x-mixed-replace; boundary=b" } });
    },
  } as unknown as Server;

  beforeEach(() => {
    vi.stubGlobal("VideoDecoder", Decoder);
    vi.stubGlobal(
      "EncodedVideoChunk",
      class {
        constructor(given: object) {
          Object.assign(this, given);
        }
      },
    );
    vi.stubGlobal("requestAnimationFrame", () => 0);
    vi.stubGlobal("cancelAnimationFrame", () => undefined);
  });

  test.each([
    ["all is well", [], true, 3, null],
    ["one damaged picture is overcome", [true], true, 2, null],
    ["errors without end", [true, true, true], true, 0, "The stream cannot be decoded"],
    ["an unknown codec at once", [true], false, 0, "This browser cannot play this kind of H.264"],
  ])("%s", async (_name, failures, supported, shown, reason) => {
    [fails, isSupported] = [[...failures], supported];
    const stills: LiveSource = { everyMs: 2000, lostAfterMs: 10_000, run: vi.fn(async () => undefined) };
    const source = new StreamSource(server, camera, false, stills);
    let frames = 0;
    for (let run = 0; run < 2; run += 1) await source.run(() => (frames += 1), new AbortController().signal);
    expect(source.unplayable?.reason ?? null).toBe(reason);
    expect(frames).toBe(reason ? shown : shown + 3);
    expect(stills.run).toHaveBeenCalledTimes(reason ? 1 : 0);
    expect([source.everyMs, source.lostAfterMs]).toEqual(reason ? [2000, 10_000] : [0, 5000]);
  });

  test("goes back to the stream after a while", async () => {
    [fails, isSupported] = [[true, true, true], true];
    const stills = new (class implements LiveSource {
      everyMs = 2000;
      lostAfterMs = 10_000;
      run = (_show: unknown, signal: AbortSignal) =>
        new Promise<void>((resolve) => signal.addEventListener("abort", () => resolve()));
    })();
    const source = new StreamSource(server, camera, false, stills);
    const signal = new AbortController().signal;
    vi.useFakeTimers({ toFake: ["performance", "setTimeout", "clearTimeout"] });
    const streaming = source.run(() => undefined, signal);
    await vi.advanceTimersByTimeAsync(100);
    await streaming;
    expect(source.unplayable).not.toBe(null);
    const polling = source.run(() => undefined, signal);
    await vi.advanceTimersByTimeAsync(60_001);
    await polling;
    expect(source.unplayable).toBe(null);
    vi.useRealTimers();
  });

  test("a decoder that falls behind gets nothing more, and makes a fresh start at the next key frame", () => {
    told.length = 0;
    fails = [];
    const player = new VideoPlayer(vi.fn(), vi.fn(), null);
    const keyFrame = (profile: string) => bytes(`000001 67${profile} 000001 6588`);
    const give = (ms: number, data: Uint8Array, queued: number) => {
      Decoder.decodeQueueSize = queued;
      player.take("H264", ms * 1000, data, { capturedMs: ms, ageMs: 0 });
    };
    give(0, bytes("000001 419a"), 0);
    give(40, keyFrame("4d401f"), 0);
    give(80, bytes("000001 419a"), kLongestQueue + 1);
    give(120, bytes("000001 419a"), kLongestQueue);
    give(160, keyFrame("4d401f"), 9);
    give(200, bytes("000001 419a"), 1);
    give(240, keyFrame("64001f"), 1);
    expect(told).toEqual(["avc1.4d401f", 40, "reset", "avc1.4d401f", 160, 200, "avc1.64001f", 240]);
    Decoder.decodeQueueSize = 0;
    player.close();
  });

  test("a decoder that takes all and gives nothing is given up, once", () => {
    Decoder.isMute = true;
    const giveUp = vi.fn();
    const player = new VideoPlayer(vi.fn(), giveUp, null);
    const keyFrame = bytes("000001 674d401f 000001 6588");
    for (let ms = 0; ms < 600; ms += 1) player.take("H264", ms * 1000, keyFrame, { capturedMs: ms, ageMs: 0 });
    expect(giveUp).toHaveBeenCalledTimes(1);
    Decoder.isMute = false;
  });

  test("without a decoder no stream is opened at all", async () => {
    vi.stubGlobal("VideoDecoder", undefined);
    vi.stubGlobal("isSecureContext", true);
    const stills: LiveSource = { everyMs: 2000, lostAfterMs: 10_000, run: vi.fn(async () => undefined) };
    const source = new StreamSource({} as Server, camera, false, stills);
    await source.run(() => undefined, new AbortController().signal);
    expect(stills.run).toHaveBeenCalledTimes(1);
  });
});
