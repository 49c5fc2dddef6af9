// SPDX-License-Identifier: Apache-2.0
//
// How the pointer changes the order of the tiles.

/** A pointer that moved less than this has clicked. */
const kDragPx = 8;
/** A finger that rests for so long drags; one that moves before scrolls. */
const kLongPressMs = 400;

/**
 * Lets the mouse, or a finger after a long press, drag the children of `grid` to other places. `moved` is called when
 * one is dropped elsewhere. The click at the end of a drag is ignored.
 */
export function dragToOrder(grid: HTMLElement, moved: () => void): void {
  // No scrolling, and no menu of a long press, while a tile is dragged.
  const suppress = (event: Event) => void (grid.querySelector(".is-dragged") && event.preventDefault());
  grid.addEventListener("touchmove", suppress, { passive: false });
  grid.addEventListener("contextmenu", suppress);
  grid.addEventListener("pointerdown", (pressed) => {
    const tile = (pressed.target as Element).closest<HTMLElement>(".tile");
    if (!tile || pressed.button !== 0 || !pressed.isPrimary) return;
    const isFinger = pressed.pointerType === "touch";
    const before = [...grid.children];
    const end = new AbortController();
    const lift = () => tile.classList.add("is-dragged");
    const pressing = isFinger ? setTimeout(lift, kLongPressMs) : undefined;
    const drag = (event: PointerEvent) => {
      if (event.pointerId !== pressed.pointerId) return;
      const isDragged = tile.classList.contains("is-dragged");
      if (!isDragged && Math.hypot(event.clientX - pressed.clientX, event.clientY - pressed.clientY) < kDragPx) return;
      if (!isDragged && isFinger) return drop();
      lift();
      const over = document.elementFromPoint(event.clientX, event.clientY)?.closest(".tile");
      if (!over || over === tile || over.parentElement !== grid) return;
      const tiles = [...grid.children];
      if (tiles.indexOf(over) > tiles.indexOf(tile)) over.after(tile);
      else over.before(tile);
    };
    const drop = (event?: Event) => {
      if (event instanceof PointerEvent && event.pointerId !== pressed.pointerId) return;
      end.abort();
      clearTimeout(pressing);
      if (!tile.classList.contains("is-dragged")) return;
      tile.classList.remove("is-dragged");
      const swallow = (click: Event) => {
        click.preventDefault();
        click.stopPropagation();
      };
      addEventListener("click", swallow, { capture: true, once: true });
      setTimeout(() => removeEventListener("click", swallow, { capture: true }));
      if ([...grid.children].some((child, at) => child !== before[at])) moved();
    };
    addEventListener("pointermove", drag, { signal: end.signal });
    for (const type of ["pointerup", "pointercancel", "blur"]) addEventListener(type, drop, { signal: end.signal });
  });
}
