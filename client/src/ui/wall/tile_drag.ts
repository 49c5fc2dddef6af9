// SPDX-License-Identifier: Apache-2.0
//
// How the pointer changes the order of the tiles.

/** A pointer that moved less than this has clicked. */
const kDragPx = 8;

/**
 * Lets the mouse drag the children of `grid` to other places; a finger scrolls instead. `moved` is called when one is
 * dropped elsewhere. The click at the end of a drag is ignored.
 */
export function dragToOrder(grid: HTMLElement, moved: () => void): void {
  grid.addEventListener("pointerdown", (pressed) => {
    const tile = (pressed.target as Element).closest<HTMLElement>(".tile");
    if (!tile || pressed.button !== 0 || pressed.pointerType === "touch") return;
    const before = [...grid.children];
    const end = new AbortController();
    const drag = (event: PointerEvent) => {
      const isDragged = tile.classList.contains("is-dragged");
      if (!isDragged && Math.hypot(event.clientX - pressed.clientX, event.clientY - pressed.clientY) < kDragPx) return;
      tile.classList.add("is-dragged");
      const over = document.elementFromPoint(event.clientX, event.clientY)?.closest(".tile");
      if (!over || over === tile || over.parentElement !== grid) return;
      const tiles = [...grid.children];
      if (tiles.indexOf(over) > tiles.indexOf(tile)) over.after(tile);
      else over.before(tile);
    };
    const drop = () => {
      end.abort();
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
