// SPDX-License-Identifier: Apache-2.0
//
// Cameras, groups, e-maps, accounts, mounts and settings, with revisions, and the password "right" of the manager.

import type { AccessToken } from "../../../client/src/wire/access_tokens";
import type { CameraRecord } from "../../../client/src/wire/camera_setup";
import type { DeviceRecord } from "../../../client/src/wire/devices";
import type { EmapRecord } from "../../../client/src/wire/emap_setup";
import type { GroupRecord } from "../../../client/src/wire/groups";
import type { HostLoss, HostRecord } from "../../../client/src/wire/hosts";
import type { MountRecord } from "../../../client/src/wire/mounts";
import type { OpenSession, UserRecord } from "../../../client/src/wire/accounts";
import type { LogLevels, LogTail, OfferedCertificate, SettingRecord, SystemStatus } from "../../../client/src/wire/system";

type Request = Record<string, never> & { id: number };
type Answer = { status: number; success: boolean; data?: unknown; error?: unknown };
export type SetupMethod = (request: Request) => Answer;

const ok = (data: unknown): Answer => ({ status: 200, success: true, data });
const failed = (code: number, message: string, data: unknown = null): Answer => ({
  status: code,
  success: false,
  error: { code, message, data },
});

export const kTokenSecret = `lht_${"0123456789abcdef".repeat(4)}`;
/** A valid one. */
export const kCode = "008J-4CT4-ANK7-F24S-04HM-ASW9-NF6Y-Z93N";

export class FakeSetup {
  readonly camera: CameraRecord[] = [];
  /** What stands for the order of the cameras. */
  orderRevision = 1;
  readonly user: UserRecord[] = [];
  /** The account that is logged in, and its sessions. */
  userId = 1;
  readonly session: OpenSession[] = [];
  readonly token: AccessToken[] = [];
  /** Of each account. */
  readonly preferences = new Map<number, Record<string, unknown>>();
  readonly mount: MountRecord[] = [];
  readonly group: GroupRecord[] = [];
  readonly emap: EmapRecord[] = [];
  readonly device: DeviceRecord[] = [];
  readonly host: HostRecord[] = [];
  /** Why no host is paired with, and why none answers; empty: they are, and do. */
  whyNoHost = "";
  /** What users are denied of a host of the same name that is added. */
  hostReplaced: HostLoss | null = null;
  /** All that was asked for but lists, with what it was asked with. */
  readonly asked: [method: string, request: Record<string, unknown>][] = [];
  readonly setting: SettingRecord[] = [];
  status: SystemStatus | null = null;
  /** What is found in the files of a certificate; null where they are no pair. */
  offered: OfferedCertificate | null = null;
  log: LogLevels = { category: [], others: "error", known: ["debug", "error", "off"], revision: 1 };
  tail: LogTail = { entry: [], files: true, journal: false };
  /** The answer of a probe. */
  probe: unknown = null;
  /** What a new limit deletes. */
  loss: unknown = null;

