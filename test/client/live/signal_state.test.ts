// SPDX-License-Identifier: Apache-2.0
//
// When a picture counts as live and when as lost.

import { SignalMonitor } from "../../../client/src/live/signal_state";

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
    [{ at: 1000, does: "begin" }, { at: 5999, is: "connecting" }, { at: 6000, is: "lost", since: kWallStartMs + 1000 }],
  ],
  ["a picture makes it live until the limit", [begin, first, { at: 5099, is: "live" }, { at: 5100, is: "lost", since: 7000 }]],
  ["the same picture again is no sign of life", [begin, first, { at: 4000, does: "picture", captured: 7000 }, { at: 5100, is: "lost", since: 7000 }]],
  ["a new one is", [begin, first, { at: 4000, does: "picture", captured: 7001 }, { at: 8999, is: "live" }]],
  [
    "an old picture just delivered is lost at once",
    [begin, { at: 100, does: "picture", captured: 7000, age: 6000 }, { at: 101, is: "lost", since: 7000 }],
  ],
  [
    "a broken connection is reconnected quietly within the limit, then named",
    [begin, first, { at: 200, does: "broke" }, { at: 201, is: "connecting" }, { at: 5100, is: "lost", since: 7000, reason: "why" }],
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
    [begin, first, { at: 200, does: "end" }, { at: 300, does: "begin" }, { at: 400, does: "picture", captured: 7000 }, { at: 401, is: "live" }],
  ],
])("signal: %s", (_name, steps) => {
  let nowMs = 0;
  const judge = new SignalMonitor({ steadyMs: () => nowMs, wallMs: () => kWallStartMs + nowMs });
  for (const step of steps) {
    nowMs = step.at;
    if ("is" in step) {
      const lost = step.is === "lost" ? { sinceMs: step.since, reason: step.reason ?? "" } : {};
      expect(judge.state(), `at ${step.at} ms`).toEqual({ kind: step.is, ...lost });
    } else if (step.does === "picture") judge.picture(step.captured, step.age ?? 0);
    else if (step.does === "begin") judge.begin(5000);
    else if (step.does === "broke") judge.disconnected("why");
    else judge.end();
  }
});
