// SPDX-License-Identifier: Apache-2.0
//
// Recordings of the web API: what was recorded when, where the frames of a time are, and the streams that play them.

import {
  footageOf,
  kindParameter,
  markOf,
  type EventKind,
  type Footage,
  type FootageKind,
  type FootageRef,
  type RawEvent,
  type RawMark,
} from "./footage";
import { boundaryOf } from "./multipart";
import { address, asServerError, ServerError, type Server } from "./server";

/** Run lengths of steps, by value: 0 nothing, 1 recorded, 2 an event. */
export type Runs = [value: number, count: number][];

export interface CameraHistory {
  camera: number;
  events: Footage[];
  /** Null where the server has no recording log of the camera. */
  coverage: { interval: number; runs: Runs } | null;
}

/** First and last second of what was recorded for that reason, and when alerts and POS transactions happened. */
export interface LaneOutline {
  continuous: readonly (readonly [startS: number, stopS: number])[];
  alarm: readonly (readonly [startS: number, stopS: number])[];
  alert: readonly number[];
  pos: readonly number[];
}

export interface CameraGroup {
  id: number;
  name: string;
  /** Those that the user may play back. */
  cameras: number[];
  /** Those that the user may watch. */
  live: number[];
}

/** Where a stream begins. With `from` the frames from there on come first, as fast as they can. */
export interface FrameStart {
  index: number;
  from?: number;
}

/** `codecs`: of H264 and H265, joined by a comma. */
export interface VideoStart {
  index: number;
  rate: number;
  key: number;
  codecs: string;
}

/** A place in the order of events, and which events are looked for from there. */
export interface EventCursor {
  cameras: readonly number[];
  kinds: readonly EventKind[];
  /** Unix seconds. */
  atS: number;
  /** The id of the event there; without one, what begins at that very second is no neighbour. */
  id?: number | undefined;
}

/** `capturedMs`: Unix milliseconds. */
export interface Still {
  jpeg: Blob;
  capturedMs: number;
}

export interface FrameOfTime {
  index: number;
  /** Frames of the whole footage, now. */
  frameCount: number;
}

/** How far a stream goes: one frame, all there is, or on with what is still being recorded. */
export type Extent = "one" | "all" | "growing";

interface RawHistory {
  camera: {
    camera_id: number;
    event: RawEvent[] | null;
    event_map?: { interval: number; runs: Runs };
  }[];
}

const kPlayer = "VEXO.Lookhaven.Player";
/** The numbers of the kinds on the wire. */
const kKinds: Record<FootageKind, number> = { event: 0, alert: 1, pos: 2 };
/** Beyond the last frame of any recording, yet far below the limit of the server's 32 bits. */
const kFarFrame = 1_000_000_000;
/** The most that the server lists at once. */
const kMaxMarks = 10_000;
const kMaxKey = 2 ** 31 - 1;
/** The most that a search for a text returns. */
export const kMaxFound = 500;

/** A stream's name, by which its rate is set. The server takes 31 bits; a random one meets no other tab's. */
export function newStreamKey(): number {
  return 1 + (crypto.getRandomValues(new Uint32Array(1))[0]! % (kMaxKey - 1));
}

export class Recordings {
  readonly #server: Server;

  constructor(server: Server) {
    this.#server = server;
  }

