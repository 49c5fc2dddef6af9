// SPDX-License-Identifier: Apache-2.0
//
// Takes a snapshot, shows it and offers it as a file.

import type { Camera, Snapshot } from "../../wire/camera";
import { ServerError, type Server } from "../../wire/server";
import { iconButton } from "../widgets/button";
import { draw, element } from "../widgets/dom";
import { icon } from "../widgets/icons";
import { calendarDate, clockTime, snapshotFileName } from "../widgets/text";

export class SnapshotDialog {
  readonly root = element("dialog", { class: "card dialog snapshot", "aria-label": "Snapshot" });
  readonly #server: Server;
  #request: AbortController | null = null;
  #fileAddress: string | null = null;

  constructor(server: Server) {
    this.#server = server;
    this.root.addEventListener("close", () => this.#clear());
    // A click on the dialog itself, not on what is in it, is one on the backdrop.
    this.root.addEventListener("click", (event) => event.target === this.root && this.root.close());
  }

  get isOpen(): boolean {
    return this.root.open;
  }

  /** Takes the camera's live picture, or what `picture` gives. */
  async take(camera: Camera, picture = (signal: AbortSignal) => this.#server.snapshot(camera, signal)): Promise<void> {
    this.#clear();
    const request = (this.#request = new AbortController());
    const waiting = element(
      "div",
      { class: "snapshot-wait" },
      element("div", { class: "spinner" }),
      "Taking a snapshot…",
    );
    this.#fill(camera, "", waiting);
    if (!this.root.open) this.root.showModal();
    try {
      const snapshot = await picture(request.signal);
      const image = await createImageBitmap(snapshot.jpeg);
      if (!request.signal.aborted) this.#show(camera, snapshot, image);
      image.close();
    } catch (error) {
      if (request.signal.aborted) return;
      const message = error instanceof ServerError ? error.message : "The picture cannot be shown.";
      const again = element("button", { type: "button", class: "button" }, "Try again");
      again.addEventListener("click", () => void this.take(camera, picture));
      this.#fill(
        camera,
        "",
        element("div", { class: "snapshot-wait", role: "alert" }, icon("warning"), message, again),
      );
      again.focus();
    }
  }

  #show(camera: Camera, snapshot: Snapshot, image: ImageBitmap): void {
    const name = snapshotFileName(camera.name, snapshot.takenMs);
    const canvas = element("canvas", { role: "img", "aria-label": `Snapshot of ${camera.name}` });
    draw(canvas, image);
    this.#fileAddress = URL.createObjectURL(snapshot.jpeg);
    const save = element(
      "a",
      { class: "button primary", href: this.#fileAddress, download: name },
      icon("download"),
      "Download",
    );
    const size = `${image.width} × ${image.height} · ${Math.ceil(snapshot.jpeg.size / 1024)} KB`;
    const foot = element(
      "footer",
      { class: "snapshot-foot" },
      element("span", { class: "quiet" }, name, element("br"), size),
      save,
    );
    this.#fill(camera, `${calendarDate(snapshot.takenMs)} ${clockTime(snapshot.takenMs)}`, canvas, foot);
    save.focus();
  }

  #fill(camera: Camera, time: string, ...content: Node[]): void {
    const head = element(
      "header",
      { class: "dialog-head" },
      element("h2", {}, camera.name),
      element("time", {}, time),
      iconButton("close", "Close", () => this.root.close(), "Esc"),
    );
    this.root.replaceChildren(head, ...content);
  }

  #clear(): void {
    this.#request?.abort();
    this.#request = null;
    if (this.#fileAddress) URL.revokeObjectURL(this.#fileAddress);
    this.#fileAddress = null;
    this.root.replaceChildren();
  }
}
