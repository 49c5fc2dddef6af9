// SPDX-License-Identifier: Apache-2.0
//
// One e-map at a time: its picture with what is placed on it, and over it a camera that was opened there.

import { Emaps, type DeviceState, type EditedMap, type MapName, type SeenItem, type SeenMap } from "../../wire/emaps";
import { asServerError, type Account, type Camera, type Server } from "../../wire/server";
import { iconButton } from "../widgets/button";
import { element, setText } from "../widgets/dom";
import { toggleFullScreen } from "../widgets/full_screen";
import { icon } from "../widgets/icons";
import { LargeView } from "../camera/large_view";
import { MapCard } from "../map/map_card";
import { MapEditor } from "../map/map_editor";
import type { MapItemView } from "../map/map_item";
import { MapView } from "../map/map_view";
import { navigation } from "./navigation";
import { notify } from "../widgets/notice";
import { leaveMapCamera, replaceRoute, openMap, showMap } from "./route";
import { logoutButton } from "./log_out";
import { SnapshotDialog } from "../camera/snapshot_dialog";
import { clockTime } from "../widgets/text";

const kTickMs = 500;
const kStatesEveryMs = 3_000;

export class MapsScreen {
  readonly root: HTMLElement;
  readonly #server: Server;
  readonly #emaps: Emaps;
  readonly #card: MapCard;
  readonly #view: MapView<SeenItem>;
  readonly #dialog: SnapshotDialog;
  readonly #front: HTMLElement;
  readonly #stage = element("div", { class: "map-stage" });
  readonly #names = element("select", { class: "map-names", "aria-label": "Map" });
  readonly #message = element("p", { class: "map-message", role: "status", hidden: true });
  readonly #clock = element("time", { class: "wall-clock" });
  readonly #progress = element("div", { class: "progress", role: "progressbar", "aria-label": "Loading" });
  readonly #tools: HTMLElement;
  readonly #edit: HTMLButtonElement;
  readonly #onRoute = () => void this.#followRoute();
  readonly #onKey = (event: KeyboardEvent) => this.#key(event);
  readonly #tick = setInterval(() => this.#refresh(), kTickMs);
  readonly #statesTimer = setInterval(() => void this.#loadStates(), kStatesEveryMs);
  #maps: MapName[] = [];
  #cameras: Camera[] = [];
  #states: DeviceState[] = [];
  #map: { id: number; seen: SeenMap } | null = null;
  #editor: MapEditor | null = null;
  #large: LargeView | null = null;
  #closed = false;

