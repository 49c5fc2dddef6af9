// SPDX-License-Identifier: Apache-2.0
//
// A list whose items the user puts in order: each has a handle that is dragged, or moved with Up and Down.

import { iconButton } from "./button";

/** A handle for `item`, a child of `list`. `moved` is called when the item has another place. */
export function orderHandle(list: HTMLElement, item: HTMLElement, name: string, moved: () => void): HTMLButtonElement {
  const handle = iconButton("grip", `Move ${name}`, () => undefined, "Up, Down");
  handle.classList.add("order-handle");
  const indexOf = (child: Element) => [...list.children].indexOf(child);
  handle.addEventListener("keydown", (event) => {
    if (event.key !== "ArrowUp" && event.key !== "ArrowDown") return;
    const isUp = event.key === "ArrowUp";
    const neighbour = isUp ? item.previousElementSibling : item.nextElementSibling;
    event.preventDefault();
    event.stopPropagation();
    if (!neighbour) return;
    // The neighbour moves, so that the item keeps the focus.
    if (isUp) item.after(neighbour);
    else item.before(neighbour);
    moved();
  });
  handle.addEventListener("pointerdown", (event) => {
    if (event.button !== 0) return;
    handle.setPointerCapture(event.pointerId);
    const before = [...list.children];
    item.classList.add("is-dragged");
    const drag = ({ clientY }: PointerEvent) => {
      const over = [...list.children].find((other) => {
        const { top, bottom } = other.getBoundingClientRect();
        return other !== item && clientY >= top && clientY < bottom;
      });
      if (!over) return;
      const isBelow = item.compareDocumentPosition(over) & Node.DOCUMENT_POSITION_FOLLOWING;
      const { top, bottom } = over.getBoundingClientRect();
      // Not before its middle, where the two would change places for ever.
      if (isBelow ? clientY < (top + bottom) / 2 : clientY > (top + bottom) / 2) return;
      // As above: an element that is moved itself would lose the pointer.
      const from = isBelow ? indexOf(item) + 1 : indexOf(over);
      const between = [...list.children].slice(from, isBelow ? indexOf(over) + 1 : indexOf(item));
      if (isBelow) item.before(...between);
      else item.after(...between);
    };
    const drop = () => {
      handle.removeEventListener("pointermove", drag);
      item.classList.remove("is-dragged");
      if (before.some((child, at) => child !== list.children[at])) moved();
    };
    handle.addEventListener("pointermove", drag);
    handle.addEventListener("lostpointercapture", drop, { once: true });
  });
  return handle;
}
