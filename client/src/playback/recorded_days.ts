// SPDX-License-Identifier: Apache-2.0
//
// Which days have recordings, in days of the user's own time zone.
//
// Why so        The server counts days of 24 hours from any start. Local midnights are 24 hours apart but for two days
//               a year, so a request for many days is split there. Of a day of 25 hours the last hour is ignored; one
//               of 23 hours includes the first hour of the next.

import type { Recordings } from "../wire/recordings";
import { RequestQueue } from "./request_queue";

const kDayMs = 86_400_000;
/** The most days that the server answers for at once. */
const kMaxDays = 128;

/** The local midnight at or before the time, `days` later. */
export function midnight(unixMs: number, days = 0): number {
  const time = new Date(unixMs);
  return new Date(time.getFullYear(), time.getMonth(), time.getDate() + days).getTime();
}

/** Local midnights from the one at or before `fromMs` up to, not including, `toMs`. */
export function midnights(fromMs: number, toMs: number): number[] {
  const days: number[] = [];
  for (let day = midnight(fromMs); day < toMs; day = midnight(day, 1)) days.push(day);
  return days;
}

/** One request for each row of days that are 24 hours apart. */
export function requestsFor(days: readonly number[]): { startMs: number; count: number }[] {
  const requests: { startMs: number; count: number }[] = [];
  for (const startMs of days) {
    const last = requests.at(-1);
    if (last && last.startMs + last.count * kDayMs === startMs && last.count < kMaxDays) last.count += 1;
    else requests.push({ startMs, count: 1 });
  }
  return requests;
}

export class RecordedDays {
  readonly #recordings: Recordings;
  readonly #changed: () => void;
  readonly #requests = new RequestQueue();
  /** By camera and midnight. */
  readonly #known = new Map<string, boolean>();

  constructor(recordings: Recordings, changed: () => void) {
    this.#recordings = recordings;
    this.#changed = changed;
  }

  /** Undefined where it was not loaded. */
  has(camera: number, dayMs: number): boolean | undefined {
    return this.#known.get(`${camera} ${dayMs}`);
  }

  /** Fetches the days that are not known; `changed` is called for each answer. */
  load(cameras: readonly number[], fromMs: number, toMs: number): void {
    for (const camera of cameras) {
      const days = midnights(fromMs, Math.min(toMs, Date.now())).filter((day) => this.has(camera, day) === undefined);
      for (const request of requestsFor(days)) void this.#fetch(camera, request);
    }
  }

  /** Call it now and then: today gets its first recording, retention deletes the last of old days. */
  clear(): void {
    this.#known.clear();
  }

  async #fetch(camera: number, { startMs, count }: { startMs: number; count: number }): Promise<void> {
    await this.#requests.run(`${camera} ${startMs} ${count}`, async () => {
      const days = await this.#recordings.days(startMs / 1000, count, [camera]);
      days.forEach((day, index) => this.#known.set(`${camera} ${startMs + index * kDayMs}`, day));
      this.#changed();
    });
  }
}
