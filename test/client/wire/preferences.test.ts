// SPDX-License-Identifier: Apache-2.0
//
// What an account prefers: told to the server by name, once things have settled or the page is left, whatever the
// server says.

import { Preferences } from "../../../client/src/wire/preferences";
import { Server } from "../../../client/src/wire/server";

type Values = Record<string, unknown>;

const onSessionEnd = vi.fn();
/** What the server has, and which status it answers a change with; 0: no answer. */
let stored: Values = {};
let status = 200;
let told: { json: { id: number; preferences: Values }; keepalive: boolean | undefined }[] = [];
let kept: Map<string, string>;
let page: EventTarget & { hidden: boolean };

const answer = (code: number, data: unknown) => new Response(JSON.stringify({ success: code === 200, data, error: { code } }), { status: code });

beforeEach(() => {
  [stored, status, told, kept] = [{}, 200, [], new Map()];
  page = Object.assign(new EventTarget(), { hidden: false });
  vi.useFakeTimers();
  vi.stubGlobal("document", page);
  vi.stubGlobal("addEventListener", page.addEventListener.bind(page));
  vi.stubGlobal("localStorage", {
    getItem: (key: string) => kept.get(key) ?? null,
    removeItem: (key: string) => kept.delete(key),
  });
  vi.stubGlobal("fetch", async (address: string, { method, body, keepalive }: RequestInit) => {
    expect(method, "no preference stands in an address").toBe("POST");
    if (address.endsWith("=Preferences")) return status === 200 ? answer(200, { preferences: stored }) : answer(status, null);
    told.push({ json: JSON.parse(String(body)) as { id: number; preferences: Values }, keepalive });
    if (status === 0) throw new TypeError("Failed to fetch");
    if (status !== 200) return answer(status, null);
    const all = Object.entries({ ...stored, ...told.at(-1)!.json.preferences });
    stored = Object.fromEntries(all.filter(([, value]) => value !== null));
    return answer(200, { preferences: stored });
  });
});

afterEach(() => {
  vi.useRealTimers();
  vi.unstubAllGlobals();
});

const load = () => Preferences.load(new Server(onSessionEnd), 7);
const toldValues = () => told.map(({ json }) => json.preferences);

test("changes are known at once, and told together a moment later, for the account; what stays as it was is not", async () => {
  stored = { "wall.layout": "2", "wall.order": [2, 1] };
  const preferences = await load();
  preferences.set("wall.order", [2, 1]);
  preferences.set("wall.layout", "3");
  preferences.set("wall.layout", "4");
  preferences.set("events.kinds", []);
  expect(preferences.get("wall.layout")).toBe("4");
  await vi.advanceTimersByTimeAsync(900);
  expect(told).toEqual([]);
  await vi.advanceTimersByTimeAsync(200);
  expect(told).toEqual([{ json: { id: 7, preferences: { "wall.layout": "4", "events.kinds": [] } }, keepalive: true }]);
  await vi.advanceTimersByTimeAsync(5_000);
  expect(told.length).toBe(1);
});

test.each(["visibilitychange", "pagehide"])("a page that is left tells at once: %s", async (event) => {
  const preferences = await load();
  preferences.set("wall.layout", "3");
  page.hidden = true;
  page.dispatchEvent(new Event(event));
  expect(toldValues()).toEqual([{ "wall.layout": "3" }]);
  await vi.advanceTimersByTimeAsync(2_000);
  expect(told.length, "once").toBe(1);
});

test.each([
  ["does not answer", 0, [{ a: 1 }, { a: 1, b: 2 }]],
  ["is busy", 503, [{ a: 1 }, { a: 1, b: 2 }]],
  ["refuses", 400, [{ a: 1 }, { b: 2 }]],
  ["has ended the session", 401, [{ a: 1 }, { b: 2 }]],
])("a server that %s costs that change at most", async (_what, code, expected) => {
  const preferences = await load();
  preferences.set("a", 1);
  status = code;
  await preferences.flush();
  status = 200;
  preferences.set("b", 2);
  await preferences.flush();
  expect(toldValues()).toEqual(expected);
  expect([preferences.get("a"), onSessionEnd.mock.calls]).toEqual([1, []]);
});

