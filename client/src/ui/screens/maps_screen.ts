// SPDX-License-Identifier: Apache-2.0
//
// One e-map at a time: its picture with what is placed on it, its editor, and over it a camera that was opened there.

import type { Camera } from "../../wire/camera";
import { Emaps, type DeviceState, type EditedMap, type MapName, type ViewerItem, type ViewerMap } from "../../wire/emaps";
import { keepTrying } from "../../wire/keep_trying";
import { asServerError, type ServerError } from "../../wire/server";
import { CameraOverlay } from "../camera/camera_overlay";
import { MapCard } from "../map/map_card";
import { kEditorKeys, MapEditor } from "../map/map_editor";
import type { MapItemView } from "../map/map_item";
import { MapView } from "../map/map_view";
import { leaveMapCamera, openMap, replaceRoute, showMap } from "../route";
import { iconButton } from "../widgets/button";
import { element, setText } from "../widgets/dom";
import type { KeyList } from "../widgets/keys_dialog";
import { notify } from "../widgets/notice";
import { titleScreen } from "../widgets/title";
import { Screen } from "./screen";
import type { RememberedState, Session } from "./session";

const kRefreshMs = 500;
const kStatesIntervalMs = 3_000;
/** The host's own number for a map that does not exist or is denied; a web server whose host does not run has none. */
const kNoSuchMap = 502;

export class MapsScreen extends Screen {
  readonly #emaps = new Emaps(this.server);
  readonly #overlay = new CameraOverlay(this.server, this.root, this.front, { back: leaveMapCamera });
  readonly #card = new MapCard(this.server);
  readonly #view: MapView<ViewerItem>;
  readonly #stage = element("div", { class: "map-stage" });
  readonly #names = element("select", { class: "map-names input", "aria-label": "Map" });
  readonly #message = element("p", { class: "map-message", role: "status", hidden: true });
  readonly #tools: HTMLElement;
  readonly #edit: HTMLButtonElement;
  #maps: MapName[] = [];
  #cameras: Camera[] = [];
  #states: DeviceState[] = [];
  #map: { id: number; content: ViewerMap } | null = null;
  #editor: MapEditor | null = null;
  #loading = new AbortController();
  /** The user has agreed to lose the changes. */
  #discards = false;

  readonly #remembered: RememberedState;

