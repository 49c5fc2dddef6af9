// SPDX-License-Identifier: Apache-2.0
//
// Access tokens, with which analytics boxes and POS terminals report. All of it is for managers only.

import type { Named } from "./camera_setup";
import type { Server } from "./server";

export const kMarkKinds = ["alert", "pos"] as const;
export type MarkKind = (typeof kMarkKinds)[number];

/** What it is given out with. */
export interface AccessTokenSettings {
  name: string;
  /** Ids of the cameras at which it may report. */
  camera: number[];
  /** What it may report. */
  kind: MarkKind[];
}

export interface AccessToken extends AccessTokenSettings, Named {
  /** Unix seconds. */
  created: number;
  /** The account that made it; "command line" for that. */
  by: string;
  /** Null: not used yet. */
  lastUse: number | null;
  /** Null: never. */
  expires: number | null;
}

export interface AccessTokenList {
  token: AccessToken[];
  camera: Named[];
}

const kApi = "VEXO.Token";

export class AccessTokens {
  readonly #server: Server;

  constructor(server: Server) {
    this.#server = server;
  }

  list(): Promise<AccessTokenList> {
    return this.#call("List", {});
  }

  /** Resolves with the secret, which is told this once. `lifetime` in seconds; 0: it does not expire. */
  async add(token: AccessTokenSettings & { lifetime: number }, reauth: string): Promise<string> {
    return (await this.#call<{ secret: string }>("Add", { ...token, reauth })).secret;
  }

  remove(id: number): Promise<unknown> {
    return this.#call("Remove", { id });
  }

  #call<Data>(method: string, json: unknown): Promise<Data> {
    return this.#server.call<Data>(kApi, method, {}, { json });
  }
}
