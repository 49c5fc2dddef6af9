// SPDX-License-Identifier: Apache-2.0
//
// A map's picture with its items, to be zoomed and moved with wheel, fingers and keys.
//
// Why so        Items keep their size whatever the zoom, so they lie over the picture and not in it. Where each one lies is
//               left to the style sheet: of a zoom or a move it gets three numbers, however many items there are.

import type { MapFlags, MapItem } from "../../wire/emaps";
import { element } from "../widgets/dom";
import { MapItemView } from "./map_item";

const kMostZoom = 8;
const kKeyStepPx = 60;
const kKeyZoom = 1.25;
/** A finger that moved less than this has tapped. */
const kTapPx = 5;
/** Below this zoom names would lie over each other. */
const kNamesFromScale = 0.5;
/** A picture that names no size of its own, and the plane where there is none. */
const kFallbackSize = { width: 1200, height: 800 };

export interface MapViewActions<Item extends MapItem> {
  /** A click, a tap or the Enter key. */
  choose(view: MapItemView, item: Item): void;
  /** Pointer or focus came to the item, or left it (null). */
  point(view: MapItemView | null): void;
}

interface Point {
  x: number;
  y: number;
}

export class MapView<Item extends MapItem> {
  readonly root = element("div", { class: "map", tabindex: "0", role: "group", "aria-label": "Map" });
  readonly #plane = element("div", { class: "map-plane" });
  readonly #image = element("img", { class: "map-picture", alt: "", draggable: "false" });
  readonly #items = element("div", { class: "map-items" });
  readonly #actions: MapViewActions<Item>;
  readonly #resize = new ResizeObserver(() => this.#keepWithin());
  readonly #fingers = new Map<number, Point>();
  #views: MapItemView[] = [];
  #url = "";
  #size = kFallbackSize;
  #scale = 1;
  #offset: Point = { x: 0, y: 0 };
  #fitted = true;
  #moved = false;

