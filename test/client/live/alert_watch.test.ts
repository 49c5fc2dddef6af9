// SPDX-License-Identifier: Apache-2.0
//
// What is told of the stream of reports: in pieces, after a lost connection, of hidden kinds, and for how long.

import { watchAlerts } from "../../../client/src/live/alert_watch";
import { newsText } from "../../../client/src/ui/events/news_text";
import { Alerts, kFrameMs } from "../../../client/src/wire/alerts";
import type { Server } from "../../../client/src/wire/server";

const kNowS = 1_772_352_950;

const start = (missed: number, resumed = true) =>
  `event: start\nid: 0-1\ndata: ${JSON.stringify({ resumed, missed, time: kNowS })}\n\n`;
const mark = (id: number, kind = "alert", time = kNowS) =>
  `event: mark\r\nid: ${id}-1\r\ndata: ${JSON.stringify({ id, kind, camera_id: id, time })}\r\n\r\n:\n\n`;

beforeEach(() => void vi.useFakeTimers());
afterEach(() => void vi.useRealTimers());

/** Answers with one stream after the other, byte by byte; those that are to stay open do. */
function serverOf(streams: { text: string; staysOpen?: boolean }[]) {
  const asked: (string | undefined)[] = [];
  const media = async (_api: string, _method: string, { after }: { after?: string }) => {
    asked.push(after);
    const next = streams.shift();
    if (!next) throw new Error("away");
    const bytes = new TextEncoder().encode(next.text);
    const body = new ReadableStream({
      start(controller) {
        for (const byte of bytes) controller.enqueue(Uint8Array.of(byte));
        if (!next.staysOpen) controller.close();
      },
    });
    return new Response(body);
  };
  return { server: { media, alerts: new Alerts() } as unknown as Server, asked };
}

test("goes on where it was, counts each once, and frames what happens now for ten seconds", async () => {
  const { server, asked } = serverOf([
    { text: start(0, false) + mark(3) },
    { text: `${start(2)}${mark(4, "pos")}${mark(5, "alert", kNowS - 600)}`, staysOpen: true },
  ]);
  const ending = new AbortController();
  void watchAlerts(server, false, () => true, ending.signal);
  await vi.advanceTimersByTimeAsync(1_300);
  expect(asked).toEqual([undefined, "3-1"]);
  expect(server.alerts.news, "the first start is no gap").toEqual({ count: 3, mayBeMore: false });
  const framed = () => [3, 4, 5].map((id) => server.alerts.kindAt({ id }));
  expect(framed()).toEqual(["alert", "pos", null]);
  expect(server.alerts.kindAt({ id: 3, server: 1 }), "a paired host's camera").toBeNull();
  await vi.advanceTimersByTimeAsync(kFrameMs);
  expect(framed()).toEqual([null, null, null]);
  expect([server.alerts.look().count, server.alerts.news.count]).toEqual([3, 0]);
  ending.abort();
  await vi.advanceTimersByTimeAsync(60_000);
  expect(asked.length).toBe(2);
});

test("over HTTP/1.1 it leaves when it knows all; what is hidden is not counted, an absent server asked ever more seldom", async () => {
  const { server, asked } = serverOf([
    { text: start(0), staysOpen: true },
    { text: start(2) + mark(6, "pos") + mark(7), staysOpen: true },
  ]);
  const ending = new AbortController();
  void watchAlerts(server, true, (kind) => kind !== "pos", ending.signal);
  await vi.advanceTimersByTimeAsync(100);
  expect(asked).toEqual([undefined]);
  await vi.advanceTimersByTimeAsync(5_000);
  expect([asked, server.alerts.news]).toEqual([[undefined, "0-1"], { count: 1, mayBeMore: false }]);
  await vi.advanceTimersByTimeAsync(60_000);
  expect(new Set(asked.slice(2))).toEqual(new Set(["7-1"]));
  expect(asked.length).toBeLessThan(11);
  ending.abort();
});

test.each([
  ["is told", false, mark(8), 1, "1 or more new since you looked"],
  ["alone is told", false, "", 0, "There may be new events since you looked"],
  ["is none where all was made up for", true, mark(8), 1, "1 new since you looked"],
])("a gap after too long a loss %s", async (_name, resumed, marks, count, text) => {
  const { server } = serverOf([{ text: start(0) }, { text: start(0, resumed) + marks, staysOpen: true }]);
  const ending = new AbortController();
  void watchAlerts(server, false, () => true, ending.signal);
  await vi.advanceTimersByTimeAsync(1_300);
  ending.abort();
  const news = server.alerts.look();
  expect([news.count, newsText(news), newsText(server.alerts.look())]).toEqual([count, text, ""]);
});