test("one that tells of no preferences does not hold up the page, nor lose what the browser has", async () => {
  kept.set("lookhaven.layout", "2");
  status = 500;
  const preferences = await load();
  status = 200;
  expect(preferences.get("wall.layout")).toBeUndefined();
  preferences.set("events.kinds", ["pos"]);
  await preferences.flush();
  expect([toldValues(), [...kept]]).toEqual([[{ "events.kinds": ["pos"] }], [["lookhaven.layout", "2"]]]);
});

test.each<[string, Values, [string, string][], Values[]]>([
  [
    "is taken over",
    {},
    [["lookhaven.layout", "2"], ["lookhaven.order", "[3,1]"], ["lookhaven.events", '{"cameras":[1],"isKeptOnly":true}']],
    [{ "wall.layout": "2", "wall.order": [3, 1], "events.cameras": [1], "events.keptOnly": true }],
  ],
  ["does not replace what the account has", { "wall.layout": "3" }, [["lookhaven.layout", "2"]], []],
  ["may be damaged", {}, [["lookhaven.events", "{"]], []],
  ["may be null", {}, [["lookhaven.events", "null"], ["lookhaven.order", "null"]], []],
])("what an earlier version kept in the browser %s, once", async (_what, own, entries, expected) => {
  stored = own;
  kept = new Map(entries);
  const preferences = await load();
  expect(preferences.get("wall.layout")).toBe(own["wall.layout"] ?? expected[0]?.["wall.layout"]);
  await vi.advanceTimersByTimeAsync(1_000);
  expect([toldValues(), [...kept]]).toEqual([expected, []]);
});

test("after the session nothing is told any more", async () => {
  const preferences = await load();
  preferences.set("a", 1);
  preferences.close();
  page.dispatchEvent(new Event("pagehide"));
  await vi.advanceTimersByTimeAsync(5_000);
  expect(told).toEqual([]);
});

test("a record is told at once and is there when the server has it, as are those of other tabs, but not their choices", async () => {
  stored = { "saved.a": 1, "saved.b": 1, "wall.layout": "2" };
  const preferences = await load();
  stored = { "saved.a": 2, "saved.c": 1, "wall.layout": "3" };
  preferences.set("wall.layout", "4");
  const saved = preferences.save({ "saved.d": 1, "saved.c": null });
  expect(preferences.get("saved.d")).toBeUndefined();
  await saved;
  const known = preferences.names.map((name) => [name, preferences.get(name)]);
  expect(Object.fromEntries(known)).toEqual({ "saved.a": 2, "saved.d": 1, "wall.layout": "4" });
  expect(toldValues()).toEqual([{ "saved.d": 1, "saved.c": null }]);
  await preferences.flush();
  expect(toldValues().slice(1), "what was chosen is not lost meanwhile").toEqual([{ "wall.layout": "4" }]);
});

test.each([0, 400, 401, 403, 503])("a record that the server does not take (%i) is refused, and not told again", async (code) => {
  const preferences = await load();
  status = code;
  await expect(preferences.save({ "saved.a": 1 })).rejects.toMatchObject({ status: code });
  await preferences.refresh();
  status = 200;
  await preferences.save({ "saved.b": 1 });
  await vi.advanceTimersByTimeAsync(5_000);
  expect([preferences.names, toldValues()]).toEqual([["saved.b"], [{ "saved.a": 1 }, {}, { "saved.b": 1 }]]);
});

test.each<[string, string]>([
  ["null", "null"],
  ["no object", '{"preferences":7}'],
  ["another prototype", '{"preferences":{"__proto__":{"saved.x":1},"saved.a":null}}'],
])("an answer that is %s is no way into the page", async (_what, data) => {
  const preferences = await load();
  vi.stubGlobal("fetch", async () => new Response(`{"success":true,"data":${data}}`));
  await preferences.refresh();
  expect([preferences.names, preferences.get("saved.x")]).toEqual([[], undefined]);
});