  constructor(session: Session) {
    super("maps", session);
    this.#remembered = session.remembered;
    this.#view = new MapView<ViewerItem>({
      choose: (view, item) => this.#choose(view, item),
      point: (view) => this.#point(view),
    });
    this.#names.addEventListener("change", () => this.#chooseMap(Number(this.#names.value)));
    this.#edit = iconButton("edit", "Edit the map", () => void this.#openEditor(), "E");
    this.#edit.hidden = !session.account.is_manager;
    this.#tools = element(
      "div",
      { class: "segments" },
      iconButton("zoomOut", "Zoom out", () => this.#view.zoom(0.8), "-"),
      iconButton("zoomIn", "Zoom in", () => this.#view.zoom(1.25), "+"),
      iconButton("fit", "The whole map", () => this.#view.fit(), "0"),
      this.#edit,
    );
    this.addToBar(this.#names, element("span", { class: "bar-gap" }), this.#tools);
    this.#stage.append(this.#view.root, this.#card.root, this.#message);
    this.front.append(this.#stage);
    this.every(kRefreshMs, () => this.#overlay.refresh());
    this.every(kStatesIntervalMs, () => void this.#loadStates());
    this.every(kStatesIntervalMs, () => void (this.#overlay.camera && this.server.signalLosses.refresh()));
    void this.#start();
  }

  override close(): void {
    super.close();
    this.#loading.abort();
    this.#card.hide();
    // Nobody was asked: the session has ended.
    if (this.#editor?.isChanged && !this.#discards) this.#remembered.mapDraft = this.#editor.draft;
    this.#editor?.close();
    this.#overlay.close();
    this.#view.close();
  }

  /** Asks first where changes would be lost. */
  override canLeave(): boolean {
    if (!this.#editor?.isChanged) return true;
    return (this.#discards = confirm("Leave without saving your changes to this map?"));
  }

  followRoute(): boolean {
    if (this.#maps.length === 0) return true;
    if (openMap() === null) replaceRoute(this.#map?.id ?? this.#maps[0]!.id);
    const open = openMap()!;
    if (this.#map?.id === open.map) this.#showCamera(open.camera);
    else if (this.#leaveEditor()) void this.#goTo(open.map);
    else return false;
    return true;
  }

  protected get keys(): KeyList {
    if (this.#overlay.camera) return this.#overlay.keys;
    const move: KeyList = [
      ["Tab", "From item to item"],
      ["+ -", "Zoom in or out"],
      ["0", "The whole map"],
      ["Left Right Up Down", "Move the map"],
    ];
    if (!this.#editor) return this.#edit.hidden ? move : [...move, ["E", "Edit the map"]];
    return [...move.slice(0, 3), ...kEditorKeys];
  }

  protected pressKey(event: KeyboardEvent): boolean {
    const isDone = this.#overlay.pressKey(event);
    if (isDone !== undefined) return isDone;
    if (event.key === "Escape" && this.#card.isPinned) this.#card.hide();
    else if (event.key.toLowerCase() === "e" && !this.#edit.hidden && !this.#editor) void this.#openEditor();
    else return false;
    return true;
  }

  async #start(): Promise<void> {
    const ask = () => Promise.all([this.#emaps.list(), this.server.cameras()]);
    const answer = await keepTrying(ask, (sentence) => this.#showMessage(sentence), this.closed);
    if (!answer) return;
    const [maps, cameras] = answer;
    this.#maps = maps;
    this.#cameras = cameras.camera ?? [];
    this.#names.replaceChildren(...maps.map(({ id, name }) => element("option", { value: String(id) }, name)));
    this.#names.hidden = this.#tools.hidden = maps.length === 0;
    this.#showMessage(maps.length > 0 ? "" : "There are no maps yet. A manager adds one in the settings.");
    this.followRoute();
  }

  async #goTo(id: number): Promise<void> {
    await this.#load(id);
    const open = openMap();
    if (!this.closed.aborted && open?.map === id) this.#showCamera(open.camera);
  }

  async #load(id: number): Promise<void> {
    this.#loading.abort();
    const { signal } = (this.#loading = new AbortController());
    this.#card.hide();
    this.progress.hidden = false;
    this.#names.value = String(id);
    const ask = () =>
      this.#emaps.open(id).catch((error: ServerError) => {
        if (error.code === kNoSuchMap) return null;
        throw error;
      });
    const content = await keepTrying(ask, (sentence) => this.#showNothing(sentence), signal);
    if (content === undefined || openMap()?.map !== id) return;
    this.progress.hidden = true;
    if (!content) return this.#showNothing("This map does not exist, or you do not have permission to view it.");
    this.#map = { id, content };
    titleScreen(this.#maps.find((map) => map.id === id)?.name ?? "Maps");
    this.#states = [];
    this.#showMessage("");
    this.#view.showItems(content.items, content);
    this.#showStates();
    if (!(await this.#view.showPicture(content.picture))) this.#showMessage("The map's picture cannot be shown.");
    void this.#loadStates();
    const isEdited = openMap()?.isEdited ?? false;
    if (isEdited) replaceRoute(id);
    if (this.#remembered.mapDraft?.id === id || (isEdited && !this.#edit.hidden)) void this.#openEditor();
  }

  /** In place of a map. */
  #showNothing(sentence: string): void {
    this.#map = null;
    this.#view.showItems([], { hideNames: false, smallItems: false });
    void this.#view.showPicture(null);
    this.#showMessage(sentence);
  }

  async #loadStates(): Promise<void> {
    const map = this.#map;
    if (!map || this.#editor || document.hidden || this.closed.aborted) return;
    const states = await this.#emaps.states(map.id).catch(() => null);
    if (!states || this.#map !== map) return;
    this.#states = states;
    this.#showStates();
  }

  #showStates(): void {
    for (const view of this.#view.views) {
      const isDisabled = view.item.kind === "camera" && view.item.port < 0 && !this.#cameraOf(view);
      view.state = isDisabled ? "disabled" : (this.#stateOf(view)?.state ?? "");
    }
  }

  #stateOf({ item }: MapItemView): DeviceState | undefined {
    return this.#states.find(
      ({ kind, id, server, port }) =>
        kind === item.kind && id === item.id && server === item.server && (kind === "door" || port === item.port),
    );
  }

  /** Null where it has none, or none that the user may watch. */
  #cameraOf(view: MapItemView): Camera | null {
    const item = view.item as ViewerItem;
    const watching = this.#stateOf(view)?.camera ?? 0;
    const wanted = item.camera ?? (watching > 0 ? { id: watching, server: 0 } : null);
    return wanted && this.#find(wanted);
  }

  #find({ id, server }: Pick<Camera, "id" | "server">): Camera | null {
    if (!server) return this.#cameras.find((camera) => camera.id === id) ?? null;
    const item = this.#map?.content.items.find((one) => one.kind === "camera" && one.id === id && one.server === server);
    if (!item) return null;
    return { id, server, name: item.name, video_type: item.videoType, liveview_port: 0, cam_ptz: 0, sound_support: 1 };
  }

  #chooseMap(id: number): void {
    if (this.#leaveEditor()) showMap(id);
    else this.#names.value = String(this.#map?.id ?? "");
  }

  #choose(view: MapItemView, item: ViewerItem): void {
    const map = this.#map?.id ?? 0;
    if (item.kind === "emap") return showMap(item.id);
    const camera = this.#cameraOf(view);
    if (item.kind === "camera" && item.port < 0) {
      return camera ? showMap(map, camera) : notify(`${item.name} is disabled.`);
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
    this.#card.hide();
    this.#overlay.show(camera);
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
    if (this.#map !== map || this.#editor || this.closed.aborted) return;
    this.#card.hide();
    const draft = this.#remembered.mapDraft?.id === map.id ? this.#remembered.mapDraft : null;
    if (draft) notify("Your changes from before the session ended are here. They are not saved yet.");
    this.#remembered.mapDraft = null;
    this.#discards = false;
    this.#editor = new MapEditor(this.#emaps, edited, draft, map.content.picture, () => {
      if (this.#leaveEditor()) void this.#load(map.id);
    });
    this.#view.root.hidden = this.#tools.hidden = true;
    this.#stage.prepend(this.#editor.root);
  }

  /** False where the user would rather continue editing. */
  #leaveEditor(): boolean {
    if (!this.canLeave()) return false;
    this.#editor?.close();
    this.#editor = null;
    this.#view.root.hidden = this.#tools.hidden = false;
    return true;
  }

  #showMessage(sentence: string): void {
    this.progress.hidden = true;
    this.#message.hidden = sentence === "";
    setText(this.#message, sentence);
  }
}
