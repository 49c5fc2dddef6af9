// SPDX-License-Identifier: Apache-2.0
//
// Events, marks and coverage of the cameras, fetched a few hours at a time and kept.
//
// Why so        A timeline that is dragged asks for the same hours again and again, and each answer covers hours of all
//               cameras. So time is cut into spans of fixed borders; those that reach the present are fetched again.

import { isSameFootage, type Footage } from "../wire/footage";
import type { Recordings } from "../wire/recordings";
import { ServerError } from "../wire/server";
import { segmentsOf, type Segment } from "./coverage";
import { RequestQueue } from "./request_queue";

const kSpanS = 6 * 3600;
const kIntervalS = 5;
/** Spans kept, of all cameras together; those fetched longest ago go first. */
const kMaxSpans = 4_000;
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
  readonly requests = new RequestQueue();
  readonly #spans = new Map<string, Span>();
  /** What `get` has put together, valid until a span changes. */
  readonly #merged = new Map<string, { version: number; footage: Footage[]; segments: Segment[] }>();
  #version = 0;

  /** `changed` is called when more is known. */
  constructor(recordings: Recordings, changed: () => void) {
    this.#recordings = recordings;
    this.#changed = changed;
  }

  /** Fetches what is not known of the cameras from `fromS` to `toS`; with `refresh` also what was incomplete. */
  async load(cameras: readonly number[], fromS: number, toS: number, refresh = false): Promise<void> {
    const last = Math.min(toS, Date.now() / 1000);
    const work: Promise<void>[] = [];
    for (let start = spanStart(fromS); start < last; start += kSpanS) {
      const missing = cameras.filter((camera) => {
        const span = this.#spans.get(keyOf(camera, start));
        return !span || (refresh && span.isOpen);
      });
      if (missing.length > 0) work.push(this.requests.run(`${start} ${missing}`, () => this.#fetch(missing, start)));
    }
    await Promise.all(work);
  }

  /** What is known of a camera's events and marks that touch the span, by start, and of what was recorded. */
  get(camera: number, fromS: number, toS: number): { footage: Footage[]; segments: Segment[] } {
    const [first, last] = [spanStart(fromS), spanStart(toS)];
    const key = `${camera} ${first} ${last}`;
    const kept = this.#merged.get(key);
    if (kept?.version === this.#version) return kept;
    const footage: Footage[] = [];
    const segments: Segment[] = [];
    for (let start = first, before: Span | undefined; start <= last; start += kSpanS) {
      const span = this.#spans.get(keyOf(camera, start));
      const known = before;
      // The span before may have been fetched before the event was reported or stored.
      const isKnown = (one: Footage) => [known?.events, known?.marks].some((list) => list?.some((other) => isSameFootage(other, one)));
      const isNew = (one: Footage) => one.start >= start || !isKnown(one);
      if (span) footage.push(...span.events.filter(isNew), ...span.marks.filter(isNew));
      for (const segment of span?.segments ?? []) addSegment(segments, segment);
      before = span;
    }
    footage.sort((one, other) => one.start - other.start || one.id - other.id);
    const answer = { version: this.#version, footage, segments };
    if (this.#merged.size > 256) this.#merged.clear();
    this.#merged.set(key, answer);
    return answer;
  }

  /** Lets `load` with `refresh` fetch again what touches the span: something of it was changed. */
  expire({ camera, start, stop }: Footage): void {
    for (let at = spanStart(start); at <= stop; at += kSpanS) {
      const span = this.#spans.get(keyOf(camera, at));
      if (span) span.isOpen = true;
    }
  }

  async #fetch(cameras: readonly number[], start: number): Promise<void> {
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
    const hasKept = histories.some(({ events }) => events.some(({ isKept }) => isKept));
    const kept = new Map((hasKept ? await this.#recordings.kept(start, end, cameras) : []).map((one) => [one.id, one]));
    for (const camera of cameras) {
      const history = histories.find((one) => one.camera === camera);
      const coverage = history?.coverage;
      this.#keep(keyOf(camera, start), {
        events: (history?.events ?? []).map((one) => ({ ...one, ...notesOf(kept.get(one.id)) })),
        marks: marks.filter((mark) => mark.camera === camera),
        segments: coverage ? segmentsOf(start, end, coverage.interval, coverage.runs) : [],
        isOpen: isOpen || (history?.events.some((event) => event.isGrowing) ?? false),
      });
    }
    this.#version += 1;
    this.#changed();
  }

  #keep(key: string, span: Span): void {
    this.#spans.delete(key);
    this.#spans.set(key, span);
    for (const oldest of this.#spans.keys()) {
      if (this.#spans.size <= kMaxSpans) break;
      this.#spans.delete(oldest);
    }
  }
}

function notesOf(kept: Footage | undefined): Partial<Footage> {
  return kept ? { note: kept.note, keeper: kept.keeper } : {};
}

function spanStart(timeS: number): number {
  return Math.floor(timeS / kSpanS) * kSpanS;
}

function keyOf(camera: number, start: number): string {
  return `${camera} ${start}`;
}

/** Segments that meet at the border of two spans become one. */
function addSegment(segments: Segment[], { startS, stopS, isEvent }: Segment): void {
  const last = segments.at(-1);
  if (last && last.stopS === startS && last.isEvent === isEvent) last.stopS = stopS;
  else segments.push({ startS, stopS, isEvent });
}
