// SPDX-License-Identifier: Apache-2.0
//
// Live streams: the profiles that are asked for, and what is shown where a stream cannot be played.

import { kMaxQueuedFrames } from "../../../client/src/live/frame_gate";
import type { LiveSource } from "../../../client/src/live/source";
import { NewestFrame, StreamSource } from "../../../client/src/live/stream_source";
import { VideoPlayer } from "../../../client/src/live/video_player";
import type { Camera } from "../../../client/src/wire/camera";
import { ServerError, type Server } from "../../../client/src/wire/server";
import { bytes } from "../support/bytes";

test("pictures that come while one is being decoded give way to the newest; a bad one stops nothing", async () => {
  const shown: number[] = [];
  const newest = new NewestFrame(async ({ body }) => {
    shown.push(body[0]!);
    await Promise.resolve();
    if (body[0] === 1) throw new Error("cannot be decoded");
  });
  for (const number of [1, 2, 3, 4]) newest.offer({ headers: new Map(), body: Uint8Array.of(number) });
  await vi.waitFor(() => expect(shown).toEqual([1, 4]));
  newest.offer({ headers: new Map(), body: Uint8Array.of(5) });
  expect(shown).toEqual([1, 4, 5]);
});

const multipart = (body: BodyInit) => new Response(body, { headers: { "Content-Type": "multipart/x-mixed-replace; boundary=b" } });
const never = () => new AbortController().signal;
const stillsThat = (run: LiveSource["run"]): LiveSource => ({ pollIntervalMs: 2000, lostAfterMs: 10_000, run });

test.each<[string, (number | null)[], number, (number | null)[]]>([
  ["the small picture where there is one", [1, null], 504, [1, 1]],
  ["else the usual one, and at once the next time", [null], 504, [1, null, null]],
  ["both fail: the small one first again", [], 504, [1, null, 1, null]],
  ["no second request to a server that does not answer", [], 0, [1, 1]],
  ["nor to a busy one", [], 503, [1, 1]],
  ["nor without a session", [], 401, [1, 1]],
])("profiles of a small tile, run twice: %s", async (_name, working, status, asked) => {
  vi.stubGlobal("createImageBitmap", async () => ({ close: () => undefined }));
  vi.stubGlobal("cancelAnimationFrame", () => undefined);
  const live = vi.fn(async (_camera: Camera, profile: number | null) => {
    if (!working.includes(profile)) throw new ServerError(status, 0, "refused");
    return multipart("--b\r\nContent-Length: 1\r\n\r\nx\r\n");
  });
  const server = { live } as unknown as Server;
  const source = new StreamSource(server, { id: 1, video_type: 1 } as Camera, true, stillsThat(async () => undefined));
  for (let run = 0; run < 2; run += 1) {
    const [{ status: outcome }] = await Promise.allSettled([source.run(() => undefined, never())]);
    expect(outcome).toBe(working.length === 0 ? "rejected" : "fulfilled");
  }
  expect(live.mock.calls.map(([, profile]) => profile)).toEqual(asked);
});

