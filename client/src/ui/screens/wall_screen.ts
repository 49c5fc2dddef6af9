// SPDX-License-Identifier: Apache-2.0
//
// The wall: the live pictures of all cameras.

import { missingDecoder } from "../../live/unplayable";
import { kVideoTypeMjpeg, ServerError, type Camera, type CameraList } from "../../wire/server";
import { CameraOverlay } from "../camera/camera_overlay";
import { unplayableHint } from "../camera/unplayable_hint";
import { Grid } from "../wall/grid";
import { layoutPicker } from "../wall/layout_picker";
import { element, setText } from "../widgets/dom";
import { icon, type IconName } from "../widgets/icons";
import { openCamera, showCamera, showWall } from "./route";
import { Screen, type Session } from "./screen";

const kRefreshMs = 500;
/** Cameras come and go seldom. */
const kListIntervalMs = 30_000;
const kSignalLossesIntervalMs = 5_000;

export class WallScreen extends Screen {
  readonly #grid: Grid;
  readonly #overlay: CameraOverlay;
  readonly #status = element("p", { class: "bar-status" });
  readonly #message = element("div", { class: "wall-message" });
  readonly #advice = element("p", { class: "wall-advice", role: "note", hidden: true });
  #cameras: Camera[] | null = null;
  /** Why the list of cameras is not up to date; empty when it is. */
  #error = "";

  constructor(session: Session) {
    super("wall", session);
    const actions = { back: showWall, step: (by: 1 | -1) => this.#step(by) };
    this.#overlay = new CameraOverlay(this.server, this.root, this.front, actions);
    this.#grid = new Grid(this.server, {
      open: (camera) => showCamera(camera.id),
      snapshot: (camera) => this.#overlay.takeSnapshot(camera),
    });
    this.addToBar(this.#status, layoutPicker((choice) => this.#grid.setLayout(choice)));
    this.front.append(this.#advice, this.#message, this.#grid.root);
    const loadUnlessHidden = () => void (document.hidden || this.#load());
    document.addEventListener("visibilitychange", loadUnlessHidden, { signal: this.closed });
    this.every(kListIntervalMs, loadUnlessHidden);
    this.every(kRefreshMs, () => this.#refresh());
    this.every(kSignalLossesIntervalMs, () => void (document.hidden || this.server.signalLosses.refresh()));
    this.#refresh();
    void this.#load();
  }

  override close(): void {
    super.close();
    this.#overlay.close();
    this.#grid.close();
  }

  followRoute(): boolean {
    const camera = this.#cameras?.find(({ id }) => id === openCamera()) ?? null;
    const left = camera ? null : this.#overlay.camera;
    this.#overlay.show(camera, camera ? this.#grid.tile(camera.id)?.picture : undefined);
    if (left) this.#grid.tile(left.id)?.focus();
    return true;
  }

  protected pressKey(event: KeyboardEvent): boolean {
    const isDone = this.#overlay.pressKey(event);
    if (isDone !== undefined) return isDone;
    const camera = this.#grid.currentTile()?.camera;
    if (event.key.toLowerCase() !== "s" || !camera) return false;
    this.#overlay.takeSnapshot(camera);
    return true;
  }

  async #load(): Promise<void> {
    const [list] = await Promise.all([
      this.server.cameras().catch((error: ServerError) => error),
      this.server.signalLosses.refresh(),
    ]);
    if (this.closed.aborted) return;
    this.#error = list instanceof ServerError ? list.message : "";
    this.progress.hidden = true;
    if (!(list instanceof ServerError)) this.#showList(list);
    else if (!this.#cameras) this.#showMessage("warning", list.message, true);
    this.#refresh();
  }

  #showList(list: CameraList): void {
    this.#cameras = list.camera ?? [];
    this.#grid.setCameras(this.#cameras);
    if (this.#cameras.length > 0) this.#message.replaceChildren();
    else if (list.CamNum > 0) this.#showMessage("camera", "No camera is enabled.", false);
    else if (list.isManager)
      this.#showMessage("camera", "No cameras yet. Add one on the server with “lookhaven camera add”.", false);
    else this.#showMessage("camera", "You do not have permission to view any camera yet.", false);
    this.#showAdvice(this.#cameras.some(({ video_type }) => video_type !== kVideoTypeMjpeg));
    this.followRoute();
  }

  /** Where the page came over plain HTTP, it can do less than over HTTPS. */
  #showAdvice(needsDecoder: boolean): void {
    const missing = needsDecoder ? missingDecoder() : null;
    this.#advice.hidden = !missing;
    if (missing && !this.#advice.hasChildNodes()) this.#advice.append(...unplayableHint(missing));
  }

  #showMessage(name: IconName, sentence: string, canRetry: boolean): void {
    const parts: Node[] = [icon(name), element("p", { role: canRetry ? "alert" : "status" }, sentence)];
    if (canRetry) {
      const retry = element("button", { type: "button", class: "button" }, "Try again");
      retry.addEventListener("click", () => {
        this.progress.hidden = false;
        this.#message.replaceChildren();
        void this.#load();
      });
      parts.push(retry);
    }
    this.#message.replaceChildren(...parts);
  }

  #refresh(): void {
    const lost = this.#grid.refresh();
    this.#overlay.refresh();
    const cameras = this.#cameras?.length ?? 0;
    const counted = `${cameras} ${cameras === 1 ? "camera" : "cameras"}${lost > 0 ? ` · ${lost} without signal` : ""}`;
    setText(this.#status, this.#cameras === null ? "" : this.#error || counted);
    this.#status.classList.toggle("alarm", this.#error !== "" || lost > 0);
  }

  #step(by: 1 | -1): void {
    const cameras = this.#cameras ?? [];
    const at = cameras.findIndex(({ id }) => id === this.#overlay.camera?.id);
    const next = cameras[(at + by + cameras.length) % cameras.length];
    if (next) showCamera(next.id);
  }
}
