// SPDX-License-Identifier: Apache-2.0
//
// The ports of an I/O module: a row for each, and a button for one more.

import type { Named } from "../../../wire/camera_setup";
import type { DevicePort } from "../../../wire/devices";
import { button, iconButton } from "../../widgets/button";
import { element } from "../../widgets/dom";
import { numberField, selectField } from "../../widgets/fields";
import { cameraField } from "./camera_field";

const kMaxPort = 63;

interface PortRow {
  root: HTMLElement;
  /** Null where no number is typed. */
  readonly value: DevicePort | null;
}

export class PortsField {
  readonly root: HTMLElement;
  readonly #cameras: readonly Named[];
  readonly #list = element("ul", { class: "port-list" });
  #rows: PortRow[] = [];

  constructor(cameras: readonly Named[], ports: readonly DevicePort[]) {
    this.#cameras = cameras;
    for (const port of ports) this.#add(port);
    const add = button("Add a port", () => {
      const free = Array.from({ length: kMaxPort + 1 }, (_, port) => port).find((port) => !this.#has(port));
      if (free === undefined) return;
      this.#add({ port: free, type: "in", camera: 0 }).root.querySelector("input")?.focus();
    });
    this.root = element("fieldset", { class: "form-choice" }, element("legend", {}, "Ports"), this.#list, add);
  }

  get value(): DevicePort[] {
    return this.#rows.map(({ value }) => value).filter((port) => port !== null);
  }

  /** Why the ports cannot be stored; empty where they can. */
  get problem(): string {
    const ports = this.#rows.map(({ value }) => value?.port);
    if (ports.some((port) => port === undefined || !Number.isInteger(port) || port < 0 || port > kMaxPort)) {
      return `A port's number is a whole number from 0 to ${kMaxPort}.`;
    }
    return new Set(ports).size < ports.length ? "Two ports have the same number." : "";
  }

  #has(port: number): boolean {
    return this.#rows.some(({ value }) => value?.port === port);
  }

  #add(port: DevicePort): PortRow {
    const number = numberField("Number", 0, kMaxPort);
    const type = selectField("Type", [
      ["in", "input"],
      ["out", "output"],
    ]);
    const camera = cameraField("Camera", this.#cameras, port.camera);
    number.value = port.port;
    type.value = port.type;
    const remove = iconButton("close", "Remove this port", () => {
      this.#rows = this.#rows.filter((one) => one !== row);
      row.root.remove();
    });
    const row: PortRow = {
      root: element("li", { class: "port-row" }, number.root, type.root, camera.root, remove),
      get value() {
        if (number.value === null) return null;
        return { port: number.value, type: type.value as DevicePort["type"], camera: camera.value };
      },
    };
    this.#rows.push(row);
    this.#list.append(row.root);
    return row;
  }
}
