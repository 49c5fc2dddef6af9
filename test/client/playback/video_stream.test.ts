// SPDX-License-Identifier: Apache-2.0
//
// What is shown of a stream, and how it ends; and the sound in it, in step with the picture.

import type { RecordedFrame } from "../../../client/src/playback/frame_stream";
import { RecordedSound } from "../../../client/src/playback/recorded_sound";
import { readVideo } from "../../../client/src/playback/video_stream";
import { part, videoPart } from "../support/fake_archive";
import { FakeDecoder, FakePicture, stubDecoder } from "../support/fake_decoder";

const kHead = { headers: { "Content-Type": "multipart/x-mixed-replace; boundary=frame" } };
const kEnd = Buffer.from("--frame--\r\n");
/** A frame of ten a second, or one at another time. */
const frame = (index: number, atMs = index * 100) => {
  const captured = `X-Capture-Time: ${(1000 + atMs / 1000).toFixed(3)}\r\n`;
  return videoPart(index, atMs / (index || 1), captured);
};
const outside = part("image/H264", Uint8Array.of(0, 0, 0, 1, 0x41), "X-Timestamp: 7\r\n");
const refusal = part("text/plain", Buffer.from("no more"));

describe("a stream of video", () => {
  beforeEach(stubDecoder);
  afterEach(() => expect(FakePicture.open).toBe(0));

  const read = async (sent: Uint8Array[], from = 0, goesOn: (shown: number) => boolean = () => true) => {
    const shown: string[] = [];
    const take = async ({ index, capturedMs, picture }: RecordedFrame) => {
      shown.push(`${index}${picture ? "" : " again"} at ${capturedMs - 1_000_000}`);
      return goesOn(shown.length);
    };
    const open = async () => new Response(Buffer.concat(sent), kHead);
    const result = readVideo(open, { from, rate: 1 }, take, new RecordedSound(() => undefined), new AbortController().signal);
    return { result: await result.catch((error: { status: number }) => error.status), shown };
  };

  test.each([
    ["each frame, to the last boundary", [frame(0), frame(1), kEnd], 0, ["0 at 0", "1 at 100"], true],
    ["a stream that was cut", [frame(0), frame(1)], 0, ["0 at 0", "1 at 100"], false],
    ["from a frame on", [frame(0), frame(1), frame(2), kEnd], 2, ["2 at 200"], true],
    ["not what lies outside", [frame(0), outside, frame(1), kEnd], 0, ["0 at 0", "1 at 100"], true],
    ["a picture that stays, once a second", [frame(0), frame(3, 2500), kEnd], 0, ["0 at 0", "1 again at 0", "2 again at 0", "3 at 2500"], true],
    ["no frames that are missing", [frame(0), frame(5), kEnd], 0, ["0 at 0", "5 at 500"], true],
    ["what comes before the end of what can be streamed", [frame(0), frame(1), refusal], 0, ["0 at 0", "1 at 100"], 406],
    ["nothing of a damaged stream", [Buffer.from("--frame\r\nContent-Length: x\r\n\r\n")], 0, [], 406],
    ["nothing of an empty recording", [kEnd], 0, [], true],
  ])("shows %s", async (_name, sent, from, shown, result) => {
    expect(await read(sent, from)).toEqual({ result, shown });
  });

  test.each([
    ["takes all frames and gives no picture", "takes", 200, 0],
    ["takes no more", "stands", 200, 0],
    ["takes none, of a stream that is over", "stands", 3, 0],
    ["does not come to the end", "flushes", 6, 4],
  ] as const)("is left where the decoder %s, before long", async (_name, silence, frames, shown) => {
    vi.useFakeTimers();
    try {
      FakeDecoder.silence = silence;
      const sent = Array.from({ length: frames }, (_, index) => frame(index));
      const left = read([...sent, kEnd]);
      await vi.advanceTimersByTimeAsync(10_000);
      const { result, shown: indexes } = await left;
      expect([result, indexes.length]).toEqual([406, shown]);
    } finally {
      vi.useRealTimers();
    }
  });

  test("ends when its frames are not taken any more, and closes what was decoded", async () => {
    const sent = Array.from({ length: 30 }, (_, index) => frame(index));
    expect((await read([...sent, kEnd], 0, (shown) => shown < 3)).shown).toHaveLength(3);
  });
});

describe("the sound of a recording", () => {
  const heard: number[] = [];
  let sound: RecordedSound;
  const block = (timestampUs: number) => sound.take({ kind: "audio", config: null, codec: "AAC", timestampUs }, new Uint8Array(1));

  beforeEach(() => {
    vi.useFakeTimers({ toFake: ["setInterval", "clearInterval", "performance"] });
    heard.length = 0;
    sound = new RecordedSound(() => undefined);
    vi.spyOn(sound.player, "take").mockImplementation(({ timestampUs }) => void heard.push(timestampUs / 1000));
  });

  afterEach(() => {
    sound.stop();
    vi.useRealTimers();
  });

  // By a tenth of a second and a block earlier than its picture, which is what it takes to be heard.
  test.each([
    [1, 1100],
    [2, 2300],
    [4, undefined],
    [-2, undefined],
  ])("comes a moment before its picture, at rate %d", (rate, last) => {
    sound.begin(rate);
    for (let ms = 0; ms < 5000; ms += 100) block(ms * 1000);
    expect(heard).toEqual([]);
    sound.follow(0);
    vi.advanceTimersByTime(1000);
    expect(heard.at(-1)).toBe(last);
    expect(heard).toEqual(Array.from({ length: last === undefined ? 0 : last / 100 + 1 }, (_, at) => at * 100));
  });

  test("stops with its picture, and what is past is not heard", () => {
    sound.begin(1);
    for (let ms = 0; ms < 8000; ms += 100) block(ms * 1000);
    sound.follow(3_000_000);
    expect(heard[0]).toBe(2800);
    vi.advanceTimersByTime(4000);
    expect(heard.at(-1)).toBeLessThanOrEqual(4700);
    const before = heard.length;
    sound.stop();
    vi.advanceTimersByTime(1000);
    expect(heard).toHaveLength(before);
    const leave = sound.begin(1);
    sound.follow(9_000_000);
    expect(heard).toHaveLength(before);
    sound.begin(1);
    leave();
    block(20_000_000);
    sound.follow(20_000_000);
    expect(heard.at(-1), "a stream that ends late does not silence the next").toBe(20_000);
  });
});
