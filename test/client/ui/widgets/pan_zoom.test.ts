// SPDX-License-Identifier: Apache-2.0
//
// What wheel, mouse and fingers do to something that pans and zooms.

import { panZoomByWheel, PanZoomPointers } from "../../../../client/src/ui/widgets/pan_zoom";

/** Its corner is at (100, 50) of the window. */
const target = () =>
  Object.assign(new EventTarget(), {
    getBoundingClientRect: () => ({ left: 100, top: 50 }),
    setPointerCapture: () => undefined,
  }) as unknown as HTMLElement;
const log: (string | number)[][] = [];
const actions = {
  pan: (x: number, y: number) => void log.push(["pan", x, y]),
  zoom: (factor: number, { x, y }: { x: number; y: number }) => void log.push(["zoom", Math.round(factor * 100), x, y]),
};

beforeEach(() => {
  log.length = 0;
  vi.stubGlobal("WheelEvent", { DOM_DELTA_LINE: 1 });
});

test.each([
  ["up zooms in where the pointer is", { deltaY: -100 }, ["zoom", 116, 20, 30]],
  ["a notch of 120 pixels", { deltaY: 120 }, ["zoom", 84, 20, 30]],
  ["a notch of three lines does the same", { deltaY: 3, deltaMode: 1 }, ["zoom", 84, 20, 30]],
  ["a trackpad's pinch is faster", { deltaY: -10, ctrlKey: true }, ["zoom", 109, 20, 30]],
  ["sideways pans", { deltaX: 40, deltaY: 10 }, ["pan", -40, 0]],
  ["Shift pans", { deltaY: 40, shiftKey: true }, ["pan", -40, 0]],
])("wheel: %s", (_name, given, done) => {
  const element = target();
  panZoomByWheel(element, actions);
  element.dispatchEvent(Object.assign(new Event("wheel"), { deltaX: 0, deltaMode: 0, clientX: 120, clientY: 80, ...given }));
  expect(log).toEqual([done]);
});

type Step = ["down" | "move" | "up", id: number, x: number, y: number];
test.each<[string, "x" | "both", boolean, Step[], (string | number)[][]]>([
  ["a trembling hand clicks", "both", false, [["down", 1, 0, 0], ["move", 1, 3, 3], ["up", 1, 3, 3]], []],
  ["a drag pans by all of its way", "both", true, [["down", 1, 0, 0], ["move", 1, 3, 3], ["move", 1, 9, 2], ["move", 1, 10, 4]], [["pan", 9, 2], ["pan", 1, 2]]],
  ["a released pointer does nothing", "both", false, [["down", 1, 0, 0], ["up", 1, 0, 0], ["move", 1, 90, 0]], []],
  ["fingers zoom about their centre", "both", true, [["down", 1, 100, 50], ["down", 2, 130, 90], ["move", 2, 160, 130]], [["zoom", 200, 30, 40], ["pan", 15, 20]]],
  ["only sideways where there is one axis", "x", true, [["down", 1, 100, 50], ["down", 2, 130, 90], ["move", 2, 130, 190]], [["zoom", 100, 15, 70], ["pan", 0, 50]]],
  ["a finger that stays pans on", "both", true, [["down", 1, 0, 0], ["down", 2, 50, 0], ["up", 2, 50, 0], ["move", 1, 2, 0]], [["pan", 2, 0]]],
])("pointers: %s", (_name, axis, hasMoved, steps, done) => {
  const element = target();
  const pointers = new PanZoomPointers(element, actions, axis);
  for (const [what, pointerId, clientX, clientY] of steps) {
    const event = { pointerId, clientX, clientY, button: 0, isPrimary: pointerId === 1 };
    element.dispatchEvent(Object.assign(new Event(`pointer${what}`), event));
  }
  expect([log, pointers.hasMoved]).toEqual([done, hasMoved]);
});
