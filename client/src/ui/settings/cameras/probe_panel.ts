// SPDX-License-Identifier: Apache-2.0
//
// Tests the connection to a camera before it is saved: shows its picture and what it sends, or why there is none.

import type { CameraSetup, ProbeRequest, ProbeResult } from "../../../wire/camera_setup";
import { asServerError } from "../../../wire/server";
import { button } from "../../widgets/button";
import { draw, element } from "../../widgets/dom";
import { icon } from "../../widgets/icons";

const kTickMs = 1_000;
const kCodecs: Record<string, string> = { mjpeg: "MJPEG", h264: "H.264", h265: "H.265" };

export function codecText(codec: string): string {
  return kCodecs[codec] ?? codec;
}

/** "25" */
export function rateNumber(rate: number): string {
  return String(Math.round(rate * 10) / 10);
}

export class ProbePanel {
  readonly root = element("div", { class: "probe" });
  readonly #setup: CameraSetup;
  readonly #request: () => ProbeRequest;
  readonly #onResult: (result: ProbeResult) => void;
  readonly #shown = element("div", { class: "probe-shown", role: "status" });
  readonly #start = button("Test connection", () => void this.#probe());
  readonly #cancel = button("Cancel test", () => this.#running?.abort());
  #running: AbortController | null = null;

  constructor(setup: CameraSetup, request: () => ProbeRequest, onResult: (result: ProbeResult) => void) {
    this.#setup = setup;
    this.#request = request;
    this.#onResult = onResult;
    this.#cancel.hidden = true;
    this.root.append(element("div", { class: "form-buttons" }, this.#start, this.#cancel), this.#shown);
  }

  close(): void {
    this.#running?.abort();
  }

  async #probe(): Promise<void> {
    const request = this.#request();
    if (!request.address) return this.#tell("Please enter the camera's address first.");
    const running = (this.#running = new AbortController());
    const stopCounting = this.#count();
    this.#start.hidden = !(this.#cancel.hidden = false);
    this.#cancel.focus();
    try {
      const result = await this.#setup.probe(request, running.signal);
      if (running.signal.aborted) return;
      if ("failed" in result) this.#tell(result.message || "The camera does not answer.");
      else await this.#show(result);
    } catch (error) {
      if (running.signal.aborted) this.#shown.replaceChildren();
      else this.#tell(asServerError(error).message);
    } finally {
      stopCounting();
      const hadFocus = document.activeElement === this.#cancel;
      this.#cancel.hidden = !(this.#start.hidden = false);
      if (hadFocus) this.#start.focus();
    }
  }

  /** A camera may take a quarter of a minute: says that it is still running. */
  #count(): () => void {
    const startMs = performance.now();
    const seconds = element("span", { "aria-hidden": "true" });
    const show = () => (seconds.textContent = ` ${Math.round((performance.now() - startMs) / 1000)} s`);
    const text = element("span", {}, "Connecting to the camera…", seconds);
    this.#shown.replaceChildren(element("p", { class: "probe-wait" }, element("span", { class: "spinner" }), text));
    show();
    const timer = setInterval(show, kTickMs);
    return () => clearInterval(timer);
  }

  #tell(sentence: string): void {
    this.#shown.replaceChildren(element("p", { class: "probe-failure" }, icon("warning"), element("span", {}, sentence)));
  }

  async #show(result: ProbeResult): Promise<void> {
    const { codec, width, height, rate, audio } = result;
    const facts = [codecText(codec), `${width} × ${height}`];
    if (rate > 0) facts.push(`${rateNumber(rate)} fps`);
    facts.push(audio ? "with sound" : "no sound");
    const picture = element("canvas", { class: "probe-picture", role: "img", "aria-label": "The camera's picture" });
    const isShown = await drawBase64(picture, result.picture);
    const text = element("p", { class: "probe-facts" }, facts.join(" · "));
    this.#shown.replaceChildren(...(isShown ? [picture] : []), text);
    this.#onResult(result);
  }
}

/** False where there is no picture in it. */
async function drawBase64(canvas: HTMLCanvasElement, base64: string): Promise<boolean> {
  try {
    const bytes = Uint8Array.from(atob(base64), (character) => character.charCodeAt(0));
    const image = await createImageBitmap(new Blob([bytes], { type: "image/jpeg" }));
    draw(canvas, image);
    image.close();
    return true;
  } catch {
    return false;
  }
}
