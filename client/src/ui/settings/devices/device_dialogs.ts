// SPDX-License-Identifier: Apache-2.0
//
// What is asked before a device is added, changed or removed.

import type { Named } from "../../../wire/camera_setup";
import type { DeviceKind, DeviceRecord, Devices, DeviceSettings } from "../../../wire/devices";
import { element } from "../../widgets/dom";
import { radioField, textField } from "../../widgets/fields";
import { openDialog } from "../../widgets/form_dialog";
import { SeenRecord } from "../seen_record";
import { cameraField } from "./camera_field";
import { PortsField } from "./ports_field";

export const kKinds: Record<DeviceKind, string> = { door: "Door", io: "I/O module", pos: "POS terminal" };
const kNothing: DeviceSettings = { name: "", camera: 0, port: [] };

/** Each of these resolves with whether it is done. */
export function askToAdd(host: HTMLElement, devices: Devices, cameras: readonly Named[]): Promise<boolean> {
  const kind = radioField("Kind", Object.entries(kKinds) as [DeviceKind, string][]);
  const fields = new DeviceFields(cameras, kNothing);
  fields.showFor(kind.value);
  kind.root.addEventListener("input", () => fields.showFor(kind.value));
  return openDialog(host, {
    title: "Add a device",
    content: [kind.root, ...fields.content],
    submit: "Add",
    attempt: async () => fields.problem(kind.value) || void (await devices.add(kind.value, fields.valueFor(kind.value))),
  });
}

export function askToChange(
  host: HTMLElement,
  devices: Devices,
  device: DeviceRecord,
  cameras: readonly Named[],
): Promise<boolean> {
  const fields = new DeviceFields(cameras, device);
  const seen = new SeenRecord(device, "Save");
  fields.showFor(device.kind);
  return openDialog(host, {
    title: `Change ${device.name}`,
    content: fields.content,
    submit: "Save",
    attempt: async () =>
      fields.problem(device.kind) || seen.attempt((current) => devices.set(current, fields.valueFor(device.kind))),
  });
}

export function askToRemove(host: HTMLElement, devices: Devices, device: DeviceRecord): Promise<boolean> {
  const seen = new SeenRecord(device, "Remove");
  const stays = device.kind === "door" ? "It stays on its maps, without a state." : "It is no longer shown on its maps.";
  return openDialog(host, {
    title: `Remove ${device.name}?`,
    content: [element("p", {}, stays)],
    submit: "Remove",
    attempt: () => seen.attempt((current) => devices.remove(current)),
  });
}

class DeviceFields {
  readonly content: HTMLElement[];
  readonly #name = textField("Name", { maxlength: "64" });
  readonly #camera;
  readonly #ports: PortsField;

  constructor(cameras: readonly Named[], { name, camera, port }: DeviceSettings) {
    this.#name.value = name;
    this.#camera = cameraField("Camera that watches it", cameras, camera);
    this.#ports = new PortsField(cameras, port);
    this.content = [this.#name.root, this.#camera.root, this.#ports.root];
  }

  /** An I/O module has a camera at each port, and no other. */
  showFor(kind: DeviceKind): void {
    this.#camera.root.hidden = kind === "io";
    this.#ports.root.hidden = kind !== "io";
  }

  problem(kind: DeviceKind): string {
    if (!this.#name.value.trim()) return "Please give the device a name.";
    return kind === "io" ? this.#ports.problem : "";
  }

  valueFor(kind: DeviceKind): DeviceSettings {
    const name = this.#name.value.trim();
    return kind === "io" ? { name, camera: 0, port: this.#ports.value } : { name, camera: this.#camera.value, port: [] };
  }
}
