// SPDX-License-Identifier: Apache-2.0
//
// The audit log: who has changed what. For managers only.

import type { Server } from "./server";

/** Settings by name; the values are whatever JSON holds. */
export type AuditedState = Record<string, unknown>;

export interface AuditEntry {
  id: number;
  /** Unix seconds. */
  time: number;
  /** An account, or the command line. */
  who: string;
  /** Empty for the command line. */
  address: string;
  /** "camera.add" */
  action: string;
  /** "Gate (3)" */
  object: string;
  before: AuditedState | null;
  after: AuditedState | null;
}

const kPageSize = 50;

/** The newest entries, or those before the one with this id; `more`: there are older ones. */
export function auditEntries(server: Server, before?: number): Promise<{ entry: AuditEntry[]; more: boolean }> {
  const json = { limit: kPageSize, ...(before === undefined ? {} : { before }) };
  return server.call("VEXO.System", "Audit", {}, { json });
}
