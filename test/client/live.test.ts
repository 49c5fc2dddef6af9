// SPDX-License-Identifier: Apache-2.0
//
// What keeps a picture live: the verdict on the signal, reconnecting, the sharing of connections, the sources.

import { Backoff } from "../../client/src/live/backoff";
import { captureOf } from "../../client/src/live/media_part";
import { SignalJudge } from "../../client/src/live/signal_state";
import { chooseStreams, streamLimit } from "../../client/src/live/stream_budget";
import { NewestPicture, StreamSource } from "../../client/src/live/stream_source";
import { Semaphore } from "../../client/src/wire/semaphore";
import { ServerError, type Camera, type Server } from "../../client/src/wire/server";

const kWallStartMs = 1_764_000_000_000;

type Step =
  | { at: number; does: "begin" | "broke" | "end" }
  | { at: number; does: "picture"; captured: number; age?: number }
  | { at: number; is: "idle" | "connecting" | "live" }
  /** Milliseconds after the start of the browser's clock, or the capture time. */
  | { at: number; is: "lost"; since: number; reason?: string };

const begin = { at: 0, does: "begin" } as const;
const first = { at: 100, does: "picture", captured: 7000 } as const;

test.each<[string, Step[]]>([
  ["nothing is claimed before watching", [{ at: 9000, is: "idle" }]],
  [
    "no picture ever: lost since watching began",
    [
      { at: 1000, does: "begin" },
      { at: 5999, is: "connecting" },
      { at: 6000, is: "lost", since: kWallStartMs + 1000 },
    ],
  ],
  [
    "a picture makes it live until the limit",
    [begin, first, { at: 5099, is: "live" }, { at: 5100, is: "lost", since: 7000 }],
  ],
  [
    "the same picture again is no sign of life",
    [begin, first, { at: 4000, does: "picture", captured: 7000 }, { at: 5100, is: "lost", since: 7000 }],
  ],
  ["a new one is", [begin, first, { at: 4000, does: "picture", captured: 7001 }, { at: 8999, is: "live" }]],
  [
    "an old picture just delivered is lost at once",
    [begin, { at: 100, does: "picture", captured: 7000, age: 6000 }, { at: 101, is: "lost", since: 7000 }],
  ],
  [
    "a broken connection is reconnected quietly within the limit, then named",
    [
      begin,
      first,
      { at: 200, does: "broke" },
      { at: 201, is: "connecting" },
      { at: 5100, is: "lost", since: 7000, reason: "why" },
    ],
  ],
  [
    "an attempt to reconnect does not hide the loss, a picture does",
    [
      begin,
      { at: 6000, does: "begin" },
      { at: 6001, is: "lost", since: kWallStartMs },
      { at: 6002, does: "picture", captured: 7000 },
      { at: 6003, is: "live" },
    ],
  ],
  [
    "a camera that slept behind a hidden tab is not called lost for that time",
    [
      begin,
      first,
      { at: 200, does: "end" },
      { at: 9000, is: "idle" },
      { at: 9000, does: "begin" },
      { at: 9001, is: "connecting" },
      { at: 14000, is: "lost", since: kWallStartMs + 9000 },
    ],
  ],
  [
    "after that, even the same capture counts: it was not seen since",
    [
      begin,
      first,
      { at: 200, does: "end" },
      { at: 300, does: "begin" },
      { at: 400, does: "picture", captured: 7000 },
      { at: 401, is: "live" },
    ],
  ],
])("signal: %s", (_name, steps) => {
  let nowMs = 0;
  const judge = new SignalJudge({ steadyMs: () => nowMs, wallMs: () => kWallStartMs + nowMs });
  for (const step of steps) {
    nowMs = step.at;
    if ("is" in step) {
      const lost = step.is === "lost" ? { sinceMs: step.since, reason: step.reason ?? "" } : {};
      expect(judge.state(), `at ${step.at} ms`).toEqual({ kind: step.is, ...lost });
    } else if (step.does === "picture") judge.picture(step.captured, step.age ?? 0);
    else if (step.does === "begin") judge.begin(5000);
    else if (step.does === "broke") judge.broke("why");
    else judge.end();
  }
});

test("back-off grows to fifteen seconds, spreads by a quarter, starts again after success", () => {
  const lowest = new Backoff(() => 0);
  const highest = new Backoff(() => 1);
  const wait = (backoff: Backoff) => Array.from({ length: 6 }, () => backoff.next() / 1000);
  expect(wait(lowest)).toEqual([0.75, 1.5, 3, 6, 11.25, 11.25]);
  expect(wait(highest)).toEqual([1.25, 2.5, 5, 10, 18.75, 18.75]);
  lowest.reset();
  expect(lowest.next()).toBe(750);
});

