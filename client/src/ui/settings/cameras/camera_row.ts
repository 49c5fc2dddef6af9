// SPDX-License-Identifier: Apache-2.0
//
// One camera in the list of cameras: its picture, its state, what it sends and when it is recorded.

import { kVideoTypeMjpeg } from "../../../wire/camera";
import type { CameraRecord, Named } from "../../../wire/camera_setup";
import type { Server } from "../../../wire/server";
import { causeText } from "../../../wire/signal_losses";
import { settingsAddress } from "../../route";
import { bytesText } from "../../widgets/amounts";
import { draw, element, setText } from "../../widgets/dom";
import { minuteText } from "../../widgets/text";
import { recordedText } from "./plan";
import { codecText, rateNumber } from "./probe_panel";

const kPictureWidthPx = 320;
const kStates: Record<Exclude<CameraRecord["state"], "no-signal">, string> = {
  running: "live",
  connecting: "connecting",
  disabled: "disabled",
  idle: "standing by",
  unknown: "unknown: the recorder does not run",
};
const kRecordingTroubles: Record<string, string> = {
  "disk-full": "not recorded: the disk is full",
  "disk-fails": "not recorded: the disk fails",
  "mount-gone": "not recorded: the mount is gone",
  "no-mount": "not recorded: there is no mount",
  "no-event-id": "not recorded: the record store assigns no event ids",
};

/** "live", "no signal since 24 Nov 01:45: unreachable". */
export function stateText({ state, reason, since }: Pick<CameraRecord, "state" | "reason" | "since">): string {
  const from = since ? ` since ${minuteText(since * 1000)}` : "";
  if (state === "no-signal") return `no signal${from}${reason ? `: ${causeText(reason)}` : ""}`;
  return kStates[state];
}

/** What the user should know of the recording; empty where it goes as planned. */
export function recordingTrouble(recording: string): string {
  return kRecordingTroubles[recording] ?? "";
}

export class CameraRow {
  readonly root: HTMLLIElement;
  readonly #server: Server;
  readonly #picture = element("canvas", { class: "camera-row-picture", "aria-hidden": "true", width: "320", height: "180" });
  readonly #name: HTMLAnchorElement;
  readonly #groups = element("span", { class: "quiet" });
  readonly #state = element("span", { class: "camera-row-state" });
  readonly #sends = element("span");
  readonly #plan = element("span", { class: "camera-row-recording" });
  readonly #footage = element("span", { class: "quiet" });
  #camera: CameraRecord;

  constructor(server: Server, camera: CameraRecord, groups: readonly Named[]) {
    this.#server = server;
    this.#camera = camera;
    this.#name = element("a", { class: "row-link", href: settingsAddress("cameras", camera.id) });
    const part = (name: string, ...content: Node[]) => element("div", { class: `camera-row-${name}` }, ...content);
    const state = element("span", { class: "camera-row-live" }, element("span", { class: "dot" }), this.#state);
    this.root = element(
      "li",
      { class: "card camera-row", "data-camera": String(camera.id) },
      this.#picture,
      part("name", this.#name, this.#groups),
      part("facts", state, this.#sends),
      part("plan", this.#plan, this.#footage),
    );
    this.show(camera, groups);
  }

  get id(): number {
    return this.#camera.id;
  }

  get name(): string {
    return this.#camera.name;
  }

  show(camera: CameraRecord, groups: readonly Named[]): void {
    this.#camera = camera;
    const { name, state, codec, rate, bytes, footage } = camera;
    const trouble = recordingTrouble(camera.recording);
    this.root.dataset.state = state === "running" ? "live" : state === "no-signal" ? "lost" : state;
    this.root.classList.toggle("has-trouble", trouble !== "");
    setText(this.#name, name);
    const of = groups.filter(({ id }) => camera.group.includes(id));
    setText(this.#groups, of.map((group) => group.name).join(", "));
    setText(this.#state, stateText(camera));
    const flow = state === "running" ? [`${rateNumber(rate)} fps`, `${bytesText(bytes)}/s`] : [];
    setText(this.#sends, [codecText(codec), ...flow].join(" · "));
    setText(this.#plan, trouble || recordedText(camera));
    if (footage) setText(this.#footage, footage.bytes > 0 ? `${bytesText(footage.bytes)} of footage` : "no footage");
  }

  /**
   * Shows what the camera sees now, unless it would have to be started for that; a failure leaves the picture as it
   * was.
   */
  async loadPicture(signal: AbortSignal): Promise<void> {
    if (this.#camera.state !== "running") return;
    const wanted = { id: this.id, video_type: this.#camera.codec === "mjpeg" ? kVideoTypeMjpeg : 0 };
    try {
      const { jpeg } = await this.#server.snapshot(wanted, signal);
      const image = await createImageBitmap(jpeg, { resizeWidth: kPictureWidthPx, resizeQuality: "medium" });
      draw(this.#picture, image);
      image.close();
    } catch {
      // The state says what is wrong.
    }
  }
}
