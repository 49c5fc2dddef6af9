// SPDX-License-Identifier: Apache-2.0
//
// What is told of the stream of reports: in pieces, after a lost connection, of hidden kinds, and for how long.

import { watchAlerts } from "../../../client/src/live/alert_watch";
import { newsText } from "../../../client/src/ui/events/news_text";
import { Alerts, kFrameMs } from "../../../client/src/wire/alerts";
import { LastLookStore } from "../../../client/src/wire/last_look";
import { ServerError, type Server } from "../../../client/src/wire/server";

const kNowS = 1_772_352_950;

const start = (missed: number, resumed = true) =>
  `event: start\nid: 0-1\ndata: ${JSON.stringify({ resumed, missed, time: kNowS })}\n\n`;
const mark = (id: number, kind = "alert", time = kNowS) =>
  `event: mark\r\nid: ${id}-1\r\ndata: ${JSON.stringify({ id, kind, camera_id: id, time })}\r\n\r\n:\n\n`;

const kKey = "lookhaven.look.1";
/** What the browser keeps, for all tabs, which hear of each change. */
const kept = new Map<string, string>();
let tabs: EventTarget;

beforeEach(() => {
  vi.useFakeTimers();
  tabs = new EventTarget();
  kept.clear();
  vi.stubGlobal("addEventListener", tabs.addEventListener.bind(tabs));
  vi.stubGlobal("localStorage", {
    getItem: (key: string) => kept.get(key) ?? null,
    setItem: (key: string, value: string) => {
      kept.set(key, value);
      tabs.dispatchEvent(Object.assign(new Event("storage"), { key }));
    },
  });
});
afterEach(() => {
  vi.useRealTimers();
  vi.unstubAllGlobals();
});

/** Answers a page with one stream after the other, byte by byte; those that are to stay open do. */
function serverOf(streams: { text: string; staysOpen?: boolean }[]) {
  const asked: (string | undefined)[] = [];
  const media = async (_api: string, _method: string, { after }: { after?: string }) => {
    asked.push(after);
    const next = streams.shift();
    if (!next) throw new Error("away");
    if (next.text === "") throw new ServerError(400, 0, "no such place");
    const bytes = new TextEncoder().encode(next.text);
    const body = new ReadableStream({
      start(controller) {
        for (const byte of bytes) controller.enqueue(Uint8Array.of(byte));
        if (!next.staysOpen) controller.close();
      },
    });
    return new Response(body);
  };
  const alerts = new Alerts();
  alerts.begin(new LastLookStore(1), new AbortController().signal);
  return { server: { media, alerts } as unknown as Server, asked };
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
  const { server } = serverOf([{ text: start(0, false) }, { text: start(0, resumed) + marks, staysOpen: true }]);
  const ending = new AbortController();
  void watchAlerts(server, false, () => true, ending.signal);
  await vi.advanceTimersByTimeAsync(1_300);
  ending.abort();
  const news = server.alerts.look();
  expect([news.count, newsText(news), newsText(server.alerts.look())]).toEqual([count, text, ""]);
});

test.each([
  ["goes on from the last look", { place: "5-1" }, [{ text: start(2) + mark(6) + mark(7) }], ["5-1"], { count: 2, mayBeMore: false }],
  ["nothing is known in a new browser", null, [{ text: start(0, false) + mark(7) }], [undefined], { count: 1, mayBeMore: false }],
  ["too long ago", { place: "5-1" }, [{ text: start(0, false) + mark(7) }], ["5-1"], { count: 1, mayBeMore: true }],
  ["a gap before that nobody looked at", { place: "5-1", mayBeMore: true }, [{ text: start(1) + mark(7) }], ["5-1"], { count: 1, mayBeMore: true }],
  ["what another tab has seen is not counted", { place: "6-1" }, [{ text: start(2) + mark(6) + mark(7) }], ["6-1"], { count: 1, mayBeMore: false }],
  ["what is not ours is ignored", { place: "yesterday" }, [{ text: start(0, false) }], [undefined], { count: 0, mayBeMore: false }],
  ["a place that the server refuses is left", { place: "5-1" }, [{ text: "" }, { text: start(0, false) + mark(7) }], ["5-1", undefined], { count: 1, mayBeMore: true }],
])("a page that is opened: %s", async (_name, look, streams, asked, news) => {
  if (look) kept.set(kKey, JSON.stringify(look));
  const page = serverOf(streams.map((one) => ({ ...one, staysOpen: true })));
  const ending = new AbortController();
  void watchAlerts(page.server, false, () => true, ending.signal);
  await vi.advanceTimersByTimeAsync(1_300);
  expect([page.asked, page.server.alerts.news]).toEqual([asked, news]);
  const again = serverOf([]).server.alerts;
  page.server.alerts.look();
  expect(again.start, "where the next one begins").toBe(page.server.alerts.start);
  expect([page.server.alerts.news, again.news].map(newsText)).toEqual(["", ""]);
  ending.abort();
});
