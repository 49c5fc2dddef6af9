// SPDX-License-Identifier: Apache-2.0
//
// The wall: the live pictures of all cameras, of a group, or of a saved layout.

import { missingDecoder } from "../../live/unplayable";
import { kVideoTypeMjpeg, type Camera, type CameraList } from "../../wire/camera";
import { keepTrying } from "../../wire/keep_trying";
import { Recordings } from "../../wire/recordings";
import { ServerError } from "../../wire/server";
import { CameraOverlay } from "../camera/camera_overlay";
import { unplayableHint } from "../camera/unplayable_hint";
import { openCamera, openWall, settingsAddress, showCamera, showWall } from "../route";
import type { AbsentCameras } from "../wall/absent_cameras";
import { Grid } from "../wall/grid";
import { GroupTabs } from "../wall/group_tabs";
import type { LayoutChoice } from "../wall/layout";
import { LayoutPicker } from "../wall/layout_picker";
import { SequenceBar } from "../wall/sequence_bar";
import { WallContents } from "../wall/wall_contents";
import { WallMenu } from "../wall/wall_menu";
import { element, setText } from "../widgets/dom";
import { fullScreenButton, toggleFullScreen } from "../widgets/full_screen";
import { icon, type IconName } from "../widgets/icons";
import type { KeyList } from "../widgets/keys_dialog";
import { Screen } from "./screen";
import type { Session } from "./session";

const kRefreshMs = 500;
/** Cameras come and go seldom. */
const kListIntervalMs = 30_000;
const kSignalLossesIntervalMs = 5_000;

export class WallScreen extends Screen {
  readonly #grid: Grid;
  readonly #overlay: CameraOverlay;
  readonly #status = element("p", { class: "bar-status" });
  readonly #absent: AbsentCameras;
  readonly #message = element("div", { class: "wall-message" });
  readonly #advice = element("p", { class: "wall-advice", role: "note", hidden: true });
  readonly #tabs = new GroupTabs();
  readonly #recordings: Recordings;
  readonly #contents: WallContents;
  readonly #picker = new LayoutPicker((choice) => this.#chooseGrid(choice));
  readonly #sequence = new SequenceBar();
  readonly #menu: WallMenu;
  /** Why the list of cameras is not up to date; empty when it is. */
  #error = "";

