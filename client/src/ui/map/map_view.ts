// SPDX-License-Identifier: Apache-2.0
//
// A map's picture with its items, zoomed and panned with wheel, fingers and keys.
//
// Why so        Items keep their size whatever the zoom, so they lie over the picture and not in it. Where each one
//               lies is left to the style sheet, which gets three numbers for each zoom or pan, however many items
//               there are.

import type { MapFlags, MapItem } from "../../wire/emaps";
import { element } from "../widgets/dom";
import { panZoomByWheel, PanZoomPointers, type PanZoomActions, type Point } from "../widgets/pan_zoom";
import { MapItemView } from "./map_item";

const kMaxScale = 8;
const kKeyStepPx = 60;
const kKeyZoom = 1.25;
/** Below this zoom names would lie over each other. */
const kNamesFromScale = 0.5;
/** For a picture without a size of its own, and where there is no picture. */
const kFallbackSize = { width: 1200, height: 800 };

export interface MapViewActions<Item extends MapItem> {
  /** A click, a tap, Enter or Space. */
  choose(view: MapItemView, item: Item): void;
  /** Pointer or focus came to the item, or left it (null). */
  point(view: MapItemView | null): void;
}

export class MapView<Item extends MapItem> {
  readonly root = element("div", { class: "map", tabindex: "0", role: "group", "aria-label": "Map" });
  readonly #plane = element("div", { class: "map-plane" });
  readonly #image = element("img", { class: "map-picture", alt: "", draggable: "false" });
  readonly #items = element("div", { class: "map-items" });
  readonly #actions: MapViewActions<Item>;
  readonly #resize = new ResizeObserver(() => this.#keepWithin());
  readonly #pointers: PanZoomPointers;
  #views: MapItemView[] = [];
  #url = "";
  #size = kFallbackSize;
  #scale = 1;
  #offset: Point = { x: 0, y: 0 };
  #isFitted = true;

  constructor(actions: MapViewActions<Item>) {
    this.#actions = actions;
    this.#plane.append(this.#image);
    this.root.append(this.#plane, this.#items);
    const panZoom: PanZoomActions = {
      pan: (xPx, yPx) => this.#pan(xPx, yPx),
      zoom: (factor, at) => this.#zoomAt(at, factor),
    };
    panZoomByWheel(this.root, panZoom);
    this.#pointers = new PanZoomPointers(this.root, panZoom, "both");
    this.root.addEventListener("keydown", (event) => this.#pressKey(event));
    this.#resize.observe(this.root);
  }

  get views(): readonly MapItemView[] {
    return this.#views;
  }

  /** Resolves when the picture is shown (true), or cannot be (false). */
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
      // The end of a drag is no click; a key (detail 0) always is one.
      view.root.addEventListener("click", ({ detail }) => {
        if (!this.#pointers.hasMoved || detail === 0) this.#actions.choose(view, view.item as Item);
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
    this.#isFitted = true;
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
    const clamp = (value: number, max: number) => Math.round(Math.min(Math.max(value, 0), max));
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
    const min = this.#fitScale();
    const scale = Math.min(Math.max(this.#scale * by, min), Math.max(kMaxScale, min));
    const growth = scale / this.#scale;
    this.#offset = { x: at.x - (at.x - this.#offset.x) * growth, y: at.y - (at.y - this.#offset.y) * growth };
    this.#scale = scale;
    this.#isFitted = scale <= min;
    this.#keepWithin();
  }

  #pan(x: number, y: number): void {
    this.#offset = { x: this.#offset.x + x, y: this.#offset.y + y };
    this.#keepWithin();
  }

  /** The picture stays in the window: in the middle where it is smaller, without a gap where it is larger. */
  #keepWithin(): void {
    if (this.#isFitted) return this.fit();
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

  #pressKey(event: KeyboardEvent): void {
    if (event.defaultPrevented || event.altKey || event.ctrlKey || event.metaKey) return;
    const steps: Record<string, [number, number]> = {
      ArrowLeft: [kKeyStepPx, 0],
      ArrowRight: [-kKeyStepPx, 0],
      ArrowUp: [0, kKeyStepPx],
      ArrowDown: [0, -kKeyStepPx],
    };
    const step = steps[event.key];
    if (step) this.#pan(...step);
    else if (event.key === "+" || event.key === "=") this.zoom(kKeyZoom);
    else if (event.key === "-") this.zoom(1 / kKeyZoom);
    else if (event.key === "0") this.fit();
    else return;
    event.preventDefault();
  }
}