  readonly methods: Record<string, SetupMethod> = {
    "VEXO.Camera.List": () => ok({ camera: this.camera, order: this.#order(), group: this.group, mount: [], path: [{ name: "first stream", path: "/stream1" }] }),
    "VEXO.Camera.Probe": () => ok(this.probe),
    "VEXO.Camera.Add": (request) => this.#note("Camera.Add", request, ok({ camera: { revision: 1, ...request } })),
    "VEXO.Camera.Set": (request) => (request.limitDays && !request.confirm ? ok({ confirm: this.loss }) : this.#set("camera", request)),
    "VEXO.Camera.Order": (request) => this.#setOrder(request),
    "VEXO.User.List": () => ok({ user: this.user, camera: this.camera, group: [{ id: 1, name: "Outside", camera: [2] }], door: [], ioModule: [], emap: [] }),
    "VEXO.User.Set": (request) => ("reauth" in request && request.reauth !== "right" ? failed(403, "The password is wrong.") : this.#set("user", request)),
    "VEXO.User.Sessions": () => ok({ session: this.session }),
    "VEXO.User.EndSessions": (request) => this.#endSessions(request),
    "VEXO.User.Preferences": () => ok({ preferences: this.preferences.get(this.userId) ?? {} }),
    "VEXO.User.SetPreferences": (request) => this.#setPreferences(request),
    "VEXO.Token.List": () => ok({ token: this.token, camera: this.camera }),
    "VEXO.Token.Add": (request) => this.#addToken(request),
    "VEXO.Token.Remove": (request) => {
      this.token.splice(this.token.findIndex(({ id }) => id === request.id), 1);
      return this.#note("Token.Remove", request, ok({}));
    },
    "VEXO.Mount.List": () => ok({ mount: this.mount }),
    "VEXO.Mount.Set": (request) => (request.confirm ? this.#set("mount", request) : ok({ confirm: this.loss })),
    "VEXO.Group.List": () => ok({ group: this.group }),
    "VEXO.Group.Add": (request) => this.#note("Group.Add", request, ok({ group: { ...request, id: 7, revision: 1, deniedTo: [] } })),
    "VEXO.Group.Set": (request) => this.#set("group", request),
    "VEXO.Device.List": () => ok({ device: this.device }),
    "VEXO.Device.Add": (request) => this.#note("Device.Add", request, ok({ device: { ...request, id: 3, revision: 1 } })),
    "VEXO.Device.Set": (request) => this.#set("device", request),
    "VEXO.Emap.List": () => ok({ emap: this.emap }),
    "VEXO.Emap.Rename": ({ emap, ...rest }) => this.#set("emap", { ...rest, id: Number(emap) } as Request),
    "VEXO.Server.List": () => ok({ server: this.host, centralManagement: false }),
    "VEXO.Server.Check": () => ok({ answers: !this.whyNoHost, reason: this.whyNoHost }),
    "VEXO.Server.Invite": (request) => ("reauth" in request && request.reauth !== "right" ? failed(403, "The password is wrong.") : ok({ code: kCode, seconds: 600 })),
    "VEXO.Server.Add": (request) => (this.whyNoHost ? failed(502, "no", { reason: this.whyNoHost }) : this.#addHost(request)),
    "VEXO.Server.Remove": (request) => this.#removeHost(request),
    "VEXO.System.Audit": () => ok({ entry: [], more: false }),
    "VEXO.System.Status": () => ok(this.status),
    "VEXO.System.Settings": () => ok({ setting: this.setting }),
    "VEXO.System.SetCertificate": (request) => this.#setCertificate(request),
    "VEXO.System.LogTail": ({ limit }) => ok({ ...this.tail, entry: this.tail.entry.slice(0, Number(limit)) }),
    "VEXO.System.LogLevels": () => ok({ log: this.log }),
    "VEXO.System.SetLogLevels": (request) => this.#setLog(request),
    "VEXO.System.SetSetting": (request) => this.#setSetting(request),
  };

  #set(kind: "camera" | "user" | "mount" | "group" | "emap" | "device", request: Request): Answer {
    const { id, revision, ...changes } = request;
    const record = this[kind].find((one) => one.id === id)!;
    if (record.revision !== revision) return failed(409, "It was changed meanwhile.", record);
    Object.assign(record, changes, { revision: record.revision + 1 });
    return this.#note(kind, request, ok({ [kind]: record }));
  }

  #addToken(request: Request): Answer {
    const { name, camera, kind, reauth } = request as unknown as AccessToken & { reauth: string };
    if (reauth !== "right") return failed(403, "The password is wrong.");
    this.token.push({ id: 5, name, camera, kind, created: 1, by: "admin", lastUse: null, expires: null });
    return this.#note("Token.Add", request, ok({ secret: kTokenSecret }));
  }

  #endSessions(request: Request): Answer {
    const { key } = request as unknown as { key?: string };
    const stay = this.session.filter((one) => (key === undefined ? one.current : one.key !== key));
    const ended = this.session.length - stay.length;
    this.session.splice(0, Infinity, ...stay);
    return this.#note("EndSessions", request, ok({ ended }));
  }

  #setPreferences(request: Request): Answer {
    const { id, preferences } = request as unknown as { id: number; preferences: Record<string, unknown> };
    if (id !== this.userId) return failed(403, "these are another account's preferences");
    const all = Object.entries({ ...this.preferences.get(id), ...preferences });
    const merged = Object.fromEntries(all.filter(([, value]) => value !== null));
    if (JSON.stringify(merged).length > 16_384) return failed(400, "the preferences of an account have at most 16384 bytes");
    this.preferences.set(id, merged);
    return ok({ preferences: merged });
  }

  #order() {
    return { id: this.camera.map(({ id }) => id), revision: this.orderRevision };
  }

  #setOrder(request: Request): Answer {
    const { id, revision } = request as unknown as { id: number[]; revision: number };
    if (revision !== this.orderRevision) return failed(409, "It was changed meanwhile.", this.#order());
    this.orderRevision += 1;
    this.camera.sort((one, other) => id.indexOf(one.id) - id.indexOf(other.id));
    this.camera.forEach((camera, at) => (camera.order = at + 1));
    return this.#note("Camera.Order", request, ok({ order: this.#order() }));
  }

  #addHost(request: Request): Answer {
    const { name, address, port, reauth, confirm } = request as unknown as HostRecord & { reauth: string; confirm: boolean };
    if (reauth !== "right") return failed(403, "The password is wrong.");
    if (this.hostReplaced && !confirm) return ok({ confirm: this.hostReplaced });
    const record = { id: 9, revision: 1, name, address, port, enabled: true, camera: [{ id: 7, idOnServer: 1, name: "Yard" }], denial: [] };
    this.host.push(record);
    return this.#note("Server.Add", request, ok({ server: record }));
  }