  /** At most 31 days. `interval` is the step of the coverage in seconds. */
  async history(fromS: number, toS: number, cameras: readonly number[], interval: number): Promise<CameraHistory[]> {
    const answer = await this.#server.call<RawHistory>(kPlayer, "EnumEvent", {
      from: String(fromS),
      to: String(toS),
      interval: String(interval),
      recording: "true",
      cameralists: cameras.join(),
    });
    return answer.camera.map(({ camera_id, event, event_map }) => ({
      camera: camera_id,
      events: (event ?? []).map((one) => footageOf(one, camera_id)),
      coverage: event_map ?? null,
    }));
  }

  /** For each of `count` days of 24 hours from `startS` on, whether one of the cameras has a recording. */
  async days(startS: number, count: number, cameras: readonly number[]): Promise<boolean[]> {
    const answer = await this.#server.call<{ available_day: number[] | null }>(kPlayer, "SearchAvaiDate", {
      start: String(startS),
      day_count: String(count),
      cameralists: cameras.join(),
    });
    return (answer.available_day ?? []).map((day) => day === 1);
  }

  /** The outline of the span, no finer than `stepS`; cameras without footage are absent. */
  async outline(fromS: number, toS: number, stepS: number, cameras: readonly number[]): Promise<(LaneOutline & { camera_id: number })[]> {
    const span = { from: String(fromS), to: String(toS), step: String(stepS) };
    const asked = { ...span, cameralists: cameras.join() };
    return (await this.#server.call<{ camera: (LaneOutline & { camera_id: number })[] }>("VEXO.Event", "Outline", asked)).camera;
  }

  async marks(fromS: number, toS: number, cameras: readonly number[]): Promise<Footage[]> {
    const answer = await this.#server.call<{ event: RawMark[] }>("VEXO.Event", "List", {
      from: String(fromS),
      to: String(toS),
      limit: String(kMaxMarks),
      cameralists: cameras.join(),
    });
    return answer.event.map(markOf);
  }

  /**
   * Alerts and POS transactions, of one kind or of both, with all of the words in their texts: the newest of all time.
   */
  async search(words: string, cameras: readonly number[], kind?: "alert" | "pos"): Promise<Footage[]> {
    const { event } = await this.#server.call<{ event: RawMark[] }>("VEXO.Event", "List", {
      text: words,
      limit: String(kMaxFound),
      cameralists: cameras.join(),
      ...(kind ? { kind } : {}),
    });
    return event.map(markOf);
  }

  /** The newest POS transactions of a camera. */
  async latestTransactions(camera: number, count: number): Promise<Footage[]> {
    const asked = { kind: "pos", limit: String(count), cameralists: String(camera) };
    const { event } = await this.#server.call<{ event: RawMark[] }>("VEXO.Event", "List", asked, { quiet: true });
    return event.map(markOf);
  }

  /** The kept recordings of the span, with their notes. */
  async kept(fromS: number, toS: number, cameras: readonly number[]): Promise<Footage[]> {
    const span = { from: String(fromS), to: String(toS), limit: String(kMaxMarks) };
    const asked = { ...span, kept: "true", cameralists: cameras.join() };
    const { event } = await this.#server.call<{ event: (RawEvent & { camera_id: number })[] }>("VEXO.Event", "List", asked);
    return event.map((one) => footageOf(one, one.camera_id));
  }

  async groups(): Promise<CameraGroup[]> {
    type RawGroup = { id: number; name: string; camera: number[]; live: number[] };
    const answer = await this.#server.call<{ group: RawGroup[] }>("VEXO.Catalog", "Groups", {});
    return answer.group.map(({ id, name, camera, live }) => ({ id, name, cameras: camera, live }));
  }

  /** What the server knows of it now; null when there is no such thing, or not for this user. */
  async find({ kind, id }: FootageRef): Promise<Footage | null> {
    const which = { event: String(id), ...kindParameter(kind) };
    try {
      if (kind !== "event") return markOf(await this.#server.call<RawMark>("VEXO.Event", "Get", which));
      const raw = await this.#server.call<RawEvent & { camera_id: number }>("VEXO.Event", "Get", which);
      return footageOf(raw, raw.camera_id);
    } catch (error) {
      if (error instanceof ServerError && error.status === 404) return null;
      throw error;
    }
  }

  /** The last frame at or before the time, in Unix milliseconds; the first or the last one for a time outside. */
  async frameAt({ kind, id }: FootageRef, atMs: number): Promise<FrameOfTime> {
    const which = { event: String(id), ...kindParameter(kind), time_ms: String(Math.round(atMs)) };
    type RawFrame = { frame: number; frame_count: number };
    const { frame, frame_count } = await this.#server.call<RawFrame>("VEXO.Event", "Frame", which);
    return { index: frame, frameCount: frame_count };
  }

  /** What can be played behind the place, or before it; null where there is nothing. */
  async next({ cameras, kinds, atS, id }: EventCursor, isBefore: boolean): Promise<Footage | null> {
    type RawNext = RawMark | (RawEvent & { kind: "event"; camera_id: number });
    const { event } = await this.#server.call<{ event: RawNext | null }>("VEXO.Event", "Next", {
      cameralists: cameras.join(),
      kinds: kinds.join(),
      time: String(atS),
      ...(id === undefined ? {} : { event: String(id) }),
      ...(isBefore ? { before: "true" } : {}),
    });
    if (!event) return null;
    return event.kind === "event" ? footageOf(event, event.camera_id) : markOf(event);
  }

  /** The picture that the footage shows at a time, or so; at least that wide unless the camera's are smaller. */
  stillAddress(footage: FootageRef, atMs: number, widthPx: number): string {
    return address("VEXO.Picture", "At", stillParameters(footage, atMs, widthPx));
  }

  /** The same, as it is fetched. Rejects with a ServerError. */
  async still(footage: FootageRef, atMs: number, widthPx: number, signal: AbortSignal): Promise<Still> {
    try {
      const answer = await this.#server.media("VEXO.Picture", "At", stillParameters(footage, atMs, widthPx), { signal });
      const capturedMs = Number(answer.headers.get("X-Capture-Time")) * 1000;
      return { jpeg: await answer.blob(), capturedMs: capturedMs > 0 ? Math.round(capturedMs) : atMs };
    } catch (error) {
      throw asServerError(error);
    }
  }

  /**
   * Opens a stream of pictures, each behind a part with its frame's index. The caller reads the body and ends it with
   * `signal`. Rejects with a ServerError; its status is 200 where the server shows a warning in place of the footage.
   */
  async play(
    footage: Footage,
    start: FrameStart,
    extent: Extent,
    rate: number,
    key: number,
    signal: AbortSignal,
  ): Promise<Response> {
    const common = { mountid: "0", eventid: String(footage.id), playrate: String(rate), timestamp: String(key) };
    const range = {
      framestart: String(start.from ?? start.index),
      ...(start.from === undefined ? {} : { interval: "0" }),
      framestop: String(extent === "one" ? start.index : extent === "all" ? -1 : kFarFrame),
      recEvtType: String(kKinds[footage.kind]),
    };
    try {
      const answer = await this.#server.media(kPlayer, "PlayMjpegEvent", { ...common, ...range }, { signal });
      if (boundaryOf(answer.headers.get("Content-Type")) !== null) return answer;
      void answer.body?.cancel();
    } catch (error) {
      throw asServerError(error);
    }
    throw new ServerError(200, 0, "The recording cannot be played.");
  }

  /**
   * Opens a stream of what was recorded, from the key frame on that the frame is decoded from, where it is of one of
   * these codecs. The caller reads the body and ends it with `signal`. Rejects with a ServerError; its status is 406
   * where the recording has to be played as pictures.
   */
  async stream({ kind, id }: FootageRef, start: VideoStart, signal: AbortSignal): Promise<Response> {
    const which = { event: String(id), ...kindParameter(kind), frame: String(start.index) };
    const how = { rate: String(start.rate), timestamp: String(start.key), codecs: start.codecs };
    return this.#server.media("VEXO.Event", "Stream", { ...which, ...how }, { signal }).catch((error: unknown) => {
      throw asServerError(error);
    });
  }

  /** Rejects where no stream of this key runs. */
  async setRate(key: number, rate: number): Promise<void> {
    await this.#server.call("VEXO.Playback", "SetRate", {}, { form: { timestamp: String(key), rate: String(rate) } });
  }
}

function stillParameters({ kind, id }: FootageRef, atMs: number, widthPx: number): Record<string, string> {
  return { event: String(id), ...kindParameter(kind), time_ms: String(Math.round(atMs)), width: String(widthPx) };
}
