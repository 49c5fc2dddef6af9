// SPDX-License-Identifier: Apache-2.0
//
// Exports of footage as files, and recordings that are protected from retention.

import { kindParameter, type Footage, type FootageRef } from "./footage";
import { address, type Server } from "./server";

/** What an export will be. */
export interface ExportPlan {
  /** Of the file. */
  name: string;
  sizeBytes: number;
  files: number;
  /** How much is missing of the cameras that were not recorded all the time. */
  missing: { camera: string; seconds: number }[];
}

interface RawPlan {
  name: string;
  size_bytes: number;
  camera: { name: string; file: unknown[]; gap: { begin: { utc: string }; end: { utc: string } }[] }[];
}

const kApi = "VEXO.Event";

export class Exports {
  readonly #server: Server;

  constructor(server: Server) {
    this.#server = server;
  }

  /** Rejects with status 404 where nothing of it is recorded. */
  async plan(cameras: readonly number[], fromS: number, toS: number): Promise<ExportPlan> {
    const { name, size_bytes, camera } = await this.#server.call<RawPlan>(kApi, "PlanExport", asked(cameras, fromS, toS));
    const missing = camera.map(({ name: camera, gap }) => ({
      camera,
      seconds: gap.reduce((sum, { begin, end }) => sum + (Date.parse(end.utc) - Date.parse(begin.utc)) / 1000, 0),
    }));
    const files = camera.reduce((sum, { file }) => sum + file.length, 0);
    return { name, sizeBytes: size_bytes, files, missing: missing.filter(({ seconds }) => seconds > 0) };
  }

  /** The cameras whose recordings the caller may play, but not take away. */
  async denied(): Promise<Set<number>> {
    type Rights = { id: number; playback: boolean; export: boolean };
    const { camera } = await this.#server.call<{ camera: Rights[] }>("VEXO.Catalog", "Rights", {});
    return new Set(camera.filter((one) => one.playback && !one.export).map(({ id }) => id));
  }

  address(cameras: readonly number[], fromS: number, toS: number): string {
    return address(kApi, "Export", asked(cameras, fromS, toS));
  }

  /** The file as it comes; `signal` cancels it. Rejects with the server's refusal. */
  async open(cameras: readonly number[], fromS: number, toS: number, signal: AbortSignal): Promise<Response> {
    return this.#server.media(kApi, "Export", asked(cameras, fromS, toS), { signal, noAnswer: "The recordings could not be read." });
  }

  /** Keeps the recordings of the footage, or gives them back to retention. For managers. */
  async keep({ kind, id }: FootageRef, isKept: boolean, note: string): Promise<void> {
    const form = { event: String(id), ...kindParameter(kind), keep: String(isKept), note };
    await this.#server.call<unknown>(kApi, "Keep", {}, { form });
  }
}

function asked(cameras: readonly number[], fromS: number, toS: number): Record<string, string> {
  return { cameralists: cameras.join(), from: String(fromS), to: String(toS), ...zoneAt(fromS) };
}

/** The file is named after its start in this browser's time zone. */
export function downloadAddress({ kind, id, start }: Footage): string {
  return address(kApi, "Download", { event: String(id), ...kindParameter(kind), ...zoneAt(start) });
}

/** This browser's time zone at that time, for names and times in files. */
function zoneAt(unixS: number): Record<string, string> {
  return { utc_offset_min: String(-new Date(unixS * 1000).getTimezoneOffset()) };
}