  constructor(actions: MapViewActions<Item>) {
    this.#actions = actions;
    this.#plane.append(this.#image);
    this.root.append(this.#plane, this.#items);
    this.root.addEventListener("wheel", (event) => this.#wheel(event), { passive: false });
    this.root.addEventListener("pointerdown", (event) => this.#down(event));
    this.root.addEventListener("pointermove", (event) => this.#move(event));
    for (const end of ["pointerup", "pointercancel"] as const) {
      this.root.addEventListener(end, (event) => this.#fingers.delete(event.pointerId));
    }
    this.root.addEventListener("keydown", (event) => this.#key(event));
    this.#resize.observe(this.root);
  }

  get views(): readonly MapItemView[] {
    return this.#views;
  }

  /** Resolves when the picture is there, or turned out to be none (false). */
  async showPicture(picture: Blob | null): Promise<boolean> {
    URL.revokeObjectURL(this.#url);
    this.#url = picture ? URL.createObjectURL(picture) : "";
    this.#image.hidden = !picture;
    this.#size = kFallbackSize;
    let isThere = picture !== null;
    if (picture) {
      this.#image.src = this.#url;
      isThere = await this.#image.decode().then(
        () => true,
        () => false,
      );
      this.#image.hidden = !isThere;
      const { naturalWidth: width, naturalHeight: height } = this.#image;
      if (isThere && width > 0 && height > 0) this.#size = { width, height };
    }
    this.#image.style.width = `${this.#size.width}px`;
    this.#image.style.height = `${this.#size.height}px`;
    this.fit();
    return isThere;
  }

  showItems(items: readonly Item[], flags: MapFlags): void {
    this.root.classList.toggle("hides-names", flags.hideNames);
    this.root.classList.toggle("has-small-items", flags.smallItems);
    this.#views = items.map((item) => {
      const view = new MapItemView(item);
      // What ends a drag is no click; a key (detail 0) always is one.
      view.root.addEventListener("click", ({ detail }) => {
        if (!this.#moved || detail === 0) this.#actions.choose(view, view.item as Item);
      });
      view.root.addEventListener("pointerenter", (event) => event.pointerType === "mouse" && this.#actions.point(view));
      view.root.addEventListener("pointerleave", () => this.#actions.point(null));
      view.root.addEventListener("focus", () => {
        if (view.root.matches(":focus-visible")) this.#actions.point(view);
      });
      view.root.addEventListener("blur", () => this.#actions.point(null));
      return view;
    });
    this.#items.replaceChildren(...this.#views.map(({ root }) => root));
  }

  close(): void {
    this.#resize.disconnect();
    URL.revokeObjectURL(this.#url);
  }

  /** The whole picture, as large as it fits. */
  fit(): void {
    this.#fitted = true;
    this.#scale = this.#fitScale();
    const { clientWidth, clientHeight } = this.root;
    this.#offset = {
      x: (clientWidth - this.#size.width * this.#scale) / 2,
      y: (clientHeight - this.#size.height * this.#scale) / 2,
    };
    this.#place();
  }

  /** About the middle of the window. */
  zoom(by: number): void {
    this.#zoomAt({ x: this.root.clientWidth / 2, y: this.root.clientHeight / 2 }, by);
  }

  /** Where on the picture a point of the window lies, in whole pixels and within the picture. */
  pictureAt(clientX: number, clientY: number): Point {
    const box = this.root.getBoundingClientRect();
    const clamp = (value: number, most: number) => Math.round(Math.min(Math.max(value, 0), most));
    return {
      x: clamp((clientX - box.left - this.#offset.x) / this.#scale, this.#size.width),
      y: clamp((clientY - box.top - this.#offset.y) / this.#scale, this.#size.height),
    };
  }

  #fitScale(): number {
    const { clientWidth, clientHeight } = this.root;
    return Math.min(clientWidth / this.#size.width, clientHeight / this.#size.height) || 1;
  }

  #zoomAt(at: Point, by: number): void {
    const least = this.#fitScale();
    const scale = Math.min(Math.max(this.#scale * by, least), Math.max(kMostZoom, least));
    const grown = scale / this.#scale;
    this.#offset = { x: at.x - (at.x - this.#offset.x) * grown, y: at.y - (at.y - this.#offset.y) * grown };
    this.#scale = scale;
    this.#fitted = scale <= least;
    this.#keepWithin();
  }

  #shift(x: number, y: number): void {
    this.#offset = { x: this.#offset.x + x, y: this.#offset.y + y };
    this.#keepWithin();
  }

  /** The picture stays in the window: in the middle where it is smaller, without a gap where it is larger. */
  #keepWithin(): void {
    if (this.#fitted) return this.fit();
    const within = (offset: number, room: number, size: number) =>
      size <= room ? (room - size) / 2 : Math.min(0, Math.max(room - size, offset));
    this.#offset = {
      x: within(this.#offset.x, this.root.clientWidth, this.#size.width * this.#scale),
      y: within(this.#offset.y, this.root.clientHeight, this.#size.height * this.#scale),
    };
    this.#place();
  }

  #place(): void {
    const { x, y } = this.#offset;
    this.#plane.style.transform = `translate(${x}px, ${y}px) scale(${this.#scale})`;
    this.#items.style.setProperty("--scale", String(this.#scale));
    this.#items.style.setProperty("--left", `${x}px`);
    this.#items.style.setProperty("--top", `${y}px`);
    this.root.classList.toggle("is-far", this.#scale < kNamesFromScale);
  }

  #wheel(event: WheelEvent): void {
    event.preventDefault();
    const box = this.root.getBoundingClientRect();
    const lines = event.deltaMode === WheelEvent.DOM_DELTA_LINE ? 16 : 1;
    this.#zoomAt({ x: event.clientX - box.left, y: event.clientY - box.top }, Math.exp(-event.deltaY * lines * 0.0015));
  }

  #down(event: PointerEvent): void {
    if (event.button !== 0) return;
    // One that was let go outside of the window was never seen to end.
    if (event.isPrimary) this.#fingers.clear();
    this.#moved = this.#fingers.size > 0;
    this.#fingers.set(event.pointerId, { x: event.clientX, y: event.clientY });
  }

  #move(event: PointerEvent): void {
    const before = this.#fingers.get(event.pointerId);
    if (!before) return;
    if (!this.#moved && Math.hypot(event.clientX - before.x, event.clientY - before.y) < kTapPx) return;
    if (!this.#moved) this.root.setPointerCapture(event.pointerId);
    this.#moved = true;
    const other = [...this.#fingers].find(([id]) => id !== event.pointerId)?.[1];
    const now = { x: event.clientX, y: event.clientY };
    this.#fingers.set(event.pointerId, now);
    if (!other) return this.#shift(now.x - before.x, now.y - before.y);
    const box = this.root.getBoundingClientRect();
    const middle = { x: (now.x + other.x) / 2 - box.left, y: (now.y + other.y) / 2 - box.top };
    const apart = (one: Point) => Math.max(1, Math.hypot(one.x - other.x, one.y - other.y));
    this.#zoomAt(middle, apart(now) / apart(before));
    this.#shift((now.x - before.x) / 2, (now.y - before.y) / 2);
  }

  #key(event: KeyboardEvent): void {
    if (event.defaultPrevented || event.altKey || event.ctrlKey || event.metaKey) return;
    const steps: Record<string, [number, number]> = {
      ArrowLeft: [kKeyStepPx, 0],
      ArrowRight: [-kKeyStepPx, 0],
      ArrowUp: [0, kKeyStepPx],
      ArrowDown: [0, -kKeyStepPx],
    };
    const step = steps[event.key];
    if (step) this.#shift(...step);
    else if (event.key === "+" || event.key === "=") this.zoom(kKeyZoom);
    else if (event.key === "-") this.zoom(1 / kKeyZoom);
    else if (event.key === "0") this.fit();
    else return;
    event.preventDefault();
  }
}
