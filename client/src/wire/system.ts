// SPDX-License-Identifier: Apache-2.0
//
// The installation as a whole: what is wrong with it and what to do, its parts, and what holds for all of it. For
// managers only.

import type { Server } from "./server";

export interface Finding {
  problem: string;
  /** What to do; one that begins with a command is that command. */
  remedy: string;
  severity: "fault" | "note";
}

export interface Check {
  /** "web server" */
  name: string;
  /** Whether there is no fault; null where nobody knows. */
  ok: boolean | null;
  finding: Finding[];
  /** Why nobody knows, else null. */
  unchecked: string | null;
}

export interface SystemProcess {
  name: string;
  state: "running" | "hanging" | "stopped";
  /** Unix seconds. */
  since: number | null;
  /** Its program was updated since it started. */
  replaced: boolean;
}

export interface Certificate {
  subject: string;
  /** Hosts and addresses that it is valid for. */
  name: string[];
  /** SHA-256, "AB:0C:…". */
  fingerprint: string;
  /** Unix seconds when it expires. */
  end: number;
  selfSigned: boolean;
}

export interface OfferedCertificate extends Certificate {
  /** Names of hosts that do not trust this one. */
  pairedHosts: string[];
}

/** Both in PEM. */
export interface CertificateOffer {
  certificate: string;
  key: string;
}

export interface LogLevels {
  category: { name: string; level: string }[];
  /** The level of all others. */
  others: string;
  /** All levels that there are. */
  known: string[];
  revision: number;
}

/** Errors that the server has logged, the newest first. */
export interface LogTail {
  entry: {
    /** Unix seconds. */
    time: number;
    /** Whose: "recorder". */
    process: string;
    text: string;
  }[];
  /** There are log files. */
  files: boolean;
  /** The programs log to the journal of the system, which is not told. */
  journal: boolean;
}

export interface SystemStatus {
  version: string;
  store: { engine: string; schema: number };
  process: SystemProcess[];
  certificate: Certificate | null;
  check: Check[];
}

export interface SettingRecord {
  name: string;
  kind: "number" | "switch" | "folders" | "token";
  value: number | boolean | string;
  initial: number | boolean | string;
  min: number | null;
  max: number | null;
  meaning: string;
  /** Only the command line changes it. */
  operator: boolean;
  revision: number;
}

/** Another request waits for a while, and the checks take twelve seconds at most. */
const kStatusTimeoutMs = 40_000;
/** The web server has ten seconds to show another certificate, and as many to show the one from before again. */
const kReloadTimeoutMs = 40_000;
const kApi = "VEXO.System";

export class System {
  readonly #server: Server;

  constructor(server: Server) {
    this.#server = server;
  }

  status(signal: AbortSignal): Promise<SystemStatus> {
    return this.#server.call(kApi, "Status", {}, { json: {}, signal, timeoutMs: kStatusTimeoutMs });
  }

  async settings(): Promise<SettingRecord[]> {
    return (await this.#server.call<{ setting: SettingRecord[] }>(kApi, "Settings", {}, { json: {} })).setting;
  }

  /** Rejects with status 409 where `revision` is stale. */
  async set(name: string, value: SettingRecord["value"], revision: number): Promise<SettingRecord> {
    const json = { name, value, revision };
    return (await this.#server.call<{ setting: SettingRecord }>(kApi, "SetSetting", {}, { json })).setting;
  }

  /** Changes nothing. Rejects with a sentence for what is no usable pair. */
  async checkCertificate(offer: CertificateOffer): Promise<OfferedCertificate> {
    return (await this.#server.call<{ confirm: OfferedCertificate }>(kApi, "SetCertificate", {}, { json: offer })).confirm;
  }

  /**
   * `reloaded`: the web server runs and shows it. Rejects with status 502 where it refuses: then the one from before is
   * back.
   */
  async setCertificate(offer: CertificateOffer, reauth: string): Promise<{ reloaded: boolean }> {
    const options = { json: { ...offer, confirm: true, reauth }, timeoutMs: kReloadTimeoutMs };
    return (await this.#server.call<{ certificate: { reloaded: boolean } }>(kApi, "SetCertificate", {}, options)).certificate;
  }

  /** `limit`: 200 at most. */
  logTail(limit: number): Promise<LogTail> {
    return this.#server.call(kApi, "LogTail", {}, { json: { limit } });
  }

  async logLevels(): Promise<LogLevels> {
    return (await this.#server.call<{ log: LogLevels }>(kApi, "LogLevels", {}, { json: {} })).log;
  }

  /** `changed` may have "others". Rejects with status 409 where `revision` is stale. */
  async setLogLevels(changed: readonly { name: string; level: string }[], revision: number): Promise<LogLevels> {
    const category = changed.filter(({ name }) => name !== "others");
    const others = changed.find(({ name }) => name === "others")?.level;
    const json = { category, revision, ...(others === undefined ? {} : { others }) };
    return (await this.#server.call<{ log: LogLevels }>(kApi, "SetLogLevels", {}, { json })).log;
  }
}
