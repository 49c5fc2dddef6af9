// SPDX-License-Identifier: Apache-2.0
//
// What is known of the cameras' past: events, marks and coverage, fetched a few hours at a time and kept.
//
// Why so        A timeline that is dragged asks for the same hours again and again, and each answer covers hours of all
//               cameras. So the past is cut into spans of fixed borders; those that touch the present are fetched anew.

import { ServerError } from "../wire/server";
import type { Footage, FootageRef, Recordings } from "../wire/recordings";
import { segmentsOf, type Segment } from "./coverage";
import { RequestQueue } from "./request_queue";

const kSpanS = 6 * 3600;
const kIntervalS = 5;
/** Spans kept, of all cameras together; the oldest asked for go first. */
const kMostSpans = 4_000;
const kNoSuchApi = 404;

interface Span {
  events: Footage[];
  marks: Footage[];
  segments: Segment[];
  /** Part of it was still to come when it was fetched. */
  isOpen: boolean;
}

export class FootageCache {
  readonly #recordings: Recordings;
  readonly #changed: () => void;
  readonly #requests = new RequestQueue();
  readonly #spans = new Map<string, Span>();
  /** Answers put together, until one of their spans changes. */
  readonly #answers = new Map<string, { version: number; footage: Footage[]; segments: Segment[] }>();
  #version = 0;

  /** `changed` is called when more is known. */
  constructor(recordings: Recordings, changed: () => void) {
    this.#recordings = recordings;
    this.#changed = changed;
  }

  get isBusy(): boolean {
    return this.#requests.isBusy;
  }

  /** What the last request failed with, for the user; empty when it succeeded. */
  get error(): string {
    return this.#requests.error;
  }

  /** Fetches what is not known of the cameras from `fromS` to `toS`; with `anew` also what was still to come. */
  async ask(cameras: readonly number[], fromS: number, toS: number, anew = false): Promise<void> {
    const last = Math.min(toS, Date.now() / 1000);
    const work: Promise<void>[] = [];
    for (let start = spanStart(fromS); start < last; start += kSpanS) {
      const wanted = cameras.filter((camera) => {
        const span = this.#spans.get(nameOf(camera, start));
        return !span || (anew && span.isOpen);
      });
      if (wanted.length > 0) work.push(this.#requests.run(`${start} ${wanted}`, () => this.#load(wanted, start)));
    }
    await Promise.all(work);
  }

  /** Events and marks of a camera that touch the span, by start, and what of it was recorded; as far as it is known. */
  of(camera: number, fromS: number, toS: number): { footage: Footage[]; segments: Segment[] } {
    const [first, last] = [spanStart(fromS), spanStart(toS)];
    const name = `${camera} ${first} ${last}`;
    const kept = this.#answers.get(name);
    if (kept?.version === this.#version) return kept;
    const footage = new Map<string, Footage>();
    const segments: Segment[] = [];
    for (let start = first; start <= last; start += kSpanS) {
      const span = this.#spans.get(nameOf(camera, start));
      for (const one of [...(span?.events ?? []), ...(span?.marks ?? [])]) footage.set(`${one.kind}${one.id}`, one);
      for (const segment of span?.segments ?? []) addSegment(segments, segment);
    }
    const sorted = [...footage.values()].sort((one, other) => one.start - other.start || one.id - other.id);
    const answer = { version: this.#version, footage: sorted, segments };
    if (this.#answers.size > 256) this.#answers.clear();
    this.#answers.set(name, answer);
    return answer;
  }

  /** The newest that is known of it. */
  newest({ kind, id }: FootageRef, camera: number, startS: number): Footage | null {
    return this.of(camera, startS, startS + 1).footage.find((one) => one.kind === kind && one.id === id) ?? null;
  }

  async #load(cameras: readonly number[], start: number): Promise<void> {
    const isOpen = Date.now() / 1000 < start + kSpanS + 60;
    const end = start + kSpanS;
    const [histories, marks] = await Promise.all([
      this.#recordings.history(start, end, cameras, kIntervalS),
      // A host without an event API has no marks.
      this.#recordings.marks(start, end, cameras).catch((error: ServerError) => {
        if (error.status === kNoSuchApi) return [];
        throw error;
      }),
    ]);
    for (const camera of cameras) {
      const history = histories.find((one) => one.camera === camera);
      const coverage = history?.coverage;
      this.#keep(nameOf(camera, start), {
        events: history?.events ?? [],
        marks: marks.filter((mark) => mark.camera === camera),
        segments: coverage ? segmentsOf(start, end, coverage.interval, coverage.runs) : [],
        isOpen: isOpen || (history?.events.some((event) => event.isGrowing) ?? false),
      });
    }
    this.#version += 1;
    this.#changed();
  }

  #keep(name: string, span: Span): void {
    this.#spans.delete(name);
    this.#spans.set(name, span);
    for (const oldest of this.#spans.keys()) {
      if (this.#spans.size <= kMostSpans) break;
      this.#spans.delete(oldest);
    }
  }
}

function spanStart(timeS: number): number {
  return Math.floor(timeS / kSpanS) * kSpanS;
}

function nameOf(camera: number, start: number): string {
  return `${camera} ${start}`;
}

/** Segments that meet at the border of two spans become one. */
function addSegment(segments: Segment[], { startS, stopS, isEvent }: Segment): void {
  const last = segments.at(-1);
  if (last && last.stopS === startS && last.isEvent === isEvent) last.stopS = stopS;
  else segments.push({ startS, stopS, isEvent });
}
