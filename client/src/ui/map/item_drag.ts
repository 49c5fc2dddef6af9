// SPDX-License-Identifier: Apache-2.0
//
// Moves an item of the map editor with the pointer.

import type { MapItem } from "../../wire/emaps";
import type { MapItemView } from "./map_item";
import type { MapView } from "./map_view";

/** The item follows the pointer; `onDrop` is called when it is released, moved or not. */
export function makeDraggable(view: MapItemView, map: MapView<MapItem>, onDrop: () => void): void {
  view.root.addEventListener("pointerdown", (event) => {
    if (event.button !== 0) return;
    // The map stays where it is.
    event.stopPropagation();
    view.root.setPointerCapture(event.pointerId);
    const before = view.item;
    const grip = map.pictureAt(event.clientX, event.clientY);
    const follow = ({ clientX, clientY }: PointerEvent) => {
      const now = map.pictureAt(clientX, clientY);
      view.show({ ...before, x: Math.max(0, before.x + now.x - grip.x), y: Math.max(0, before.y + now.y - grip.y) });
    };
    const end = () => {
      view.root.removeEventListener("pointermove", follow);
      onDrop();
    };
    view.root.addEventListener("pointermove", follow);
    view.root.addEventListener("lostpointercapture", end, { once: true });
  });
}
