// SPDX-License-Identifier: Apache-2.0
//
// A browser that does not get its sound going: the user is told, rather than shown a switch that is on.

import { AudioPlayer, type AudioPart } from "../../../client/src/live/audio_player";

const never = new Promise<never>(() => undefined);
const part: AudioPart = {
  kind: "audio",
  codec: "PCMU",
  config: { codec: "ulaw", sampleRate: 8000, numberOfChannels: 1 },
  timestampUs: 0,
};

/** The player has heard of sound; its audio context starts as told. */
function playerWith(resume: () => Promise<void>, addModule: () => Promise<void>) {
  const close = vi.fn(() => Promise.resolve());
  vi.stubGlobal("AudioContext", class {
    resume = resume;
    audioWorklet = { addModule };
    close = close;
  });
  const player = new AudioPlayer(() => undefined);
  player.take(part, new Uint8Array());
  return { player, close };
}

beforeEach(() => void vi.useFakeTimers());
afterEach(() => {
  vi.useRealTimers();
  vi.unstubAllGlobals();
});

test.each([
  ["there is no sound device", () => never, () => Promise.resolve()],
  ["the worklet does not come", () => Promise.resolve(), () => never],
  ["the worklet cannot be loaded", () => Promise.resolve(), () => Promise.reject(new Error())],
])("it is off again, and says why: %s", async (_name, resume, addModule) => {
  const { player, close } = playerWith(resume, addModule);
  void player.switchOn();
  expect(player.isOn).toBe(true);
  await vi.advanceTimersByTimeAsync(60_000);
  expect([player.isOn, player.error]).toEqual([false, "The browser plays no sound: is there a sound device?"]);
  expect(close).toHaveBeenCalledOnce();
});

test("sound that was switched off meanwhile reports no failure", async () => {
  const { player } = playerWith(() => never, () => Promise.resolve());
  void player.switchOn();
  player.switchOff();
  await vi.advanceTimersByTimeAsync(60_000);
  expect([player.isOn, player.error]).toEqual([false, ""]);
});
