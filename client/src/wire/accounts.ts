// SPDX-License-Identifier: Apache-2.0
//
// Accounts, their rights and sessions. All but one's own password and sessions is for managers only.

import type { Named, RecordKey } from "./camera_setup";
import type { Server } from "./server";

export const kPrivileges = ["viewer", "manager", "owner"] as const;
export type Privilege = (typeof kPrivileges)[number];
/** The rights to a camera that can be denied. Export, of recordings as files, needs playback too. */
export const kCameraRights = ["live", "audio", "playback", "export"] as const;
export type CameraRight = (typeof kCameraRights)[number];

export function byRight<Value>(value: (right: CameraRight) => Value): Record<CameraRight, Value> {
  return Object.fromEntries(kCameraRights.map((right) => [right, value(right)])) as Record<CameraRight, Value>;
}

/** Ids of what a viewer may not see. */
export interface Denied extends Record<CameraRight, number[]> {
  /** Groups: what is denied holds for all of their cameras. */
  group: Record<CameraRight, number[]>;
  emap: number[];
  door: number[];
  ioModule: number[];
}

/** What a manager may change, apart from the password. */
export interface UserSettings {
  privilege: Privilege;
  /** Whether it may report alerts and POS transactions. */
  mayMark: boolean;
  deny: Denied;
}

export interface UserRecord extends UserSettings {
  id: number;
  name: string;
  revision: number;
  /** Sessions that are open. */
  sessions: number;
  /** Unix seconds; null without sessions. */
  lastUse: number | null;
}

export interface UserList {
  user: UserRecord[];
  /** Those of a paired host have its name. */
  camera: (Named & { server?: string })[];
  group: (Named & { camera: number[] })[];
  door: Named[];
  ioModule: Named[];
  emap: Named[];
}

export interface OpenSession {
  /** Not the cookie. */
  key: string;
  /** Where the log-in came from; may be empty. */
  address: string;
  /** Unix seconds. */
  started: number;
  lastUse: number;
  /** The caller's own. */
  current: boolean;
}

export interface SeenCamera extends Named, Record<CameraRight, boolean> {}

const kApi = "VEXO.User";

export class Accounts {
  readonly #server: Server;

  constructor(server: Server) {
    this.#server = server;
  }

  list(): Promise<UserList> {
    return this.#call("List", {});
  }

  /** `reauth` is the password of the manager who asks; a wrong one is rejected with status 403. */
  async add(user: UserSettings & { name: string; password: string }, reauth: string): Promise<UserRecord> {
    return (await this.#call<{ user: UserRecord }>("Add", { ...user, reauth })).user;
  }

  /** A new password or privilege needs `reauth`. Rejects with status 409 and the record where `revision` is stale. */
  async set(
    id: number,
    revision: number,
    changes: Partial<UserSettings> & { password?: string; reauth?: string },
  ): Promise<UserRecord> {
    return (await this.#call<{ user: UserRecord }>("Set", { id, revision, ...changes })).user;
  }

  remove({ id, revision }: RecordKey, reauth: string): Promise<unknown> {
    return this.#call("Remove", { id, revision, reauth });
  }

  /** Those of the caller's own account where none is named. */
  async sessions(id?: number): Promise<OpenSession[]> {
    return (await this.#call<{ session: OpenSession[] }>("Sessions", { id })).session;
  }

  /** Ends sessions of that account, or of the caller's own; without a key all but the asking one. Returns how many. */
  async endSessions(id?: number, key?: string): Promise<number> {
    return (await this.#call<{ ended: number }>("EndSessions", { id, key })).ended;
  }

  /** What this account sees. */
  async preview(id: number): Promise<SeenCamera[]> {
    return (await this.#call<{ camera: SeenCamera[] }>("Preview", { id })).camera;
  }

  /** Changes the caller's own, who need not be a manager. A wrong password is rejected with status 403. */
  changePassword(password: string, newPassword: string): Promise<unknown> {
    return this.#call("ChangePassword", { password, newPassword });
  }

  #call<Data>(method: string, json: unknown): Promise<Data> {
    return this.#server.call<Data>(kApi, method, {}, { json });
  }
}
