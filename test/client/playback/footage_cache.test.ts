// SPDX-License-Identifier: Apache-2.0
//
// What the cache puts together from the spans that it has fetched.

import { FootageCache } from "../../../client/src/playback/footage_cache";
import { Recordings } from "../../../client/src/wire/recordings";
import { Server } from "../../../client/src/wire/server";
import { FakeArchive } from "../support/fake_archive";

const kSpanS = 6 * 3600;
/** Where a span begins. */
const kBorderS = 100 * kSpanS;

test("what reaches over the borders of spans is there once, wherever it is looked for, and all is by start", async () => {
  const archive = new FakeArchive();
  const recorded = (id: number, fromS: number, toS: number) => ({ id, camera: 1, start: kBorderS + fromS, stop: kBorderS + toS, frames: 10 });
  archive.recorded = [
    recorded(1, -kSpanS - 60, -kSpanS + 60),
    recorded(2, -300, 300),
    { ...recorded(3, -10, 20), kind: "pos" as const },
    recorded(4, 300, 600),
    recorded(5, kSpanS - 1, 2 * kSpanS + 1),
  ];
  vi.stubGlobal("fetch", archive.fetch);
  try {
    const cache = new FootageCache(new Recordings(new Server(() => undefined)), () => undefined);
    const idsOf = (fromS: number, toS: number) => cache.get(1, kBorderS + fromS, kBorderS + toS).footage.map(({ id }) => id);
    await cache.load([1], kBorderS, kBorderS + 1);
    // The span before is not known, so that what began there is known from this one.
    expect(idsOf(-1, 1)).toEqual([2, 3, 4, 5]);
    await cache.load([1], kBorderS - kSpanS, kBorderS + 2 * kSpanS + 2);
    for (const [fromS, toS, ids] of [
      [-kSpanS, 2 * kSpanS + 2, [1, 2, 3, 4, 5]],
      [-1, 1, [1, 2, 3, 4, 5]],
      [0, 1, [2, 3, 4, 5]],
      [kSpanS, kSpanS + 1, [5]],
      [2 * kSpanS, 2 * kSpanS + 1, [5]],
    ] as const) {
      expect(idsOf(fromS, toS), `${fromS} to ${toS}`).toEqual(ids);
    }
    archive.recorded.push(recorded(6, 3 * kSpanS - 100, 3 * kSpanS + 100));
    await cache.load([1], kBorderS + 3 * kSpanS, kBorderS + 3 * kSpanS + 1);
    expect(idsOf(2 * kSpanS, 3 * kSpanS + 1), "stored after the span where it begins was fetched").toEqual([5, 6]);
  } finally {
    vi.unstubAllGlobals();
  }
});
