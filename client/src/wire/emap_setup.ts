// SPDX-License-Identifier: Apache-2.0
//
// E-maps as managers set them up, but for what is placed on them (emaps). All of it is for managers only.

import type { Named, RecordKey } from "./camera_setup";
import type { Server } from "./server";
import type { UploadOptions } from "./upload";

export interface EmapRecord extends Named {
  /** Grows with every change of the map or its items. */
  revision: number;
  /** Another text for each picture; empty where there is none. */
  picture: string;
  /** How many. */
  items: number;
  /** Other maps that have a link to this one. */
  linkedFrom: Named[];
}

/** What the server takes, in bytes. */
export const kMaxUploadBytes = 20 * 2 ** 20;

const kApi = "VEXO.Emap";

/** What has a revision is rejected with status 409 and the record where that is stale. */
export class EmapSetup {
  readonly #server: Server;

  constructor(server: Server) {
    this.#server = server;
  }

  async list(): Promise<EmapRecord[]> {
    return (await this.#server.call<{ emap: EmapRecord[] }>(kApi, "List", {}, { json: {} })).emap;
  }

  /** `picture`: a PNG, JPEG or WebP file. */
  async add(name: string, picture: Blob, options: UploadOptions): Promise<EmapRecord> {
    return (await this.#server.upload<{ emap: EmapRecord }>(kApi, "Add", { name }, picture, options)).emap;
  }

  async replacePicture({ id, revision }: RecordKey, picture: Blob, options: UploadOptions): Promise<EmapRecord> {
    const of = { emap: String(id), revision: String(revision) };
    return (await this.#server.upload<{ emap: EmapRecord }>(kApi, "Picture", of, picture, options)).emap;
  }

  rename({ id, revision }: RecordKey, name: string): Promise<unknown> {
    return this.#server.call(kApi, "Rename", {}, { json: { emap: id, revision, name } });
  }

  remove({ id, revision }: RecordKey): Promise<unknown> {
    return this.#server.call(kApi, "Remove", {}, { json: { emap: id, revision } });
  }
}
