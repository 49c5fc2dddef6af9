// SPDX-License-Identifier: Apache-2.0
//
// When a picture counts as live and when as lost.

import { SignalMonitor } from "../../../client/src/live/signal_state";

/** Milliseconds after the start of the browser's clock; what happens, or what state it is then. */
type Step =
  | [at: number, does: "begin" | "broke" | "end"]
  | [at: number, does: "picture", captured: number, age?: number]
  | [at: number, is: "idle" | "connecting" | "live"]
  | [at: number, is: "lost", since: number | null, reason?: string];

const begin: Step = [0, "begin"];
const first: Step = [100, "picture", 7000];

test.each<[string, Step[]]>([
  ["nothing is claimed before watching", [[9000, "idle"]]],
  ["no picture ever: nobody knows since when", [[1000, "begin"], [5999, "connecting"], [6000, "lost", null]]],
  ["a picture makes it live until the limit", [begin, first, [5099, "live"], [5100, "lost", 7000]]],
  ["the same picture again is no sign of life", [begin, first, [4000, "picture", 7000], [5100, "lost", 7000]]],
  ["a new one is", [begin, first, [4000, "picture", 7001], [8999, "live"]]],
  ["an old picture just delivered is lost at once", [begin, [100, "picture", 7000, 6000], [101, "lost", 7000]]],
  ["a broken connection is reconnected quietly within the limit, then named", [begin, first, [200, "broke"], [201, "connecting"], [5100, "lost", 7000, "why"]]],
  ["an attempt to reconnect does not hide the loss, a picture does", [begin, [6000, "begin"], [6001, "lost", null], [6002, "picture", 7000], [6003, "live"]]],
  ["a camera that slept behind a hidden tab is not called lost for that time", [begin, first,
    [200, "end"], [9000, "idle"], [9000, "begin"], [9001, "connecting"], [14000, "lost", null]]],
  ["after that, even the same capture counts: it was not seen since", [begin, first, [200, "end"], [300, "begin"], [400, "picture", 7000], [401, "live"]]],
])("signal: %s", (_name, steps) => {
  let nowMs = 0;
  const judge = new SignalMonitor(() => nowMs);
  for (const [at, what, ms = 0, more] of steps) {
    nowMs = at;
    if (what === "picture") judge.picture(ms ?? 0, Number(more ?? 0));
    else if (what === "begin") judge.begin(5000);
    else if (what === "broke") judge.disconnected("why");
    else if (what === "end") judge.end();
    else {
      const lost = what === "lost" ? { sinceMs: ms, reason: more ?? "" } : {};
      expect(judge.state(), `at ${at} ms`).toEqual({ kind: what, ...lost });
    }
  }
});