  constructor(session: Session) {
    super("wall", session);
    this.#recordings = new Recordings(this.server);
    this.#absent = session.remembered.absentCameras;
    const actions = { back: showWall, step: (by: 1 | -1) => this.#step(by) };
    this.#overlay = new CameraOverlay(this.server, this.root, this.front, actions);
    const changed = () => void (this.closed.aborted || this.#showTiles());
    this.#contents = new WallContents(this.preferences, openWall(), changed);
    const { arrangement, saved } = this.#contents;
    this.#grid = new Grid(this.server, arrangement, {
      open: (camera) => showCamera(camera.id),
      snapshot: (camera) => this.#snapshot(camera),
      dismiss: ({ id }) => {
        this.#absent.dismiss(id);
        this.#showTiles();
      },
    });
    this.#menu = new WallMenu(saved, {
      wall: () => ({ grid: arrangement.grid, cameras: arrangement.idsOf(this.#contents.shown) }),
      cameras: () => arrangement.inOrder(this.#contents.cameras ?? []),
      open: () => this.#contents.open,
      reopen: () => this.#contents.reopen(),
    });
    this.addToBar(this.#status, this.#picker.root, this.#menu.button, fullScreenButton());
    this.front.append(this.#tabs.root, this.#sequence.root, this.#advice, this.#message, this.#grid.root);
    this.root.append(this.#menu.root);
    this.#picker.show(arrangement.grid);
    // A user who touches a tile wants to see more of what is there.
    for (const type of ["pointerdown", "focusin"]) this.#grid.root.addEventListener(type, () => this.#pause());
    const loadUnlessHidden = () => void (document.hidden || this.#load());
    const followVisibility = () => {
      this.#contents.isHidden = document.hidden;
      loadUnlessHidden();
    };
    document.addEventListener("visibilitychange", followVisibility, { signal: this.closed });
    this.every(kListIntervalMs, loadUnlessHidden);
    this.every(kRefreshMs, () => this.#refresh());
    this.every(kSignalLossesIntervalMs, () => void (document.hidden || this.server.signalLosses.refresh()));
    this.#refresh();
    void this.#start();
  }

  override close(): void {
    super.close();
    this.#overlay.close();
    this.#contents.close();
    this.#grid.close();
  }

  followRoute(): boolean {
    // What is shown stays under a camera that is open.
    if (openCamera() === null) this.#open();
    else this.#pause();
    const camera = this.#contents.cameras?.find(({ id }) => id === openCamera()) ?? null;
    const left = camera ? null : this.#overlay.camera;
    this.#overlay.show(camera, camera ? this.#grid.tile(camera.id)?.picture : undefined);
    if (left) this.#grid.tile(left.id)?.focus();
    return true;
  }

  protected get keys(): KeyList {
    if (this.#overlay.camera) return this.#overlay.keys;
    return [
      ["Left Right Up Down", "From camera to camera; with Shift the camera moves along"],
      ["Enter", "Open the camera large"],
      ["S", "Snapshot of the camera"],
      ["F", "Full screen"],
      ["L", "Saved layouts and sequences"],
      ["Space", "Pause or continue the sequence"],
      ["P N", "The sequence's layout before or after"],
    ];
  }

  protected pressKey(event: KeyboardEvent): boolean {
    const isDone = this.#overlay.pressKey(event);
    if (isDone !== undefined) return isDone;
    const key = event.key.toLowerCase();
    const { run } = this.#contents;
    if (key === "f") toggleFullScreen();
    else if (key === "l") void this.#menu.show();
    else if (key === " " && run) this.#sequence.toggle();
    else if ((key === "n" || key === "p") && run) run.step(key === "n" ? 1 : -1);
    else return key === "s" && this.#takeSnapshot();
    return true;
  }

  #takeSnapshot(): boolean {
    const camera = this.#grid.currentTile()?.camera;
    if (camera) this.#snapshot(camera);
    return camera !== undefined;
  }

  #snapshot(camera: Camera): void {
    this.#pause();
    this.#overlay.takeSnapshot(camera);
  }

  async #start(): Promise<void> {
    void this.server.signalLosses.refresh();
    const failed = (sentence: string) => this.#showMessage("warning", sentence);
    const groups = this.#loadGroups();
    const list = await keepTrying(() => this.server.cameras(), failed, this.closed);
    await groups;
    if (!list) return;
    this.progress.hidden = true;
    this.#showList(list);
    this.#refresh();
  }

  /** Brings the list up to date. */
  async #load(): Promise<void> {
    if (!this.#contents.cameras) return;
    const [list] = await Promise.all([
      this.server.cameras().catch((error: ServerError) => error),
      this.server.signalLosses.refresh(),
      this.#loadGroups(),
    ]);
    if (this.closed.aborted) return;
    this.#error = list instanceof ServerError ? list.message : "";
    if (!(list instanceof ServerError)) this.#showList(list);
    this.#refresh();
  }

  /** Where they cannot be fetched, those fetched before stay, so no camera is reported as missing. */
  async #loadGroups(): Promise<void> {
    this.#contents.groups = await this.#recordings.groups().catch(() => this.#contents.groups);
  }

  #showList(list: CameraList): void {
    const cameras = list.camera ?? [];
    this.#contents.cameras = cameras;
    this.#absent.update(list);
    this.#update();
    if (cameras.length + this.#absent.all.length === 0) this.#showWhyEmpty(list);
    this.#showAdvice(cameras.some(({ video_type }) => video_type !== kVideoTypeMjpeg));
    this.followRoute();
  }

  #showWhyEmpty(list: CameraList): void {
    if (list.CamNum > 0) this.#showMessage("camera", "No camera is enabled.", ...settingsLink(list, "Enable one"));
    else if (list.isManager) this.#showMessage("camera", "There are no cameras yet.", ...settingsLink(list, "Add one"));
    else this.#showMessage("camera", "You do not have permission to view any camera yet. Ask a manager for it.");
  }

  /** Shows what the address names. */
  #open(): void {
    const [open, { group, layout, sequence }] = [openWall(), this.#contents.open];
    if (open.group === group && open.layout === layout && open.sequence === sequence) return;
    this.#contents.open = open;
    this.#update();
    // It may have been saved in another tab, and its link opened here.
    const isThere = (open.layout === null && open.sequence === null) || this.#grid.size > 0;
    if (!isThere) void this.#contents.saved.refresh();
  }

  /** Shows what cameras, groups, layouts and sequences are now. */
  #update(): void {
    this.#contents.update();
    this.#showTiles();
    this.#refresh();
  }

  #showTiles(): void {
    const { arrangement, cameras, groups, open, run, shown } = this.#contents;
    this.#picker.show(arrangement.grid);
    this.#grid.setLayout(arrangement.grid);
    this.#grid.setCameras(shown, this.#absent.all.filter(({ camera }) => this.#contents.isShown(camera)));
    const listed = new Set([...(cameras ?? []), ...this.#absent.all.map(({ camera }) => camera)].map(({ id }) => id));
    const some = (groups ?? []).filter(({ id, live }) => id === open.group || live.some((one) => listed.has(one)));
    const layout = open.layout === null ? null : arrangement.layout;
    this.#tabs.show(some, open, layout ? `${layout.name}${arrangement.isChanged ? " (changed)" : ""}` : "");
    this.#sequence.show(run);
    this.#menu.update();
    if (listed.size > 0) this.#showEmptyMessage();
  }

  #chooseGrid(choice: LayoutChoice): void {
    this.#contents.arrangement.chooseGrid(choice);
    this.#pause();
    this.#showTiles();
  }

  #pause(): void {
    if (this.#contents.run) this.#contents.run.isPaused = true;
  }

  #showEmptyMessage(): void {
    if (this.#grid.size > 0) return this.#message.replaceChildren();
    const all = element("a", { class: "button", href: "#" }, "Show all cameras");
    this.#showMessage("camera", this.#contents.whyEmpty, all);
  }

  /** Where the page came over plain HTTP, it can do less than over HTTPS. */
  #showAdvice(needsDecoder: boolean): void {
    const missing = needsDecoder ? missingDecoder() : null;
    this.#advice.hidden = !missing;
    if (missing && !this.#advice.hasChildNodes()) this.#advice.append(...unplayableHint(missing));
  }

  #showMessage(name: IconName, sentence: string, ...links: HTMLElement[]): void {
    this.#message.replaceChildren(icon(name), element("p", { role: "status" }, sentence), ...links);
  }

  #refresh(): void {
    this.#grid.refresh();
    this.#overlay.refresh();
    const { cameras, shown } = this.#contents;
    const lost = (cameras ?? []).filter((camera) => this.#isLost(camera));
    setText(this.#status, cameras === null ? "" : this.#error || countText(shown.length, cameras.length, lost.length));
    this.#status.title = lost.length > 0 ? `Without signal: ${lost.map(({ name }) => name).join(", ")}` : "";
    this.#status.classList.toggle("alarm", this.#error !== "" || lost.length > 0);
  }

  /** As its tile knows it; for a tile out of sight, which has no stream, as the recorder reports it. */
  #isLost(camera: Camera): boolean {
    const state = this.#grid.tile(camera.id)?.picture.state() ?? { kind: "idle" };
    return state.kind === "lost" || (state.kind === "idle" && this.server.signalLosses.of(camera) !== null);
  }

  #step(by: 1 | -1): void {
    const { arrangement, shown } = this.#contents;
    const cameras = arrangement.inOrder(shown);
    const at = cameras.findIndex(({ id }) => id === this.#overlay.camera?.id);
    const next = cameras[(at + by + cameras.length) % cameras.length];
    if (next) showCamera(next.id);
  }
}

/** All cameras without signal that the account may see; a group or a layout shows some of them. */
function countText(shown: number, all: number, lost: number): string {
  const cameras = `${shown === all ? "" : `${shown} of `}${all} ${all === 1 ? "camera" : "cameras"}`;
  return lost > 0 ? `${cameras} · ${lost} without signal` : cameras;
}

function settingsLink({ isManager }: CameraList, text: string): HTMLElement[] {
  return isManager ? [element("a", { class: "button", href: settingsAddress("cameras") }, text)] : [];
}
