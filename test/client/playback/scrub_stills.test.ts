// SPDX-License-Identifier: Apache-2.0
//
// The stills of a dragged playhead, from a server that answers when the test wants.

import { ScrubStills } from "../../../client/src/playback/scrub_stills";
import { footageOf } from "../../../client/src/wire/footage";
import type { Recordings, Still } from "../../../client/src/wire/recordings";

describe("the stills of a dragged playhead", () => {
  const footage = footageOf({ id: 7, start: 0, stop: 100, frame_count: 1, record_type: 1, is_recording: false }, 1);
  const asked: { atMs: number; answer(still: Still | Error): Promise<void> }[] = [];
  const shown: [camera: number, atMs: number | null][] = [];
  let stills: ScrubStills;

  beforeEach(() => {
    asked.length = shown.length = 0;
    const still = (_: unknown, atMs: number) =>
      new Promise<Still>((resolve, reject) => {
        const answer = async (given: Still | Error) => {
          if (given instanceof Error) reject(given);
          else resolve(given);
          await Promise.resolve().then(() => new Promise((done) => setTimeout(done)));
        };
        asked.push({ atMs, answer });
      });
    stills = new ScrubStills({ still } as unknown as Recordings, async (camera, one) => void shown.push([camera, one && one.capturedMs]));
  });

  const request = (atMs: number, cameras = [1]) => stills.request(cameras.map((camera) => ({ camera, footage, atMs, widthPx: 320 })));
  const answer = (at: number) => asked[at]!.answer({ jpeg: new Blob(), capturedMs: asked[at]!.atMs });

  test("few are fetched at once, and of what waits meanwhile the newest alone", async () => {
    for (let atMs = 1; atMs <= 60; atMs += 1) request(atMs);
    expect(asked.map(({ atMs }) => atMs)).toEqual([1, 2, 3]);
    await answer(0);
    expect(asked.map(({ atMs }) => atMs)).toEqual([1, 2, 3, 60]);
  });

  test("one that comes later than its successor is left out", async () => {
    for (const atMs of [1, 2, 3]) request(atMs);
    await answer(1);
    await answer(0);
    await answer(2);
    expect(shown).toEqual([[1, 2], [1, 3]]);
  });

  test("the active camera comes first; one that has nothing then says so at once", async () => {
    for (const atMs of [1, 2, 3]) request(atMs);
    stills.request([
      { camera: 1, footage, atMs: 4, widthPx: 320 },
      { camera: 2, footage: null, atMs: 4, widthPx: 320 },
    ]);
    await answer(0);
    expect(asked.at(-1)!.atMs).toBe(4);
    await answer(1);
    expect(shown).toContainEqual([2, null]);
  });

  test("until the time that was asked for a key frame stands for all after it, and is not fetched again", async () => {
    const answerFrom = (at: number, capturedMs: number) => asked[at]!.answer({ jpeg: new Blob(), capturedMs });
    request(1900);
    await answerFrom(0, 1000);
    for (const atMs of [1000, 1400, 1900]) request(atMs);
    expect(asked).toHaveLength(1);
    expect(shown).toEqual([[1, 1000]]);
    request(2500);
    await answerFrom(1, 2000);
    request(1500);
    request(999);
    request(1901);
    expect(asked.map(({ atMs }) => atMs)).toEqual([1900, 2500, 999, 1901]);
    expect(shown).toEqual([[1, 1000], [1, 2000], [1, 1000]]);
  });

  test("one that is being fetched is not fetched again, and is shown as the newest request for it", async () => {
    for (const atMs of [1, 2, 1]) request(atMs);
    await answer(1);
    await answer(0);
    expect(asked).toHaveLength(2);
    expect(shown).toEqual([[1, 2], [1, 1]]);
    for (const atMs of [3, 3]) request(atMs);
    await asked[2]!.answer(new Error("lost"));
    await answer(3);
    expect(shown.at(-1)).toEqual([1, 3]);
    request(5);
    stills.stop();
    request(5);
    expect(asked).toHaveLength(6);
  });

  test("one that fails leaves the picture, and its place to the next; nothing comes after the end", async () => {
    for (const atMs of [1, 2, 3, 4]) request(atMs);
    await asked[0]!.answer(new Error("lost"));
    expect(asked.at(-1)!.atMs).toBe(4);
    stills.stop();
    await answer(3);
    expect(shown).toEqual([]);
  });
});
