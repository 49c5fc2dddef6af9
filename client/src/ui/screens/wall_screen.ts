// SPDX-License-Identifier: Apache-2.0
//
// What a logged-in user sees: the bar, the grid of all cameras, and over it the large view of one.

import { missingDecoder } from "../../live/unplayable";
import { kVideoTypeMjpeg, ServerError, type Account, type Camera, type CameraList, type Server } from "../../wire/server";
import { unplayableHint } from "../camera/unplayable_hint";
import { iconButton } from "../widgets/button";
import { element, setText } from "../widgets/dom";
import { toggleFullScreen } from "../widgets/full_screen";
import { Grid } from "../wall/grid";
import { icon, type IconName } from "../widgets/icons";
import { LargeView, type LargeViewActions } from "../camera/large_view";
import { kLayoutChoices, type LayoutChoice } from "../wall/layout";
import { navigation } from "./navigation";
import { openCamera, showCamera, showWall } from "./route";
import { logoutButton } from "./log_out";
import { SnapshotDialog } from "../camera/snapshot_dialog";
import { clockTime } from "../widgets/text";

const kTickMs = 500;
/** Cameras come and go seldom. */
const kListEveryMs = 30_000;
const kLayoutKey = "lookhaven.layout";

const kLayoutLabels: Record<LayoutChoice, [IconName, string]> = {
  auto: ["layoutAuto", "All cameras on the screen"],
  "1": ["layout1", "One camera"],
  "2": ["layout2", "Two by two"],
  "3": ["layout3", "Three by three"],
};

export class Wall {
  readonly root: HTMLElement;
  readonly #server: Server;
  readonly #grid: Grid;
  readonly #dialog: SnapshotDialog;
  readonly #onLogout: () => void;
  readonly #count = element("p", { class: "wall-count" });
  readonly #clock = element("time", { class: "wall-clock" });
  readonly #progress = element("div", { class: "progress", role: "progressbar", "aria-label": "Loading" });
  readonly #message = element("div", { class: "wall-message" });
  readonly #advice = element("p", { class: "wall-advice", role: "note", hidden: true });
  readonly #front: HTMLElement;
  readonly #onRoute = () => this.#followRoute();
  readonly #onKey = (event: KeyboardEvent) => this.#key(event);
  readonly #onVisible = () => void (document.hidden || this.#load());
  readonly #tick = setInterval(() => this.#refresh(), kTickMs);
  readonly #listTimer = setInterval(() => void (document.hidden || this.#load()), kListEveryMs);
  #cameras: Camera[] | null = null;
  #large: LargeView | null = null;
  #trouble = "";
  #closed = false;