  #removeHost(request: Request): Answer {
    const { id, confirm } = request as unknown as { id: number; confirm: boolean };
    const at = this.host.findIndex((one) => one.id === id);
    if (this.host[at]!.denial.length > 0 && !confirm) return ok({ confirm: this.host[at] });
    return this.#note("Server.Remove", request, ok({ removed: this.host.splice(at, 1)[0] }));
  }

  #setCertificate(request: Request): Answer {
    const { confirm, reauth } = request as unknown as { confirm?: boolean; reauth?: string };
    if (!this.offered) return failed(400, "the key is that of another certificate");
    if (!confirm) return ok({ confirm: this.offered });
    if (reauth !== "right") return failed(403, "your own password is wrong");
    this.status!.certificate = this.offered;
    return this.#note("SetCertificate", request, ok({ certificate: { ...this.offered, reloaded: true } }));
  }

  #setLog(request: Request): Answer {
    const { revision, others = this.log.others, category } = request as unknown as LogLevels;
    if (revision !== this.log.revision) return failed(409, "It was changed meanwhile.", this.log);
    const level = (name: string) => category.find((one) => one.name === name)?.level;
    const now = this.log.category.map((one) => ({ ...one, level: level(one.name) ?? one.level }));
    this.log = { ...this.log, others, category: now, revision: revision + 1 };
    return this.#note("SetLogLevels", request, ok({ log: this.log }));
  }

  #setSetting(request: Request): Answer {
    const { name, value, revision } = request as unknown as SettingRecord;
    const record = this.setting.find((one) => one.name === name)!;
    if (record.revision !== revision) return failed(409, "It was changed meanwhile.", record);
    Object.assign(record, { value, revision: revision + 1 });
    return this.#note("SetSetting", request, ok({ setting: record }));
  }

  #note(method: string, request: Request, answer: Answer): Answer {
    this.asked.push([method, request]);
    return answer;
  }
}

export function cameraRecord(id: number, name: string): CameraRecord {
  const plan = { mode: "always" as const, segment: 600, pre: 10, post: 30, mount: 0, profile: 0, hours: "1".repeat(168) };
  const settings = { name, enabled: true, account: "", insecure: false, audio: false, ptz: false, liveProfile: 0, group: [], plan, limitDays: null };
  const seen = { codec: "h264", state: "connecting" as const, reason: "", recording: "", since: null, rate: 0, bytes: 0 };
  const footage = { events: 0, bytes: 0, oldest: null };
  return { id, revision: 1, order: id, hasPassword: true, source: [{ profile: 0, address: `rtsp://camera-${id}/a` }], footage, ...settings, ...seen };
}