  constructor(server: Server, account: Account, onLogout: () => void) {
    this.#server = server;
    this.#emaps = new Emaps(server);
    this.#dialog = new SnapshotDialog(server);
    this.#card = new MapCard(server);
    this.#view = new MapView<SeenItem>({
      choose: (view, item) => this.#choose(view, item),
      point: (view) => this.#point(view),
    });
    this.#names.addEventListener("change", () => this.#leaveEditor(() => showMap(Number(this.#names.value))));
    this.#edit = iconButton("edit", "Edit the map", () => void this.#openEditor(), "E");
    this.#edit.hidden = !account.is_manager;
    this.#tools = element(
      "div",
      { class: "segments" },
      iconButton("zoomOut", "Zoom out", () => this.#view.zoom(0.8), "-"),
      iconButton("zoomIn", "Zoom in", () => this.#view.zoom(1.25), "+"),
      iconButton("fit", "The whole map", () => this.#view.fit(), "0"),
      this.#edit,
    );
    const busy = (isBusy: boolean) => (this.#progress.hidden = !isBusy);
    const bar = element(
      "header",
      { class: "bar" },
      element("div", { class: "brand" }, icon("lighthouse"), element("h1", {}, "Lookhaven")),
      navigation("maps"),
      this.#names,
      element("span", { class: "map-tools-gap" }),
      this.#tools,
      this.#clock,
      logoutButton(server, account, onLogout, busy),
    );
    this.#stage.append(this.#view.root, this.#card.root, this.#message);
    this.#front = element("div", { class: "wall maps" }, bar, this.#progress, this.#stage);
    this.root = element("main", { class: "screen" }, this.#front, this.#dialog.root);
    addEventListener("popstate", this.#onRoute);
    document.addEventListener("keydown", this.#onKey);
    this.#refresh();
    void this.#start();
  }

  close(): void {
    this.#closed = true;
    clearInterval(this.#tick);
    clearInterval(this.#statesTimer);
    removeEventListener("popstate", this.#onRoute);
    document.removeEventListener("keydown", this.#onKey);
    if (this.#dialog.isOpen) this.#dialog.root.close();
    this.#card.hide();
    this.#editor?.close();
    this.#large?.close();
    this.#view.close();
  }

  async #start(): Promise<void> {
    try {
      const [maps, cameras] = await Promise.all([this.#emaps.list(), this.#server.cameras()]);
      if (this.#closed) return;
      this.#maps = maps;
      this.#cameras = cameras.camera ?? [];
      this.#names.replaceChildren(...maps.map(({ id, name }) => element("option", { value: String(id) }, name)));
      this.#names.hidden = this.#tools.hidden = maps.length === 0;
      if (maps.length === 0) return this.#say("There are no maps yet. An administrator adds one with lookhaven emap add.");
      if (openMap() === null) replaceRoute(maps[0]!.id);
      await this.#followRoute();
    } catch (error) {
      this.#say(asServerError(error).message);
    }
  }

  async #followRoute(): Promise<void> {
    const open = openMap();
    if (!open || this.#maps.length === 0) return;
    if (this.#map?.id !== open.map) await this.#load(open.map);
    if (!this.#closed && openMap()?.map === open.map) this.#showCamera(openMap()?.camera ?? null);
  }

  async #load(id: number): Promise<void> {
    this.#card.hide();
    this.#closeEditor();
    this.#progress.hidden = false;
    this.#names.value = String(id);
    try {
      const seen = await this.#emaps.open(id);
      if (this.#closed || openMap()?.map !== id) return;
      this.#map = { id, seen };
      this.#states = [];
      this.#say("");
      this.#view.showItems(seen.items, seen);
      if (!(await this.#view.showPicture(seen.picture))) this.#say("The map's picture cannot be shown.");
      void this.#loadStates();
    } catch (error) {
      const { status, message } = asServerError(error);
      this.#map = null;
      this.#view.showItems([], { hideNames: false, smallItems: false });
      void this.#view.showPicture(null);
      this.#say(status === 502 ? "There is no such map, or you may not see it." : message);
    } finally {
      this.#progress.hidden = true;
    }
  }

  async #loadStates(): Promise<void> {
    const map = this.#map;
    if (!map || this.#editor || document.hidden || this.#closed) return;
    const states = await this.#emaps.states(map.id).catch(() => null);
    if (!states || this.#map !== map) return;
    this.#states = states;
    for (const view of this.#view.views) view.state = this.#stateOf(view)?.state ?? "";
  }

  #stateOf({ item }: MapItemView): DeviceState | undefined {
    return this.#states.find(
      ({ kind, id, server, port }) =>
        kind === item.kind && id === item.id && server === item.server && (kind === "door" || port === item.port),
    );
  }

  /** Null where it has none, or none that the user may watch. */
  #cameraOf(view: MapItemView): Camera | null {
    const item = view.item as SeenItem;
    const watching = this.#stateOf(view)?.camera ?? 0;
    const wanted = item.camera ?? (watching > 0 ? { id: watching, server: 0 } : null);
    return wanted && this.#find(wanted);
  }

  #find({ id, server }: Pick<Camera, "id" | "server">): Camera | null {
    if (!server) return this.#cameras.find((camera) => camera.id === id) ?? null;
    const item = this.#map?.seen.items.find((one) => one.kind === "camera" && one.id === id && one.server === server);
    if (!item) return null;
    return { id, server, name: item.name, video_type: item.videoType, liveview_port: 0, cam_ptz: 0, sound_support: 1 };
  }

  #choose(view: MapItemView, item: SeenItem): void {
    const map = this.#map?.id ?? 0;
    if (item.kind === "emap") return showMap(item.id);
    const camera = this.#cameraOf(view);
    if (item.kind === "camera" && item.port < 0) {
      return camera ? showMap(map, camera) : notify(`${item.name} is switched off.`);
    }
    const open = camera && (() => showMap(map, camera));
    this.#card.show(view, camera, this.#stateOf(view)?.since ?? 0, open);
  }

  #point(view: MapItemView | null): void {
    if (this.#card.isPinned) return;
    if (view) this.#card.show(view, this.#cameraOf(view), this.#stateOf(view)?.since ?? 0, null);
    else this.#card.hide();
  }

  #showCamera(wanted: Pick<Camera, "id" | "server"> | null): void {
    const camera = wanted && this.#find(wanted);
    if (wanted && !camera) return leaveMapCamera();
    const shown = this.#large?.camera;
    if (shown && camera && shown.id === camera.id && (shown.server ?? 0) === (camera.server ?? 0)) return;
    this.#large?.close();
    this.#large = null;
    this.#front.hidden = camera !== null;
    this.#card.hide();
    if (!camera) return;
    this.#large = new LargeView(camera, this.#server, {
      back: leaveMapCamera,
      step: () => undefined,
      snapshot: () => void this.#dialog.take(camera),
      fullScreen: toggleFullScreen,
    });
    this.#large.root.classList.add("from-map");
    this.root.prepend(this.#large.root);
    this.#large.focus();
  }

  async #openEditor(): Promise<void> {
    const map = this.#map;
    if (!map || this.#editor) return;
    let edited: EditedMap;
    try {
      edited = await this.#emaps.edit(map.id);
    } catch (error) {
      return notify(asServerError(error).message);
    }
    if (this.#map !== map || this.#editor || this.#closed) return;
    this.#card.hide();
    this.#editor = new MapEditor(this.#emaps, edited, map.seen.picture, () =>
      this.#leaveEditor(() => void this.#load(map.id)),
    );
    this.#view.root.hidden = this.#tools.hidden = true;
    this.#stage.prepend(this.#editor.root);
  }

  /** Asks first where something would be lost. */
  #leaveEditor(then: () => void): void {
    if (this.#editor?.isChanged && !confirm("Leave without saving your changes to this map?")) {
      this.#names.value = String(this.#map?.id ?? "");
      return;
    }
    this.#closeEditor();
    then();
  }

  #closeEditor(): void {
    this.#editor?.close();
    this.#editor = null;
    this.#view.root.hidden = this.#tools.hidden = false;
  }

  #say(sentence: string): void {
    this.#progress.hidden = true;
    this.#message.hidden = sentence === "";
    setText(this.#message, sentence);
  }

  #refresh(): void {
    this.#large?.refresh();
    setText(this.#clock, clockTime(Date.now()));
  }

  #key(event: KeyboardEvent): void {
    if (this.#dialog.isOpen || event.altKey || event.ctrlKey || event.metaKey || event.defaultPrevented) return;
    if (this.#large) {
      if (!this.#large.key(event)) return;
    } else if (event.key === "Escape" && this.#card.isPinned) this.#card.hide();
    else if (event.key.toLowerCase() === "e" && !this.#edit.hidden && !this.#editor) void this.#openEditor();
    else return;
    event.preventDefault();
  }
}
