// SPDX-License-Identifier: Apache-2.0

import { cameraAddress, formatEventsAddress, parseEventsAddress, type EventsAddress } from "../../../../client/src/ui/events/events_route";

describe("an address of the events' screen", () => {
  const all = ["continuous", "alarm", "alert", "pos"] as const;
  const nothing: EventsAddress = { footage: null, atMs: null, isPlaying: false, stage: null, filter: null };

  test.each<[string, EventsAddress]>([
    ["#events", nothing],
    ["#alert=8", { ...nothing, footage: { kind: "alert", id: 8 } }],
    ["#events&at=1764183438123&layout=1&cameras=5", { ...nothing, atMs: 1764183438123, stage: { plan: { layout: 1, cells: [5] }, large: null } }],
    [
      "#event=7&at=1764183438123&layout=2&cameras=1,0,4,0&large=4&filter=1,4&kinds=alarm,pos&kept=1",
      {
        footage: { kind: "event", id: 7 },
        atMs: 1764183438123,
        isPlaying: false,
        stage: { plan: { layout: 2, cells: [1, null, 4, null] }, large: 4 },
        filter: { cameras: [1, 4], kinds: ["alarm", "pos"], isKeptOnly: true, words: "" },
      },
    ],
    ["#pos=9&filter=3", { ...nothing, footage: { kind: "pos", id: 9 }, filter: { cameras: [3], kinds: [...all], isKeptOnly: false, words: "" } }],
    [
      "#pos=9&filter=3&text=2+Tea+%26+%E2%82%AC+%2B5%25",
      { ...nothing, footage: { kind: "pos", id: 9 }, filter: { cameras: [3], kinds: [...all], isKeptOnly: false, words: "2 Tea & € +5%" } },
    ],
  ])("%s", (hash, address) => {
    expect(parseEventsAddress(hash)).toEqual(address);
    expect(formatEventsAddress(address)).toBe(hash);
  });

  test.each(["", "#camera=5", "#eventsx", "#event=x", "#event=", "#maps"])("%j is none", (hash) => {
    expect(parseEventsAddress(hash)).toBeNull();
  });

  test.each([
    ["#event=7&layout=5&cameras=1", null],
    ["#event=7&layout=2&cameras=1,,2", null],
    ["#event=7&layout=2&cameras=-1", null],
    ["#event=7&layout=2", null],
  ])("%s leaves the stage as it is", (hash, stage) => {
    expect(parseEventsAddress(hash)).toMatchObject({ footage: { id: 7 }, stage });
  });

  test.each([
    ["from a time on", 1764183438123, "#events&at=1764183438123&play=1&layout=1&cameras=5"],
    ["at all", null, "#events&layout=1&cameras=5"],
  ])("of what a camera has %s", (_name, atMs, hash) => {
    expect(cameraAddress(5, atMs)).toBe(hash);
    const one = { plan: { layout: 1, cells: [5] }, large: null };
    expect(parseEventsAddress(hash)).toEqual({ ...nothing, atMs, isPlaying: atMs !== null, stage: one });
  });

  test("leads to the frame that is shown, not to the one before", () => {
    expect(formatEventsAddress({ ...nothing, atMs: 1000.2 })).toBe("#events&at=1001");
  });
});
