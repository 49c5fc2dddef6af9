// SPDX-License-Identifier: Apache-2.0
//
// Cameras as managers set them up. All of it is for managers only.

import type { Unconfirmed } from "./footage_loss";
import type { Server } from "./server";

export interface Named {
  id: number;
  name: string;
}

/** A record as the user has seen it: rejected where someone else has changed it since. */
export interface RecordKey {
  id: number;
  revision: number;
}

export interface CameraSource {
  /** 0 high, 1 low, 2 mobile. */
  profile: number;
  address: string;
  /** What is asked of the camera; 0 or absent: as it comes. */
  width?: number;
  height?: number;
  fps?: number;
}

export interface RecordingPlan {
  /** "never" but around alerts; "schedule" goes by `hours`. */
  mode: "never" | "always" | "schedule";
  /** Seconds; how long a file becomes. */
  segment: number;
  /** Seconds before and after an alert that are kept with it. */
  pre: number;
  post: number;
  /** 0: the default mount. */
  mount: number;
  profile: number;
  /** A character for each hour of the server's week, from Monday 00:00 on: 0 never, 1 always, 2 on alert. */
  hours: string;
}

/** What a manager may change, apart from the password. */
export interface CameraSettings {
  name: string;
  enabled: boolean;
  source: CameraSource[];
  account: string;
  /** Accepts any TLS certificate. */
  insecure: boolean;
  audio: boolean;
  ptz: boolean;
  liveProfile: number;
  /** Ids of its groups. */
  group: number[];
  plan: RecordingPlan;
  /** Its recordings are deleted when they are older, whatever their mount allows; null: no limit but the mount's. */
  limitDays: number | null;
}

export interface CameraRecord extends CameraSettings {
  id: number;
  revision: number;
  /** Its place on the wall. */
  order: number;
  hasPassword: boolean;
  codec: string;
  /** "idle": nobody asks for its picture; "unknown": the recorder does not run. */
  state: "running" | "connecting" | "no-signal" | "disabled" | "idle" | "unknown";
  /** Why there is no signal; may be empty. */
  reason: string;
  /** What becomes of its recording, such as "recording" or "disk-full"; empty where it has none. */
  recording: string;
  /** Unix seconds, of the state. */
  since: number | null;
  /** Pictures and bytes a second. */
  rate: number;
  bytes: number;
  /** Null in a list without it. */
  footage: { events: number; bytes: number; oldest: number | null } | null;
}

/** The ids of all cameras in their order. */
export interface CameraOrder {
  id: number[];
  revision: number;
}

export interface CameraSetupList {
  camera: CameraRecord[];
  order: CameraOrder;
  group: Named[];
  mount: (Named & { default: boolean })[];
  /** Common paths of RTSP addresses. */
  path: { name: string; path: string }[];
}

export interface ProbeRequest {
  address: string;
  account: string;
  insecure: boolean;
  /** Absent: the one that `camera` has. */
  password?: string;
  camera?: number;
}

export interface ProbeResult {
  codec: string;
  width: number;
  height: number;
  rate: number;
  audio: boolean;
  /** A JPEG picture in base64; may be empty. */
  picture: string;
}

export interface ProbeFailure {
  failed: string;
  message: string;
}

/** Longer than a camera may take to answer. */
const kProbeTimeoutMs = 40_000;
const kApi = "VEXO.Camera";

export class CameraSetup {
  readonly #server: Server;

  constructor(server: Server) {
    this.#server = server;
  }

  /** Counting footage takes the server half a second where there is much: leave it out of what is asked often. */
  list({ footage }: { footage: boolean }): Promise<CameraSetupList> {
    return this.#call("List", { footage });
  }

  /** Connects to a camera that need not be known yet. */
  probe(request: ProbeRequest, signal: AbortSignal): Promise<ProbeResult | ProbeFailure> {
    return this.#server.call(kApi, "Probe", {}, { json: request, signal, timeoutMs: kProbeTimeoutMs });
  }

  /** `codec` as a probe reported it; empty: the recorder finds out. */
  async add(settings: Omit<CameraSettings, "enabled">, password: string, codec: string): Promise<CameraRecord> {
    const added = { ...settings, password, ...(codec ? { codec } : {}) };
    return (await this.#call<{ camera: CameraRecord }>("Add", added)).camera;
  }

  /**
   * Without `password` the stored one stays; empty: none. Where a new limit would delete recordings nothing changes and
   * the loss comes back, unless `confirm`. Rejects with status 409 and the record where `revision` is stale.
   */
  set(
    id: number,
    revision: number,
    changes: Partial<CameraSettings> & { password?: string },
    confirm: boolean,
  ): Promise<{ camera: CameraRecord } | Unconfirmed> {
    return this.#call("Set", { id, revision, ...changes, ...(confirm ? { confirm } : {}) });
  }

  remove({ id, revision }: RecordKey, footage: "keep" | "remove"): Promise<unknown> {
    return this.#call("Remove", { id, revision, footage });
  }

  /** Takes the ids of all cameras. Rejects with status 409 and the order as it is where `revision` is stale. */
  async order(id: number[], revision: number): Promise<CameraOrder> {
    return (await this.#call<{ order: CameraOrder }>("Order", { id, revision })).order;
  }

  #call<Data>(method: string, json: unknown): Promise<Data> {
    return this.#server.call<Data>(kApi, method, {}, { json });
  }
}
