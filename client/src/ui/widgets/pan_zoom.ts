// SPDX-License-Identifier: Apache-2.0
//
// Panning and zooming with wheel, mouse and fingers, for whatever can do both.

export interface Point {
  x: number;
  y: number;
}

/** Distances are CSS pixels; points count from the corner of the element that is panned and zoomed. */
export interface PanZoomActions {
  /** The content moves with the pointer. */
  pan(xPx: number, yPx: number): void;
  /** What lies at the point stays there; a factor above 1 enlarges. */
  zoom(factor: number, at: Point): void;
}

const kWheelZoomPerPx = 0.0015;
/** A trackpad's pinch comes as a wheel with Ctrl, in smaller steps. */
const kPinchWheelFactor = 6;
/** Firefox says three lines for the notch of a wheel that is 120 pixels to others. */
const kLinePx = 40;
/** A pointer that moved less than this has clicked. */
const kClickPx = 5;
/** Closer than this, two fingers tell no distance. */
const kMinPinchPx = 10;

/** The wheel zooms; with Shift, or sideways, it pans. */
export function panZoomByWheel(target: HTMLElement, actions: PanZoomActions): void {
  const onWheel = (event: WheelEvent) => {
    event.preventDefault();
    const unitPx = event.deltaMode === WheelEvent.DOM_DELTA_LINE ? kLinePx : 1;
    const [x, y] = [event.deltaX * unitPx, event.deltaY * unitPx];
    if (event.shiftKey || Math.abs(x) > Math.abs(y)) return actions.pan(-(x || y), 0);
    const speed = kWheelZoomPerPx * (event.ctrlKey ? kPinchWheelFactor : 1);
    actions.zoom(Math.exp(-y * speed), pointIn(target, event));
  };
  target.addEventListener("wheel", onWheel, { passive: false });
}

/** One pointer pans, two fingers zoom and pan. */
export class PanZoomPointers {
  readonly #target: HTMLElement;
  readonly #actions: PanZoomActions;
  readonly #distance: (one: Point, other: Point) => number;
  readonly #pointers = new Map<number, Point>();
  #hasMoved = false;

  /** With `axis` "x" only the distance of the fingers from left to right counts. */
  constructor(target: HTMLElement, actions: PanZoomActions, axis: "x" | "both") {
    this.#target = target;
    this.#actions = actions;
    const measure = (x: number, y: number) => Math.max(kMinPinchPx, axis === "x" ? Math.abs(x) : Math.hypot(x, y));
    this.#distance = (one, other) => measure(one.x - other.x, one.y - other.y);
    target.addEventListener("pointerdown", (event) => this.#press(event));
    target.addEventListener("pointermove", (event) => this.#move(event));
    for (const end of ["pointerup", "pointercancel"] as const) {
      target.addEventListener(end, (event) => this.#pointers.delete(event.pointerId));
    }
  }

  get isPressed(): boolean {
    return this.#pointers.size > 0;
  }

  /** Whether the pointer has moved since it was pressed: then the click that follows is ignored. */
  get hasMoved(): boolean {
    return this.#hasMoved;
  }

  #press(event: PointerEvent): void {
    if (event.button !== 0) return;
    // The end of one that was released outside of the window was never reported.
    if (event.isPrimary) this.#pointers.clear();
    this.#hasMoved = this.#pointers.size > 0;
    this.#pointers.set(event.pointerId, pointIn(this.#target, event));
  }

  #move(event: PointerEvent): void {
    const before = this.#pointers.get(event.pointerId);
    if (!before) return;
    const now = pointIn(this.#target, event);
    const [x, y] = [now.x - before.x, now.y - before.y];
    if (!this.#hasMoved && Math.hypot(x, y) < kClickPx) return;
    // Not before it moves: a click belongs to what lies within the target.
    if (!this.#hasMoved) this.#target.setPointerCapture(event.pointerId);
    this.#hasMoved = true;
    this.#pointers.set(event.pointerId, now);
    const other = [...this.#pointers].find(([id]) => id !== event.pointerId)?.[1];
    if (!other) return this.#actions.pan(x, y);
    const centre = { x: (now.x + other.x) / 2, y: (now.y + other.y) / 2 };
    this.#actions.zoom(this.#distance(now, other) / this.#distance(before, other), centre);
    this.#actions.pan(x / 2, y / 2);
  }
}

function pointIn(target: HTMLElement, { clientX, clientY }: MouseEvent): Point {
  const box = target.getBoundingClientRect();
  return { x: clientX - box.left, y: clientY - box.top };
}
