// SPDX-License-Identifier: Apache-2.0
//
// Camera groups as managers set them up. All of it is for managers only.

import type { Named, RecordKey } from "./camera_setup";
import type { Server } from "./server";

/** What a manager may change. */
export interface GroupSettings {
  name: string;
  /** Ids; those of cameras that were removed stay, for their recordings do. */
  camera: number[];
}

export interface GroupRecord extends GroupSettings, Named {
  revision: number;
  /** Names of the accounts to which something of the group is denied. */
  deniedTo: string[];
}

const kApi = "VEXO.Group";

export class Groups {
  readonly #server: Server;

  constructor(server: Server) {
    this.#server = server;
  }

  async list(): Promise<GroupRecord[]> {
    return (await this.#call<{ group: GroupRecord[] }>("List", {})).group;
  }

  async add(group: GroupSettings): Promise<GroupRecord> {
    return (await this.#call<{ group: GroupRecord }>("Add", group)).group;
  }

  /** Rejects with status 409 and the record where `revision` is stale. */
  async set(id: number, revision: number, changes: Partial<GroupSettings>): Promise<GroupRecord> {
    return (await this.#call<{ group: GroupRecord }>("Set", { id, revision, ...changes })).group;
  }

  remove({ id, revision }: RecordKey): Promise<unknown> {
    return this.#call("Remove", { id, revision });
  }

  #call<Data>(method: string, json: unknown): Promise<Data> {
    return this.#server.call<Data>(kApi, method, {}, { json });
  }
}
