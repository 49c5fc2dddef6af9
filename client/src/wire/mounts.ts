// SPDX-License-Identifier: Apache-2.0
//
// Mounts: where recordings are kept, how much of it is used, and for how long it lasts. For managers only.

import type { RecordKey } from "./camera_setup";
import type { Unconfirmed } from "./footage_loss";
import type { Server } from "./server";

/** What a manager may change. */
export interface MountSettings {
  name: string;
  enabled: boolean;
  default: boolean;
  /** Recordings beyond either are deleted, the oldest first; null: no limit. */
  limitBytes: number | null;
  limitDays: number | null;
}

export interface MountRecord extends Omit<MountSettings, "limitBytes" | "limitDays"> {
  id: number;
  revision: number;
  path: string;
  /** Hosts share it. */
  shared: boolean;
  state: string;
  /** What is wrong, as a sentence; may be empty. */
  message: string;
  /** Bytes of the disk; null where it does not say. */
  total: number | null;
  free: number | null;
  /** Bytes of recordings. */
  used: number;
  /** Unix seconds; of what may be deleted. */
  oldest: number | null;
  limit: { bytes: number | null; days: number | null };
  /** Bytes a day over the last week. */
  perDay: number;
  /** For how many days there is room; null where nobody can say. */
  lastsDays: number | null;
  /** What is left of the last 30 days. */
  history: { day: string; bytes: number }[];
  /** The name is empty for a camera that was removed. */
  camera: { id: number; name: string; perDay: number }[];
}

const kApi = "VEXO.Mount";

export class Mounts {
  readonly #server: Server;

  constructor(server: Server) {
    this.#server = server;
  }

  async list(): Promise<MountRecord[]> {
    return (await this.#call<{ mount: MountRecord[] }>("List", {})).mount;
  }

  async add(mount: Omit<MountSettings, "enabled"> & { path: string }): Promise<MountRecord> {
    return (await this.#call<{ mount: MountRecord }>("Add", mount)).mount;
  }

  /**
   * Where the new limits would delete recordings nothing changes and the loss comes back, unless `confirm`. Rejects
   * with status 409 and the record where `revision` is stale.
   */
  set(
    id: number,
    revision: number,
    changes: Partial<MountSettings>,
    confirm: boolean,
  ): Promise<{ mount: MountRecord } | Unconfirmed> {
    return this.#call("Set", { id, revision, ...changes, confirm });
  }

  remove({ id, revision }: RecordKey): Promise<unknown> {
    return this.#call("Remove", { id, revision });
  }

  #call<Data>(method: string, json: unknown): Promise<Data> {
    return this.#server.call<Data>(kApi, method, {}, { json });
  }
}
