// SPDX-License-Identifier: Apache-2.0
//
// The tiles of all cameras: arranges them, and lets those stream that are visible.
//
// Invariants    (1) A tile that nobody can see (scrolled away, behind the large view, in a hidden tab) has no
//               connection.
//               (2) Never more tiles stream than the connection to the server carries.

import { chooseStreams, streamLimit } from "../../live/stream_budget";
import type { Camera } from "../../wire/camera";
import { protocol } from "../../wire/protocol";
import { Semaphore } from "../../wire/semaphore";
import type { Server } from "../../wire/server";
import { element } from "../widgets/dom";
import type { AbsentCamera } from "./absent_cameras";
import { arrange, type LayoutChoice } from "./layout";
import { Tile, type TileActions, type TileMode } from "./tile";
import { dragToOrder } from "./tile_drag";

/** Scrolling past a tile must not open and close a stream. */
const kDebounceMs = 120;
/** Drawn wider than this, a picture needs more pixels than the small profile has. */
const kMaxSmallPicturePx = 800;

/** A tile of which less is visible needs no picture. */
const kMinVisibleRatio = 0.1;

const kSteps: Record<string, (columns: number) => number> = {
  ArrowLeft: () => -1,
  ArrowRight: () => 1,
  ArrowUp: (columns) => -columns,
  ArrowDown: (columns) => columns,
};

/** The order of the tiles, and what is called when the user has changed it. */
export interface TileOrder {
  inOrder(cameras: readonly Camera[]): Camera[];
  /** `ids` are those of all tiles. */
  moved(ids: readonly number[]): void;
}

export class Grid {
  readonly root = element("div", { class: "grid" });
  readonly #server: Server;
  readonly #order: TileOrder;
  readonly #actions: TileActions;
  readonly #semaphore = new Semaphore(1);
  readonly #maxStreams: number;
  readonly #tiles = new Map<number, Tile>();
  readonly #visible = new Set<number>();
  readonly #observer: IntersectionObserver;
  readonly #resized = new ResizeObserver(() => this.#arrange());
  readonly #assignSoon = () => {
    clearTimeout(this.#debounce);
    this.#debounce = setTimeout(() => this.#assign(), kDebounceMs);
  };
  #debounce: ReturnType<typeof setTimeout> | undefined;
  #layout: LayoutChoice = "auto";
  #columns = 1;
  /** The ids of tiles that cannot play a stream, as text to compare. */
  #unplayable = "";

