// SPDX-License-Identifier: Apache-2.0
//
// What is told of the stream of reports: in pieces, after a lost connection, of hidden kinds, and for how long.

import { watchAlerts } from "../../../client/src/live/alert_watch";
import { Alerts, kFrameMs } from "../../../client/src/wire/alerts";
import type { Server } from "../../../client/src/wire/server";

const kNowS = 1_772_352_950;

const start = (missed: number) => `event: start\nid: 0-1\ndata: {"resumed":true,"missed":${missed},"time":${kNowS}}\n\n`;
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
    { text: start(0) + mark(3) },
    { text: `${start(2)}${mark(4, "pos")}${mark(5, "alert", kNowS - 600)}`, staysOpen: true },
  ]);
  const ending = new AbortController();
  void watchAlerts(server, false, () => true, ending.signal);
  await vi.advanceTimersByTimeAsync(1_300);
  expect(asked).toEqual([undefined, "3-1"]);
  expect(server.alerts.count).toBe(3);
  const framed = () => [3, 4, 5].map((id) => server.alerts.kindAt({ id }));
  expect(framed()).toEqual(["alert", "pos", null]);
  expect(server.alerts.kindAt({ id: 3, server: 1 }), "another server's camera").toBeNull();
  await vi.advanceTimersByTimeAsync(kFrameMs);
  expect(framed()).toEqual([null, null, null]);
  expect([server.alerts.look(), server.alerts.count]).toEqual([3, 0]);
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
  expect([asked, server.alerts.count]).toEqual([[undefined, "0-1"], 1]);
  await vi.advanceTimersByTimeAsync(60_000);
  expect(new Set(asked.slice(2))).toEqual(new Set(["7-1"]));
  expect(asked.length).toBeLessThan(11);
  ending.abort();
});