test.each([
  ["h2", true],
  ["h3", true],
  ["http/1.1", false],
  ["", false],
  [undefined, false],
])("protocol %s lets every tile stream: %s", (protocol, every) => {
  expect(streamLimit(protocol)).toBe(every ? Infinity : 4);
});

test.each([
  ["from the top", [1, 2, 3, 4, 5, 6], [], 4, [1, 2, 3, 4]],
  ["who streams goes on", [1, 2, 3, 4, 5, 6], [5, 6], 4, [5, 6, 1, 2]],
  ["who is scrolled away makes room", [3, 4, 5, 6], [1, 2, 3, 4], 4, [3, 4, 5, 6]],
  ["more streaming than allowed", [1, 2, 3], [1, 2, 3], 2, [1, 2]],
  ["no limit", [1, 2, 3, 4, 5, 6], [], Infinity, [1, 2, 3, 4, 5, 6]],
  ["nothing on the screen", [], [1, 2], 4, []],
])("streams: %s", (_name, visible, streaming, limit, chosen) => {
  expect([...chooseStreams(visible, new Set(streaming), limit)]).toEqual(chosen);
});

test("semaphore: one at a time in order, a failure or a leaver blocks nobody", async () => {
  const semaphore = new Semaphore(1);
  const log: string[] = [];
  const stay = new AbortController();
  const leave = new AbortController();
  const work =
    (name: string, fails = false) =>
    async () => {
      log.push(`${name} in`);
      await Promise.resolve();
      log.push(`${name} out`);
      if (fails) throw new Error(name);
    };
  const all = [
    semaphore.run(stay.signal, work("a", true)),
    semaphore.run(leave.signal, work("b")),
    semaphore.run(stay.signal, work("c")),
  ];
  leave.abort();
  expect((await Promise.allSettled(all)).map(({ status }) => status)).toEqual(["rejected", "rejected", "fulfilled"]);
  await semaphore.run(stay.signal, work("d"));
  expect(log).toEqual(["a in", "a out", "c in", "c out", "d in", "d out"]);
});

test("pictures that come while one is being decoded give way to the newest; a bad one stops nothing", async () => {
  const shown: number[] = [];
  const newest = new NewestPicture(async ({ body }) => {
    shown.push(body[0]!);
    await Promise.resolve();
    if (body[0] === 1) throw new Error("cannot be decoded");
  });
  for (const number of [1, 2, 3, 4]) newest.offer({ headers: new Map(), body: Uint8Array.of(number) });
  await vi.waitFor(() => expect(shown).toEqual([1, 4]));
  newest.offer({ headers: new Map(), body: Uint8Array.of(5) });
  expect(shown).toEqual([1, 4, 5]);
});

test.each([
  [
    { "x-capture-time": "1764023456.123", "x-age-ms": "40" },
    { capturedMs: 1764023456123, ageMs: 40 },
  ],
  [{}, { capturedMs: 99, ageMs: 0 }],
  [
    { "x-capture-time": "soon", "x-age-ms": "-5" },
    { capturedMs: 99, ageMs: 0 },
  ],
])("capture of %j", (headers, capture) => {
  expect(captureOf(new Map(Object.entries(headers)), 99)).toEqual(capture);
});

/** A server on which the listed profiles give one picture and end; the others fail with `status`. */
function serverWith(working: (number | null)[], status: number) {
  const asked: (number | null)[] = [];
  const server = {
    async live(_camera: number, profile: number | null) {
      asked.push(profile);
      if (!working.includes(profile)) throw new ServerError(status, 0, "refused");
      const body = "--b\r\nContent-Length: 1\r\n\r\nx\r\n";
      return new Response(body, { headers: { "Content-Type": "multipart/x-mixed-replace; boundary=b" } });
    },
  };
  return { asked, server: server as unknown as Server };
}

test.each([
  ["the small picture where there is one", [1, null], 504, [1, 1]],
  ["else the usual one, and at once the next time", [null], 504, [1, null, null]],
  ["both fail: the small one first again", [], 504, [1, null, 1, null]],
  ["no second request to a server that does not answer", [], 0, [1, 1]],
  ["nor to a busy one", [], 503, [1, 1]],
  ["nor without a session", [], 401, [1, 1]],
])("profiles of a small tile, run twice: %s", async (_name, working, status, asked) => {
  vi.stubGlobal("createImageBitmap", async () => ({ close: () => undefined }));
  vi.stubGlobal("cancelAnimationFrame", () => undefined);
  const fake = serverWith(working, status);
  const stills = { everyMs: 0, lostAfterMs: 0, run: async () => undefined };
  const source = new StreamSource(fake.server, { id: 1, video_type: 1 } as Camera, true, stills);
  for (let run = 0; run < 2; run += 1) {
    const failed = await source
      .run(() => undefined, new AbortController().signal)
      .then(
        () => false,
        () => true,
      );
    expect(failed).toBe(working.length === 0);
  }
  expect(fake.asked).toEqual(asked);
});
