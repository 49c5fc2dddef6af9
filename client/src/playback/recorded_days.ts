// SPDX-License-Identifier: Apache-2.0
//
// Which days have recordings, in days of the user's own time zone.
//
// Why so        The server counts days of 24 hours from any start. Local midnights are 24 hours apart but for two days a
//               year, so a question for many days is cut where the clock is changed. A day of 25 hours is asked for as two
//               from its start; one of 23 hours looks an hour into the next.

import type { Recordings } from "../wire/recordings";
import { RequestQueue } from "./request_queue";

const kDayMs = 86_400_000;
/** The most the server answers at once. */
const kMostDays = 128;

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

/** Questions for as many days of 24 hours each as there are in a row. */
export function questionsFor(days: readonly number[]): { startMs: number; count: number }[] {
  const questions: { startMs: number; count: number }[] = [];
  for (const startMs of days) {
    const last = questions.at(-1);
    if (last && last.startMs + last.count * kDayMs === startMs && last.count < kMostDays) last.count += 1;
    else questions.push({ startMs, count: 1 });
  }
  return questions;
}

export class RecordedDays {
  readonly #recordings: Recordings;
  readonly #changed: () => void;
  readonly #requests = new RequestQueue();
  /** By camera (0: any of the chosen ones) and midnight. */
  readonly #known = new Map<string, boolean>();

  constructor(recordings: Recordings, changed: () => void) {
    this.#recordings = recordings;
    this.#changed = changed;
  }

  /** Undefined while nobody knows; ask for it then. */
  has(camera: number, dayMs: number): boolean | undefined {
    return this.#known.get(`${camera} ${dayMs}`);
  }

  /** Asks for those that are not known; of today it is asked again. */
  ask(cameras: readonly number[], fromMs: number, toMs: number): void {
    for (const camera of cameras) {
      const days = midnights(fromMs, Math.min(toMs, Date.now())).filter((day) => this.has(camera, day) === undefined);
      for (const question of questionsFor(days)) void this.#load(camera, question);
    }
  }

  /** Forgets what may have changed: today gets its first recording, retention takes the last ones. */
  forget(): void {
    this.#known.clear();
  }

  async #load(camera: number, { startMs, count }: { startMs: number; count: number }): Promise<void> {
    await this.#requests.run(`${camera} ${startMs} ${count}`, async () => {
      const days = await this.#recordings.days(startMs / 1000, count, [camera]);
      days.forEach((day, index) => this.#known.set(`${camera} ${startMs + index * kDayMs}`, day));
      this.#changed();
    });
  }
}