describe("a stream that cannot be played", () => {
  const camera = { id: 2, name: "Parking", video_type: 3 } as Camera;
  const keyFrame = (profile = "4d401f") => bytes(`000001 67${profile} 000001 6588`);
  const part = Buffer.concat([Buffer.from("--b\r\nContent-Type: image/H264\r\nX-Timestamp: 40000\r\nContent-Length: 13\r\n\r\n"), keyFrame(), Buffer.from("\r\n")]);
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
    configure = ({ codec }: { codec: string }) => told.push(codec);
    reset = () => told.push("reset");
    close = () => (this.state = "closed");
    decode({ timestamp }: { timestamp: number }): void {
      told.push(timestamp / 1000);
      if (Decoder.isMute) return;
      if (fails.shift()) queueMicrotask(() => this.how.error(new DOMException("damaged", "EncodingError")));
      else queueMicrotask(() => this.how.output({ timestamp, close: () => undefined }));
    }
    static isConfigSupported = async () => ({ supported: isSupported });
  }

  /** Gives three key frames, one after the other, and ends. */
  const server = {
    live: async () =>
      multipart(
        new ReadableStream({
          async start(controller) {
            for (let sent = 0; sent < 3; sent += 1) {
              controller.enqueue(part);
              await new Promise((resolve) => setTimeout(resolve));
            }
            controller.close();
          },
        }),
      ),
  } as unknown as Server;

  beforeEach(() => {
    vi.stubGlobal("VideoDecoder", Decoder);
    vi.stubGlobal("EncodedVideoChunk", function (this: object, given: object) {
      Object.assign(this, given);
    });
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
    const stills = stillsThat(vi.fn(async () => undefined));
    const source = new StreamSource(server, camera, false, stills);
    let frames = 0;
    for (let run = 0; run < 2; run += 1) await source.run(() => (frames += 1), never());
    expect(source.unplayable?.reason ?? null).toBe(reason);
    expect(frames).toBe(reason ? shown : shown + 3);
    expect(stills.run).toHaveBeenCalledTimes(reason ? 1 : 0);
    expect([source.pollIntervalMs, source.lostAfterMs]).toEqual(reason ? [2000, 10_000] : [0, 5000]);
  });

  test("goes back to the stream after a while", async () => {
    [fails, isSupported] = [[true, true, true], true];
    const untilLeft = stillsThat((_show, signal) => new Promise((resolve) => signal.addEventListener("abort", () => resolve())));
    const source = new StreamSource(server, camera, false, untilLeft);
    vi.useFakeTimers({ toFake: ["performance", "setTimeout", "clearTimeout"] });
    const streaming = source.run(() => undefined, never());
    await vi.advanceTimersByTimeAsync(100);
    await streaming;
    expect(source.unplayable).not.toBe(null);
    const polling = source.run(() => undefined, never());
    await vi.advanceTimersByTimeAsync(60_001);
    await polling;
    expect(source.unplayable).toBe(null);
    vi.useRealTimers();
  });

  test("a decoder that falls behind gets nothing more, and makes a fresh start at the next key frame", () => {
    told.length = 0;
    fails = [];
    const player = new VideoPlayer(vi.fn(), vi.fn(), null);
    const slice = bytes("000001 419a");
    const give = (ms: number, data: Uint8Array, queued: number) => {
      Decoder.decodeQueueSize = queued;
      player.take("H264", ms * 1000, data, { capturedMs: ms, ageMs: 0 });
    };
    give(0, slice, 0);
    give(40, keyFrame(), 0);
    give(60, slice, kMaxQueuedFrames);
    expect(told, "a short backlog is no reason to leave anything out").toEqual(["avc1.4d401f", 40, 60]);
    give(80, slice, kMaxQueuedFrames + 1);
    give(100, keyFrame(), 0);
    expect(told.splice(0), "behind, but caught up by the key frame").toEqual(["avc1.4d401f", 40, 60, 100]);
    give(120, slice, kMaxQueuedFrames + 1);
    give(140, slice, 3);
    give(160, keyFrame(), 2);
    give(200, slice, 1);
    expect(told.splice(0)).toEqual(["reset", "avc1.4d401f", 160, 200]);
    give(220, keyFrame(), kMaxQueuedFrames + 1);
    give(240, keyFrame("64001f"), 1);
    expect(told, "behind at the key frame itself").toEqual(["reset", "avc1.4d401f", 220, "avc1.64001f", 240]);
    Decoder.decodeQueueSize = 0;
    player.close();
  });

  test("a decoder that takes all and gives nothing is given up, once", () => {
    Decoder.isMute = true;
    const giveUp = vi.fn();
    const player = new VideoPlayer(vi.fn(), giveUp, null);
    for (let ms = 0; ms < 600; ms += 1) player.take("H264", ms * 1000, keyFrame(), { capturedMs: ms, ageMs: 0 });
    expect(giveUp).toHaveBeenCalledTimes(1);
    Decoder.isMute = false;
  });

  test("without a decoder no stream is opened at all", async () => {
    vi.stubGlobal("VideoDecoder", undefined);
    vi.stubGlobal("isSecureContext", true);
    const stills = stillsThat(vi.fn(async () => undefined));
    const source = new StreamSource({} as Server, camera, false, stills);
    await source.run(() => undefined, never());
    expect(stills.run).toHaveBeenCalledTimes(1);
  });
});
