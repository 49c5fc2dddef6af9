// SPDX-License-Identifier: Apache-2.0
//
// The hosts that this one is paired with: those whose cameras it shows, and those that show its own. For managers only.

import { asServerError, ServerError, type Server } from "./server";

export interface HostCamera {
  id: number;
  /** On the host that has it. */
  idOnServer: number;
  name: string;
}

export interface HostDenial {
  user: string;
  kind: "camera" | "ioModule";
  /** On this host. */
  id: number;
}

/** What goes with a pairing. */
export interface HostLoss {
  camera: HostCamera[];
  denial: HostDenial[];
}

export interface HostRecord extends HostLoss {
  id: number;
  revision: number;
  name: string;
  /** Empty for a host that shows this one's cameras, which is asked nothing. */
  address: string;
  port: number;
  enabled: boolean;
}

export interface HostList {
  server: HostRecord[];
  /** Whether cameras of paired hosts are shown here at all. */
  centralManagement: boolean;
}

const kApi = "VEXO.Server";
/** The server takes 25 seconds at most. */
const kPairTimeoutMs = 40_000;

const kRefusals: Record<string, string> = {
  unreachable: "No Lookhaven host answers at this address and port. Please compare both with what the other host shows.",
  certificate:
    "What answers at this address is not the host that shows the code: its certificate is another one, or has expired. The code was not sent.",
  code: "The other host does not take this code (any more): it is valid once, for ten minutes, until a newer one is shown.",
  tooMany: "The code is wrong, or too much was asked of the other host at once. Please compare it, or show a new one there.",
  unclear: "The other host’s answer cannot be used. It may have paired itself already, and ended a pairing that it had under this name: try again with the same code.",
};

export class Hosts {
  readonly #server: Server;

  constructor(server: Server) {
    this.#server = server;
  }

  list(): Promise<HostList> {
    return this.#call("List", {});
  }

  /** Why the host does not answer; empty where it does. Takes ten seconds where nothing is there. */
  async whyAway(id: number, signal: AbortSignal): Promise<string> {
    return (await this.#server.call<{ reason: string }>(kApi, "Check", {}, { json: { id }, signal })).reason;
  }

  /** A code for the host that will have that name here. A wrong password is rejected with status 403. */
  invite(name: string, reauth: string): Promise<{ code: string; seconds: number }> {
    return this.#call("Invite", { name, reauth });
  }

  /**
   * `reauth` as above. In place of another host of that name, of which users are denied something, nothing is added
   * unless `confirm`, and what they are denied comes back.
   */
  async pair(
    host: { name: string; address: string; port: number; code: string; reauth: string; confirm: boolean },
  ): Promise<{ server: HostRecord } | { confirm: HostLoss }> {
    try {
      return await this.#server.call(kApi, "Add", {}, { json: host, timeoutMs: kPairTimeoutMs });
    } catch (error) {
      const { status, code, message, data } = asServerError(error);
      const reason = kRefusals[(data as { reason?: string } | null)?.reason ?? ""];
      throw new ServerError(status, code, reason ?? message, data);
    }
  }

  /** Where users are denied something of it, nothing is removed unless `confirm`, and what would go comes back. */
  remove(
    { id, revision }: Pick<HostRecord, "id" | "revision">,
    confirm: boolean,
  ): Promise<{ removed: HostLoss } | { confirm: HostLoss }> {
    return this.#call("Remove", { id, revision, confirm });
  }

  #call<Data>(method: string, json: unknown): Promise<Data> {
    return this.#server.call<Data>(kApi, method, {}, { json });
  }
}
