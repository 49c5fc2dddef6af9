// SPDX-License-Identifier: Apache-2.0
//
// The wall: the live pictures of all cameras.

import { missingDecoder } from "../../live/unplayable";
import { Recordings, type CameraGroup } from "../../wire/recordings";
import { kVideoTypeMjpeg, ServerError, type Camera, type CameraList } from "../../wire/server";
import { CameraOverlay } from "../camera/camera_overlay";
import { unplayableHint } from "../camera/unplayable_hint";
import type { AbsentCameras } from "../wall/absent_cameras";
import { Grid } from "../wall/grid";
import { GroupTabs } from "../wall/group_tabs";
import { layoutPicker } from "../wall/layout_picker";
import { element, setText } from "../widgets/dom";
import { fullScreenButton, toggleFullScreen } from "../widgets/full_screen";
import { icon, type IconName } from "../widgets/icons";
import type { KeyList } from "../widgets/keys_dialog";
import { keepTrying } from "./keep_trying";
import { openCamera, openGroup, settingsAddress, showCamera, showWall } from "./route";
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
  /** All of the account. */
  #cameras: Camera[] | null = null;
  /** Null until they are known. */
  #groups: CameraGroup[] | null = null;
  /** The group that the address named last: it stays under a camera that is open. */
  #group: number | null = openGroup();
  /** Why the list of cameras is not up to date; empty when it is. */
  #error = "";

  constructor(session: Session) {
    super("wall", session);
    this.#recordings = new Recordings(this.server);
    this.#absent = session.remembered.absentCameras;
    const actions = { back: showWall, step: (by: 1 | -1) => this.#step(by) };
    this.#overlay = new CameraOverlay(this.server, this.root, this.front, actions);
    this.#grid = new Grid(this.server, this.preferences, {
      open: (camera) => showCamera(camera.id),
      snapshot: (camera) => this.#overlay.takeSnapshot(camera),
      dismiss: ({ id }) => {
        this.#absent.dismiss(id);
        this.#showTiles();
      },
    });
    const layouts = layoutPicker(this.preferences, (choice) => this.#grid.setLayout(choice));
    this.addToBar(this.#status, layouts, fullScreenButton());
    this.front.append(this.#tabs.root, this.#advice, this.#message, this.#grid.root);
    const loadUnlessHidden = () => void (document.hidden || this.#load());
    document.addEventListener("visibilitychange", loadUnlessHidden, { signal: this.closed });
    this.every(kListIntervalMs, loadUnlessHidden);
    this.every(kRefreshMs, () => this.#refresh());
    this.every(kSignalLossesIntervalMs, () => void (document.hidden || this.server.signalLosses.refresh()));
    this.#refresh();
    void this.#start();
  }

  override close(): void {
    super.close();
    this.#overlay.close();
    this.#grid.close();
  }

  followRoute(): boolean {
    if (openCamera() === null && openGroup() !== this.#group) {
      this.#group = openGroup();
      this.#showTiles();
      this.#refresh();
    }
    const camera = this.#cameras?.find(({ id }) => id === openCamera()) ?? null;
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
    ];
  }

  protected pressKey(event: KeyboardEvent): boolean {
    const isDone = this.#overlay.pressKey(event);
    if (isDone !== undefined) return isDone;
    if (event.key.toLowerCase() === "f") {
      toggleFullScreen();
      return true;
    }
    const camera = this.#grid.currentTile()?.camera;
    if (event.key.toLowerCase() !== "s" || !camera) return false;
    this.#overlay.takeSnapshot(camera);
    return true;
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
    if (!this.#cameras) return;
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

  /** Where they cannot be had, those of before stay: no camera is missed for it. */
  async #loadGroups(): Promise<void> {
    this.#groups = await this.#recordings.groups().catch(() => this.#groups);
  }

  #showList(list: CameraList): void {
    this.#cameras = list.camera ?? [];
    this.#absent.update(list);
    this.#showTiles();
    if (this.#cameras.length + this.#absent.all.length === 0) this.#showWhyEmpty(list);
    this.#showAdvice(this.#cameras.some(({ video_type }) => video_type !== kVideoTypeMjpeg));
    this.followRoute();
  }

  #showWhyEmpty(list: CameraList): void {
    if (list.CamNum > 0) this.#showMessage("camera", "No camera is enabled.", ...settingsLink(list, "Enable one"));
    else if (list.isManager) this.#showMessage("camera", "There are no cameras yet.", ...settingsLink(list, "Add one"));
    else this.#showMessage("camera", "You do not have permission to view any camera yet. Ask a manager for it.");
  }

  #showTiles(): void {
    const absent = this.#absent.all.filter(({ camera }) => this.#isInGroup(camera));
    this.#grid.setCameras(this.#shown, absent);
    const listed = new Set([...(this.#cameras ?? []), ...this.#absent.all.map(({ camera }) => camera)].map(({ id }) => id));
    const groups = (this.#groups ?? []).filter(({ id, live }) => id === this.#group || live.some((one) => listed.has(one)));
    this.#tabs.show(groups, this.#group);
    if (listed.size > 0) this.#showGroupMessage();
  }

  /** The cameras on the wall. */
  get #shown(): Camera[] {
    return (this.#cameras ?? []).filter((camera) => this.#isInGroup(camera));
  }

  #isInGroup({ id }: Camera): boolean {
    if (this.#group === null || this.#groups === null) return true;
    return this.#groups.find((one) => one.id === this.#group)?.live.includes(id) ?? false;
  }

  #showGroupMessage(): void {
    if (this.#grid.size > 0) return this.#message.replaceChildren();
    const all = element("a", { class: "button", href: "#" }, "Show all cameras");
    this.#showMessage("camera", "This group has no cameras that you may watch.", all);
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
    const lost = this.#grid.refresh();
    this.#overlay.refresh();
    const cameras = this.#shown.length;
    const counted = `${cameras} ${cameras === 1 ? "camera" : "cameras"}${lost > 0 ? ` · ${lost} without signal` : ""}`;
    setText(this.#status, this.#cameras === null ? "" : this.#error || counted);
    this.#status.classList.toggle("alarm", this.#error !== "" || lost > 0);
  }

  #step(by: 1 | -1): void {
    const cameras = this.#shown;
    const at = cameras.findIndex(({ id }) => id === this.#overlay.camera?.id);
    const next = cameras[(at + by + cameras.length) % cameras.length];
    if (next) showCamera(next.id);
  }
}

function settingsLink({ isManager }: CameraList, text: string): HTMLElement[] {
  return isManager ? [element("a", { class: "button", href: settingsAddress("cameras") }, text)] : [];
}