  constructor(server: Server, account: Account, onLogout: () => void) {
    this.#server = server;
    this.#onLogout = onLogout;
    this.#dialog = new SnapshotDialog(server);
    this.#grid = new Grid(server, {
      open: (camera) => showCamera(camera.id),
      snapshot: (camera) => this.#snapshot(camera),
    });
    this.#front = element(
      "div",
      { class: "wall" },
      this.#bar(account),
      this.#progress,
      this.#advice,
      this.#message,
      this.#grid.root,
    );
    this.root = element("main", { class: "screen" }, this.#front, this.#dialog.root);
    addEventListener("popstate", this.#onRoute);
    document.addEventListener("keydown", this.#onKey);
    document.addEventListener("visibilitychange", this.#onVisible);
    this.#refresh();
    void this.#load();
  }

  /** Closes all streams. */
  close(): void {
    this.#closed = true;
    clearInterval(this.#tick);
    clearInterval(this.#listTimer);
    removeEventListener("popstate", this.#onRoute);
    document.removeEventListener("keydown", this.#onKey);
    document.removeEventListener("visibilitychange", this.#onVisible);
    if (this.#dialog.isOpen) this.#dialog.root.close();
    this.#large?.close();
    this.#grid.close();
  }

  #bar(account: Account): HTMLElement {
    const busy = (isBusy: boolean) => (this.#progress.hidden = !isBusy);
    const logout = logoutButton(this.#server, account, this.#onLogout, busy);
    const brand = element("div", { class: "brand" }, icon("lighthouse"), element("h1", {}, "Lookhaven"));
    const nav = navigation("live");
    return element("header", { class: "bar" }, brand, nav, this.#count, this.#layoutPicker(), this.#clock, logout);
  }

  #layoutPicker(): HTMLElement {
    const stored = localStorage.getItem(kLayoutKey);
    const picker = element("div", { class: "segments", role: "group", "aria-label": "Layout" });
    const choose = (choice: LayoutChoice) => {
      this.#grid.setLayout(choice);
      localStorage.setItem(kLayoutKey, choice);
      for (const button of picker.children) {
        button.setAttribute("aria-pressed", String((button as HTMLElement).dataset["layout"] === choice));
      }
    };
    for (const choice of kLayoutChoices) {
      const button = iconButton(...kLayoutLabels[choice], () => choose(choice));
      button.dataset["layout"] = choice;
      picker.append(button);
    }
    choose(kLayoutChoices.find((choice) => choice === stored) ?? "auto");
    return picker;
  }

  async #load(): Promise<void> {
    const list = await this.#server.cameras().catch((error: ServerError) => error);
    if (this.#closed) return;
    this.#trouble = list instanceof ServerError ? list.message : "";
    this.#progress.hidden = true;
    if (!(list instanceof ServerError)) this.#showList(list);
    else if (!this.#cameras) this.#showMessage("warning", list.message, true);
    this.#refresh();
  }

  #showList(list: CameraList): void {
    this.#cameras = list.camera ?? [];
    this.#grid.setCameras(this.#cameras);
    if (this.#cameras.length > 0) this.#message.replaceChildren();
    else if (list.CamNum > 0) this.#showMessage("camera", "No camera is switched on.", false);
    else if (list.isManager)
      this.#showMessage("camera", "No camera yet. “lookhaven camera add” on the server adds one.", false);
    else this.#showMessage("camera", "There is no camera for you to see yet.", false);
    this.#showAdvice(this.#cameras.some(({ video_type }) => video_type !== kVideoTypeMjpeg));
    this.#followRoute();
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
        this.#progress.hidden = false;
        this.#message.replaceChildren();
        void this.#load();
      });
      parts.push(retry);
    }
    this.#message.replaceChildren(...parts);
  }

  #refresh(): void {
    const lost = this.#grid.refresh();
    this.#large?.refresh();
    setText(this.#clock, clockTime(Date.now()));
    const cameras = this.#cameras?.length ?? 0;
    const counted = `${cameras} ${cameras === 1 ? "camera" : "cameras"}${lost > 0 ? ` · ${lost} without signal` : ""}`;
    setText(this.#count, this.#cameras === null ? "" : this.#trouble || counted);
    this.#count.classList.toggle("alarm", this.#trouble !== "" || lost > 0);
  }

  #followRoute(): void {
    const camera = this.#cameras?.find(({ id }) => id === openCamera());
    if (camera && camera.id === this.#large?.camera.id) return;
    const left = this.#large?.camera.id;
    this.#large?.close();
    this.#large = null;
    this.#front.hidden = camera !== undefined;
    if (camera) this.#openLarge(camera);
    else if (left !== undefined) this.#grid.tile(left)?.focus();
  }

  #openLarge(camera: Camera): void {
    const actions: LargeViewActions = {
      back: showWall,
      step: (by) => this.#step(by),
      snapshot: () => this.#snapshot(camera),
      fullScreen: toggleFullScreen,
    };
    this.#large = new LargeView(camera, this.#server, actions, this.#grid.tile(camera.id)?.picture);
    this.root.prepend(this.#large.root);
    this.#large.focus();
  }

  #step(by: 1 | -1): void {
    const cameras = this.#cameras ?? [];
    const at = cameras.findIndex(({ id }) => id === this.#large?.camera.id);
    const next = cameras[(at + by + cameras.length) % cameras.length];
    if (next) showCamera(next.id);
  }

  #snapshot(camera: Camera): void {
    void this.#dialog.take(camera);
  }

  #key(event: KeyboardEvent): void {
    if (this.#dialog.isOpen || event.altKey || event.ctrlKey || event.metaKey || event.defaultPrevented) return;
    const camera = this.#grid.currentTile()?.camera;
    if (this.#large) {
      if (!this.#large.key(event)) return;
    } else if (event.key.toLowerCase() === "s" && camera) this.#snapshot(camera);
    else return;
    event.preventDefault();
  }
}
