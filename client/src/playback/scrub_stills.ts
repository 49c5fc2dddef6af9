// SPDX-License-Identifier: Apache-2.0
//
// The pictures of a playhead that is dragged: of each camera the newest that was asked for, and few requests at once.
//
// Why so        A pointer asks for sixty times a second, and each picture is a process on the server. What was not
//               begun before the next time was asked for is never fetched. The active camera comes first; the others
//               get theirs when the pointer rests. Pictures that come in another order are dropped, so that they only
//               go the way of the pointer. A picture is that of a key frame, which stands for every time until the one
//               it was asked for: within seconds of H.264 nothing more is fetched. Nor is what is on its way already.

import { isSameFootage, type Footage } from "../wire/footage";
import type { Recordings, Still } from "../wire/recordings";

const kMaxConcurrent = 3;
const kKeptSpans = 24;
/** Few, so that browsers keep what they have seen. */
export const kStillWidths = [320, 640, 960, 1280] as const;

export interface ScrubRequest {
  camera: number;
  /** Null where the camera has nothing then. */
  footage: Footage | null;
  atMs: number;
  widthPx: number;
}

/** A still that is the answer for all of these times. */
interface Span {
  footage: Footage;
  widthPx: number;
  fromMs: number;
  toMs: number;
  still: Still;
}

/** `show` gets null where there is no picture. */
export type ShowStill = (camera: number, still: Still | null) => Promise<void>;

export class ScrubStills {
  readonly #recordings: Recordings;
  readonly #show: ShowStill;
  #wanted: ScrubRequest[] = [];
  /** What is being fetched, and the number of the last request for it. */
  #running = new Map<ScrubRequest, number>();
  #asked = 0;
  /** By camera, the number of the request that was answered last, and its answer. */
  readonly #shown = new Map<number, { number: number; still: Still | null }>();
  /** Those that were used last come first. */
  #spans: Span[] = [];
  #end = new AbortController();

  constructor(recordings: Recordings, show: ShowStill) {
    this.#recordings = recordings;
    this.#show = show;
  }

  /** Asks for one time of several cameras, the active one first. */
  request(wanted: readonly ScrubRequest[]): void {
    this.#wanted = [...wanted];
    this.#pump();
  }

  /** Nothing that was asked for is shown any more. */
  stop(): void {
    this.#end.abort();
    this.#end = new AbortController();
    this.#wanted = [];
    this.#running = new Map();
    this.#shown.clear();
    this.#spans = [];
  }

  #pump(): void {
    while (this.#wanted.length > 0 && this.#running.size < kMaxConcurrent) {
      void this.#fetch(this.#wanted.shift()!, (this.#asked += 1));
    }
  }

  async #fetch(request: ScrubRequest, number: number): Promise<void> {
    const { camera, footage, atMs, widthPx } = request;
    const signal = this.#end.signal;
    if (!footage) return this.#deliver(number, camera, null);
    const known = this.#find(footage, atMs, widthPx);
    if (known) return this.#deliver(number, camera, known.still);
    const running = this.#running;
    const same = [...running.keys()].find(
      (one) => one.atMs === atMs && one.widthPx >= widthPx && one.footage && isSameFootage(one.footage, footage),
    );
    if (same) return void running.set(same, number);
    running.set(request, number);
    // Where one fails the picture before stays.
    const still = await this.#recordings.still(footage, atMs, widthPx, signal).catch(() => undefined);
    const last = running.get(request)!;
    running.delete(request);
    if (!signal.aborted && still) this.#keep({ footage, widthPx, fromMs: Math.min(still.capturedMs, atMs), toMs: atMs, still });
    // Who asked while it was on its way gets an attempt of their own.
    else if (!signal.aborted && last !== number) void this.#fetch(request, last);
    this.#pump();
    if (!signal.aborted && still) await this.#deliver(last, camera, still);
  }

  async #deliver(number: number, camera: number, still: Still | null): Promise<void> {
    const last = this.#shown.get(camera);
    if (last && number < last.number) return;
    this.#shown.set(camera, { number, still });
    if (!last || still === null || still !== last.still) await this.#show(camera, still);
  }

  #find(footage: Footage, atMs: number, widthPx: number): Span | undefined {
    const found = this.#spans.find(
      (one) => isSameFootage(one.footage, footage) && one.widthPx >= widthPx && one.fromMs <= atMs && atMs <= one.toMs,
    );
    if (found) this.#spans = [found, ...this.#spans.filter((one) => one !== found)];
    return found;
  }

  /** In place of others of the same picture, which came for earlier or for later times. */
  #keep(span: Span): void {
    const isSame = (one: Span) => isSameFootage(one.footage, span.footage) && one.widthPx === span.widthPx && one.fromMs === span.fromMs;
    const toMs = Math.max(span.toMs, ...this.#spans.filter(isSame).map((one) => one.toMs));
    this.#spans = [{ ...span, toMs }, ...this.#spans.filter((one) => !isSame(one))].slice(0, kKeptSpans);
  }
}
