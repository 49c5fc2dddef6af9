// SPDX-License-Identifier: Apache-2.0
//
// Doors, I/O modules and POS terminals as managers set them up. All of it is for managers only.

import type { Named, RecordKey } from "./camera_setup";
import type { Server } from "./server";

export type DeviceKind = "door" | "io" | "pos";

export interface DevicePort {
  /** From 0 to 63, each once. */
  port: number;
  type: "in" | "out";
  /** The id of the camera that watches what the port belongs to; 0: none. */
  camera: number;
}

/** What a manager may change. */
export interface DeviceSettings {
  name: string;
  /** For a door or POS terminal, as for a port. */
  camera: number;
  /** For an I/O module. */
  port: DevicePort[];
}

/** An id is one of its kind. */
export interface DeviceRecord extends DeviceSettings, Named {
  kind: DeviceKind;
  /** The paired host that owns it; 0: this one. */
  server: number;
  revision: number;
}

const kApi = "VEXO.Device";

type DeviceKey = Pick<DeviceRecord, "kind"> & RecordKey;

/** What has a revision is rejected with status 409 and the record where that is stale. */
export class Devices {
  readonly #server: Server;

  constructor(server: Server) {
    this.#server = server;
  }

  async list(): Promise<DeviceRecord[]> {
    return (await this.#call<{ device: DeviceRecord[] }>("List", {})).device;
  }

  add(kind: DeviceKind, settings: DeviceSettings): Promise<unknown> {
    return this.#call("Add", { kind, ...settings });
  }

  set({ kind, id, revision }: DeviceKey, settings: DeviceSettings): Promise<unknown> {
    return this.#call("Set", { kind, id, revision, ...settings });
  }

  remove({ kind, id, revision }: DeviceKey): Promise<unknown> {
    return this.#call("Remove", { kind, id, revision });
  }

  #call<Data>(method: string, json: unknown): Promise<Data> {
    return this.#server.call<Data>(kApi, method, {}, { json });
  }
}
