// SPDX-License-Identifier: Apache-2.0
//
// Which layout of a sequence is shown, and when.

import type { SavedLayout, SavedLayouts, Sequence } from "../../../../client/src/ui/wall/saved_layouts";
import { SequenceRun, stepFrom } from "../../../../client/src/ui/wall/sequence_run";

test.each<[string, string, string | null, 1 | -1, string | null]>([
  // ids, those that can be shown, current, by, expected
  ["abc", "abc", null, 1, "a"],
  ["abc", "abc", null, -1, "c"],
  ["abc", "abc", "a", 1, "b"],
  ["abc", "abc", "c", 1, "a"],
  ["abc", "abc", "a", -1, "c"],
  ["abc", "ac", "a", 1, "c"],
  ["abc", "ac", "c", -1, "a"],
  ["abc", "a", "a", 1, "a"],
  ["abc", "b", "x", 1, "b"],
  ["abc", "", "a", 1, null],
  ["", "abc", null, -1, null],
])("of %s, where %s can be shown, from %s by %i", (ids, shown, current, by, expected) => {
  expect(stepFrom([...ids], (id) => shown.includes(id), current, by)).toBe(expected);
});

describe("while it runs", () => {
  let sequence: Sequence | null;
  let layouts: SavedLayout[];
  /** Ids of layouts of which the account may see nothing. */
  let denied: string[];
  let shown: string[];
  let run: SequenceRun;

  beforeEach(() => {
    vi.useFakeTimers();
    sequence = { id: "s", name: "Night", dwellS: 10, layouts: ["a", "b", "c"] };
    layouts = ["a", "b", "c"].map((id) => ({ id, name: id, grid: "auto", cameras: [1] }));
    [denied, shown] = [[], []];
    const saved = {
      get layouts() {
        return layouts;
      },
      get sequences() {
        return sequence ? [sequence] : [];
      },
    } as SavedLayouts;
    run = new SequenceRun("s", saved, ({ id }) => !denied.includes(id), () => shown.push(run.current?.id ?? "none"));
    run.refresh();
  });

  afterEach(() => {
    run.close();
    vi.useRealTimers();
  });

  const wait = (seconds: number) => void vi.advanceTimersByTime(seconds * 1000);

  test.each<[string, () => void, string]>([
    ["each is shown for its time, and the first follows the last", () => wait(39), "a b c a"],
    ["a step begins the time anew", () => (wait(9), run.step(1), wait(9), run.step(-1), wait(9)), "a b a"],
    ["a pause holds it, however long, and the time begins anew", () => (wait(5), (run.isPaused = true), wait(100), (run.isPaused = false), wait(9)), "a a a"],
    ["while paused, one can step", () => ((run.isPaused = true), run.step(1), wait(100)), "a a b"],
    ["a hidden page holds it, and goes on", () => ((run.isHidden = true), wait(100), (run.isHidden = false), wait(10)), "a b"],
    ["a hidden page does not end a pause", () => ((run.isPaused = true), (run.isHidden = true), (run.isHidden = false), wait(100)), "a a"],
    ["one that cannot be seen is skipped", () => ((denied = ["b"]), run.refresh(), wait(10)), "a c"],
    ["one that cannot be seen any more is left", () => ((denied = ["a"]), run.refresh()), "a b"],
    ["one that is deleted is left", () => ((layouts = layouts.slice(1)), (sequence = { ...sequence!, layouts: ["b", "c"] }), run.refresh()), "a b"],
    ["none is left, then one again", () => ((denied = ["a", "b", "c"]), run.refresh(), run.refresh(), (denied = ["a"]), run.refresh()), "a none b"],
    ["another time counts from the next on", () => ((sequence = { ...sequence!, dwellS: 60 }), wait(10), wait(59)), "a b"],
    ["a sequence that is deleted shows none", () => ((sequence = null), run.refresh(), wait(100)), "a none"],
    ["once closed, nothing more is shown", () => (run.close(), wait(100)), "a"],
  ])("%s", (_what, act, expected) => {
    act();
    expect(shown.join(" ")).toBe(expected);
  });

  test.each<[string, string[], string | null]>([
    ["the one after it", [], "b"],
    ["not one that cannot be seen", ["b"], "c"],
    ["nothing where it is the only one", ["b", "c"], null],
  ])("what comes next is %s", (_what, unseen, expected) => {
    denied = unseen;
    expect(run.next?.id ?? null).toBe(expected);
  });
});
