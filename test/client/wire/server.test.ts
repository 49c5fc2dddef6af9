// SPDX-License-Identifier: Apache-2.0
//
// Answers of the server as the user gets to see them, and what is sent to it.

import type { Camera } from "../../../client/src/wire/camera";
import { Exports } from "../../../client/src/wire/exports";
import { Server } from "../../../client/src/wire/server";

const json = (status: number, body: unknown) =>
  new Response(JSON.stringify(body), { status, headers: { "Content-Type": "application/json" } });
const failure = (code: number, message?: string) => ({ success: false, error: { code, data: {}, message } });
const html = (status: number) => new Response("<h1>nginx</h1>", { status, headers: { "Content-Type": "text/html" } });
const lost = () => Promise.reject(new TypeError("Failed to fetch"));

const kMjpeg = { id: 1, video_type: 1 } as Camera;
const cameras = (server: Server) => server.cameras();
const login = (server: Server) => server.login("admin", "secret");
const snapshot = (server: Server) => server.snapshot(kMjpeg);
const live = (server: Server) => server.live(kMjpeg, 1, new AbortController().signal);
const exported = (server: Server) => new Exports(server).open([1], 0, 60, new AbortController().signal);

test.each([
  ["a handler's error with HTTP 200", cameras, () => json(200, failure(400)), "The server refused.", false],
  ["the host's own sentence", cameras, () => json(404, failure(404, "no such method")), "The server refused: no such method.", false],
  ["a proxy's error page", cameras, () => html(502), "The server could not answer (502).", false],
  ["JSON that is none", cameras, () => html(200), "The server's answer is not valid.", false],
  ["JSON of another shape", cameras, () => json(200, []), "The server refused.", false],
  ["no connection", cameras, lost, "The server does not answer.", false],
  ["a session that ended", cameras, () => json(401, failure(401)), "You are not logged in.", true],
  ["a wrong password, which ends no session", login, () => json(401, failure(401)), "The account or the password is wrong.", false],
  ["throttled logins", login, () => json(429, failure(429, "too many attempts with a password; try again in 60 seconds")), "Too many attempts. Please wait a minute.", false],
  ["a server that has too much to do", cameras, () => json(429, failure(429, "try again in a moment")), "Try again in a moment.", false],
  ["a proxy that throttles", cameras, () => html(429), "Too many attempts. Please wait a minute.", false],
  ["a snapshot without picture", snapshot, () => json(504, failure(504)), "The camera sends no picture.", false],
  ["a snapshot refused with HTTP 200", snapshot, () => json(200, failure(400)), "The server refused.", false],
  ["a camera that cannot be opened", live, () => json(502, failure(502, "the handler gave no answer")), "No picture was received.", false],
  ["an export whose recordings cannot be read", exported, () => json(502, failure(502, "the handler gave no answer")), "The recordings could not be read.", false],
  ["an export while the host is away", exported, () => json(502, failure(502, "the web API does not answer")), "The server does not answer.", false],
  ["footage of a host that is away", exported, () => json(503, failure(503, "the footage is on host B, which is offline")), "The footage is on host B, which is offline.", false],
  ["a stream whose session ended", live, () => json(401, failure(401)), "You are not logged in.", true],
  ["a stream too many", live, () => json(503, failure(503)), "The server is busy.", false],
])("says what went wrong: %s", async (_name, call, answer, message, endsSession) => {
  vi.stubGlobal("fetch", async () => answer());
  const onSessionEnd = vi.fn();
  await expect(call(new Server(onSessionEnd))).rejects.toThrow(message);
  expect(onSessionEnd.mock.calls.length > 0).toBe(endsSession);
});

test("the password travels in the body, never in the address", async () => {
  const fetched = vi.fn(async (_address: string, _init?: RequestInit) =>
    json(200, { success: true, data: { account: "admin" } }),
  );
  vi.stubGlobal("fetch", fetched);
  expect(await new Server(() => undefined).login("ad&min", "p=1&x")).toEqual({ account: "admin" });
  const [address, init] = fetched.mock.calls[0]!;
  expect(address).toBe("webapi?api=VEXO.Auth&version=1&method=Login");
  expect([init?.method, String(init?.body)]).toEqual(["POST", "account=ad%26min&password=p%3D1%26x"]);
});

test.each([
  [1, "webapi?api=VEXO.Lookhaven.Player.LiveviewSrc&version=1&method=Play&camera=7&snapshot=1"],
  [3, "webapi?api=VEXO.Picture&version=1&method=Get&camera=7"],
])("a snapshot of a camera of video type %i", async (video_type, address) => {
  const picture = { status: 200, headers: { "Content-Type": "image/jpeg", "X-Capture-Time": "1764023456.5" } };
  const fetched = vi.fn(async (_address: string) => new Response("jpeg", picture));
  vi.stubGlobal("fetch", fetched);
  const snapshot = await new Server(() => undefined).snapshot({ id: 7, video_type } as Camera);
  expect(fetched.mock.calls[0]![0]).toBe(address);
  expect([await snapshot.jpeg.text(), snapshot.takenMs]).toEqual(["jpeg", 1764023456500]);
});

test("a request without an answer ends in time", async () => {
  vi.useFakeTimers();
  vi.stubGlobal("fetch", (_address: string, { signal }: RequestInit) => {
    return new Promise((_resolve, reject) => signal!.addEventListener("abort", () => reject(signal!.reason)));
  });
  const failed = expect(new Server(() => undefined).snapshot(kMjpeg, undefined, 3000)).rejects.toThrow("does not answer");
  await vi.advanceTimersByTimeAsync(3000);
  await failed;
  vi.useRealTimers();
});
