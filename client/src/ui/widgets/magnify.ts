// SPDX-License-Identifier: Apache-2.0
//
// Magnifies a picture with wheel, pinch and double click, and moves what is magnified.

import { panZoomByWheel, PanZoomPointers, type PanZoomActions, type Point } from "./pan_zoom";

const kMaxScale = 8;
const kDoubleClickScale = 2.5;

/**
 * `picture` fills `frame`, which hides what lies beyond it. A double click magnifies, and another shows the whole
 * again, unless `isTaken` returns true: then it was for something else.
 */
export function magnify(frame: HTMLElement, picture: HTMLElement, isTaken: () => boolean = () => false): void {
  let scale = 1;
  let offset: Point = { x: 0, y: 0 };
  const show = (x: number, y: number) => {
    const within = (at: number, sizePx: number) => Math.min(0, Math.max(sizePx * (1 - scale), at));
    offset = { x: within(x, frame.clientWidth), y: within(y, frame.clientHeight) };
    picture.style.transform = scale === 1 ? "" : `translate(${offset.x}px, ${offset.y}px) scale(${scale})`;
    frame.classList.toggle("is-magnified", scale > 1);
  };
  const actions: PanZoomActions = {
    pan: (xPx, yPx) => show(offset.x + xPx, offset.y + yPx),
    zoom: (factor, at) => {
      const before = scale;
      scale = Math.min(kMaxScale, Math.max(1, scale * factor));
      const growth = scale / before;
      show(at.x - (at.x - offset.x) * growth, at.y - (at.y - offset.y) * growth);
    },
  };
  panZoomByWheel(frame, actions);
  new PanZoomPointers(frame, actions, "both");
  frame.addEventListener("dblclick", (event) => {
    if ((event.target as Element).closest("button, a") || isTaken()) return;
    const { left, top } = frame.getBoundingClientRect();
    actions.zoom(scale > 1 ? 1 / scale : kDoubleClickScale, { x: event.clientX - left, y: event.clientY - top });
  });
}