  constructor(server: Server, order: TileOrder, actions: TileActions) {
    this.#server = server;
    this.#order = order;
    this.#actions = actions;
    this.#maxStreams = streamLimit(protocol());
    this.#observer = new IntersectionObserver((entries) => this.#onIntersection(entries), {
      root: this.root,
      threshold: kMinVisibleRatio,
    });
    this.#resized.observe(this.root);
    document.addEventListener("visibilitychange", this.#assignSoon);
    this.root.addEventListener("keydown", (event) => this.#onKey(event));
    dragToOrder(this.root, () => this.#onMoved());
  }

  /** Shows these cameras, then those that are absent; tiles of cameras that stay play on without interruption. */
  setCameras(cameras: readonly Camera[], absent: readonly AbsentCamera[]): void {
    const all = [...this.#order.inOrder(cameras).map((camera) => ({ camera, reason: "" })), ...absent];
    const isUnchanged = (tile: Tile) => {
      return all.some(({ camera, reason }) => same(camera, tile.camera) && reason === tile.picture.absence);
    };
    for (const tile of [...this.#tiles.values()]) if (!isUnchanged(tile)) this.#remove(tile);
    for (const { camera, reason } of all) {
      if (this.#tiles.has(camera.id)) continue;
      const tile = new Tile(camera, reason, this.#server, this.#semaphore, this.#actions);
      this.#tiles.set(camera.id, tile);
      this.#observer.observe(tile.root);
    }
    const wanted = all.flatMap(({ camera }) => this.#tiles.get(camera.id) ?? []);
    // Moving a tile that is in its place already would take the focus from it.
    wanted.forEach((tile, index) => {
      if (this.root.children[index] !== tile.root) this.root.insertBefore(tile.root, this.root.children[index] ?? null);
    });
    this.#arrange();
  }

  setLayout(choice: LayoutChoice): void {
    this.#layout = choice;
    this.#arrange();
  }

  /** How many tiles there are. */
  get size(): number {
    return this.#tiles.size;
  }

  tile(cameraId: number): Tile | undefined {
    return this.#tiles.get(cameraId);
  }

  /** The tile in use: with the focus, else under the pointer. */
  currentTile(): Tile | undefined {
    const root = this.root.querySelector(".tile:focus-within") ?? this.root.querySelector(".tile:hover");
    return [...this.#tiles.values()].find((tile) => tile.root === root);
  }

  /** Brings all tiles up to date with the clock. */
  refresh(): void {
    const unplayable = this.#inOrder().flatMap((tile) => (tile.unplayable ? tile.camera.id : []));
    if (unplayable.join() !== this.#unplayable) this.#assignSoon();
    this.#unplayable = unplayable.join();
    for (const tile of this.#tiles.values()) tile.picture.refresh();
  }

  /** Closes all streams; do not use the grid after that. */
  close(): void {
    clearTimeout(this.#debounce);
    document.removeEventListener("visibilitychange", this.#assignSoon);
    this.#observer.disconnect();
    this.#resized.disconnect();
    for (const tile of this.#tiles.values()) tile.mode = "off";
  }

  #remove(tile: Tile): void {
    tile.mode = "off";
    this.#observer.unobserve(tile.root);
    this.#visible.delete(tile.camera.id);
    this.#tiles.delete(tile.camera.id);
    tile.root.remove();
  }

  #onIntersection(entries: IntersectionObserverEntry[]): void {
    for (const entry of entries) {
      const id = Number((entry.target as HTMLElement).dataset["camera"]);
      if (entry.intersectionRatio >= kMinVisibleRatio) this.#visible.add(id);
      else this.#visible.delete(id);
    }
    this.#assignSoon();
  }

  #assign(): void {
    const isShown = (tile: Tile) => this.#visible.has(tile.camera.id) && tile.picture.absence === "";
    const shown = document.hidden ? [] : this.#inOrder().filter(isShown);
    const playable = shown.filter((tile) => !tile.unplayable).map((tile) => tile.camera.id);
    const streaming = new Set(this.#inOrder().flatMap((tile) => (tile.isStreaming ? [tile.camera.id] : [])));
    const chosen = chooseStreams(playable, streaming, this.#maxStreams);
    for (const tile of this.#inOrder()) {
      const widthPx = tile.root.clientWidth * devicePixelRatio;
      const stream: TileMode = widthPx > kMaxSmallPicturePx ? "stream-full" : "stream-small";
      tile.mode = chosen.has(tile.camera.id) ? stream : shown.includes(tile) ? "poll" : "off";
    }
  }

  #inOrder(): Tile[] {
    return [...this.root.children].flatMap((child) => {
      return this.#tiles.get(Number((child as HTMLElement).dataset["camera"])) ?? [];
    });
  }

  #arrange(): void {
    if (this.root.clientWidth === 0) return;
    const style = getComputedStyle(this.root);
    const { columns, tilePx } = arrange(this.#tiles.size, this.#layout, {
      widthPx: this.root.clientWidth - 2 * parseFloat(style.paddingLeft),
      heightPx: this.root.clientHeight - 2 * parseFloat(style.paddingTop),
      gapPx: parseFloat(style.columnGap),
      barPx: parseFloat(style.getPropertyValue("--tile-bar")),
    });
    this.#columns = columns;
    this.root.dataset["columns"] = String(columns);
    this.root.dataset["layout"] = this.#layout;
    this.root.style.setProperty("--columns", String(columns));
    this.root.style.setProperty("--tile-width", `${tilePx}px`);
    this.#assignSoon();
  }

  #onKey(event: KeyboardEvent): void {
    const step = kSteps[event.key];
    const current = this.currentTile();
    if (!step || !current || event.altKey || event.ctrlKey || event.metaKey) return;
    event.preventDefault();
    const tiles = this.#inOrder();
    const other = tiles[tiles.indexOf(current) + step(this.#columns)];
    if (!event.shiftKey) return other?.focus();
    if (!other) return;
    if (step(this.#columns) > 0) other.root.after(current.root);
    else other.root.before(current.root);
    current.focus();
    this.#onMoved();
  }

  #onMoved(): void {
    this.#order.moved(this.#inOrder().map(({ camera }) => camera.id));
    this.#assignSoon();
  }
}

function same(one: Camera, other: Camera): boolean {
  return one.id === other.id && one.name === other.name && one.video_type === other.video_type;
}
