// SPDX-License-Identifier: Apache-2.0
//
// Recordings that a test makes up, played as the server plays them; answers requests of fetch, or of a web server.

import { setTimeout } from "node:timers/promises";

export interface Recorded {
  id: number;
  camera: number;
  start: number;
  stop: number;
  frames: number;
  kind?: "event" | "alert" | "pos";
  reason?: number;
  isGrowing?: boolean;
  text?: string;
  /** Why it is kept; absent where it is not. */
  note?: string | undefined;
}

interface Stream {
  key: number;
  rate: number;
  /** Ends it as another player does that takes the session. */
  preempt(): void;
  /** Breaks the connection; leaves it open, but silent. */
  lose(): void;
  stall(): void;
}

const kTailMs = 2_000;
const kBoundary = "frame";
const json = (data: unknown, status = 200) =>
  new Response(JSON.stringify(status === 200 ? { success: true, data } : { success: false, error: { code: status } }), {
    status,
    headers: { "Content-Type": "application/json" },
  });

export class FakeArchive {
  recorded: Recorded[] = [];
  readonly streams: Stream[] = [];
  /** Each stream that was asked for: event, where from, how far, rate. */
  readonly asked: string[] = [];
  /** Each that was refused, since it has to be played as pictures. */
  readonly refused: string[] = [];
  /** The events of which a still was asked for. */
  readonly stills: string[] = [];
  playersPerSession = 1;
  /** Cameras whose recordings the account may play, but not take away. */
  notExported: number[] = [];
  /** The next answer to an export; null for a small file. */
  exported: Response | null = null;
  /** The server does not answer. */
  isAway = false;
  framesPerSecond = 100;
  /** Recordings are H.264, with key frames ten frames apart; else they are Motion JPEG. */
  isVideo = false;
  /** Every frame of every recording. */
  picture: Uint8Array = Uint8Array.of(255, 216);

  readonly fetch = async (address: string, init: { signal?: AbortSignal; body?: unknown } = {}): Promise<Response> => {
    if (this.isAway) throw new TypeError("no connection");
    const query = new URLSearchParams(address.slice(address.indexOf("?")));
    for (const [name, value] of new URLSearchParams(String(init.body ?? ""))) query.set(name, value);
    return this.answer(query, init.signal) ?? json(null, 404);
  };

  /** Undefined where it is not about recordings. */
  answer(query: URLSearchParams, signal?: AbortSignal): Response | undefined {
    const number = (name: string, otherwise = 0) => Number(query.get(name) ?? otherwise);
    switch (`${query.get("api")} ${query.get("method")}`) {
      case "VEXO.Lookhaven.Player EnumEvent":
        return json({ camera: idsOf(query).map((camera) => this.#history(camera, number("from"), number("to"), number("interval", 5))) });
      case "VEXO.Lookhaven.Player SearchAvaiDate":
        return json({ search_time: number("start"), available_day: this.#days(query) });
      case "VEXO.Event List":
        if (query.get("kept")) {
          const kept = (camera: number) => this.#overlapping(camera, number("from"), number("to"), false).filter((one) => one.note !== undefined);
          return json({ event: idsOf(query).flatMap((camera) => kept(camera).map((one) => ({ ...rawEvent(one), camera_id: camera }))) });
        }
        if (query.get("text")) {
          const words = query.get("text")!;
          const wanted = (one: Recorded) => one.text?.includes(words) && idsOf(query).includes(one.camera) && query.get("kind") !== (one.kind === "pos" ? "alert" : "pos");
          const found = (text: string) => text.split("\n").map((line) => line.split(new RegExp(`(${words})`)));
          return json({ event: this.recorded.filter(wanted).map((one) => ({ ...rawMark(one), found: found(one.text!) })) });
        }
        return json({ event: idsOf(query).flatMap((camera) => this.#overlapping(camera, number("from"), number("to"), true).map(rawMark)) });
      case "VEXO.Event Outline":
        return json({ camera: idsOf(query).map((camera) => this.#outline(camera, number("from"), number("to"))) });
      case "VEXO.Event Get": {
        const kind = query.get("kind") ?? "event";
        const one = this.recorded.find(({ id, kind: its = "event" }) => id === number("event") && its === kind);
        return !one ? json(null, 404) : json(kind === "event" ? { ...rawEvent(one), camera_id: one.camera } : rawMark(one));
      }
      case "VEXO.Event Keep": {
        const one = this.recorded.find(({ id }) => id === number("event"));
        if (one) one.note = query.get("keep") === "true" ? query.get("note")! : undefined;
        return json({ event: [] });
      }
      case "VEXO.Event PlanExport": {
        const [from, to] = [number("from"), number("to")];
        const camera = idsOf(query).map((id) => {
          const found = this.#overlapping(id, from, to, false);
          const utc = (atS: number) => ({ utc: new Date(atS * 1000).toISOString() });
          const isWhole = found.some(({ stop }) => stop >= to);
          return { name: `Camera ${id}`, file: found.slice(0, 1), gap: isWhole ? [] : [{ begin: utc(to - 12), end: utc(to) }] };
        });
        return camera.every(({ file }) => file.length === 0) ? json(null, 404) : json({ name: "export.zip", size_bytes: (to - from) * 1e6, camera });
      }
      case "VEXO.Event Export":
        return this.exported ?? new Response("file", { headers: { "Content-Disposition": 'attachment; filename="export.zip"' } });
      case "VEXO.Event Next":
        return json({ event: this.#next(query) });
      case "VEXO.Event Frame": {
        const one = this.recorded.find(({ id, kind: its = "event" }) => id === number("event") && its === (query.get("kind") ?? "event"));
        if (!one || one.frames === 0) return json(null, 404);
        const frame = Math.floor((number("time_ms") - one.start * 1000) / periodMs(one));
        return json({ frame: Math.max(0, Math.min(frame, one.frames - 1)), frame_count: one.frames, captured_ms: 0 });
      }
      case "VEXO.Picture At":
        this.stills.push(query.get("event") ?? "");
        return new Response(this.picture.slice(), {
          headers: { "Content-Type": "image/jpeg", "X-Capture-Time": (number("time_ms") / 1000).toFixed(3) },
        });
      case "VEXO.Catalog Groups":
        return json({ group: [{ id: 1, name: "Yard", camera: [1, 2], live: [1, 2] }] });
      case "VEXO.Catalog Rights":
        return json({ camera: [1, 2].map((id) => ({ id, live: true, audio: true, playback: true, export: !this.notExported.includes(id) })) });
      case "VEXO.Playback SetRate": {
        const stream = this.streams.find(({ key }) => key === number("timestamp"));
        if (stream) stream.rate = number("rate");
        return stream ? json(null) : json(null, 404);
      }
      case "VEXO.Event Stream": {
        const kind = query.get("kind") ?? "event";
        const found = this.recorded.find((one) => one.id === number("event") && (one.kind ?? "event") === kind);
        const list = found && this.isVideo ? this.asked : this.refused;
        list.push(`${kind}${number("event")} video ${number("frame")} at ${number("rate")}`);
        if (!found || !this.isVideo) return json(null, found ? 406 : 404);
        return this.#stream(found, number("frame"), Infinity, number("timestamp"), number("rate"), true, signal, true);
      }
      case "VEXO.Lookhaven.Player PlayMjpegEvent":
        return this.#play(query, signal);
      default:
        return undefined;
    }
  }

  #next(query: URLSearchParams) {
    const [cameras, kinds] = [idsOf(query), query.get("kinds")?.split(",")];
    const isBefore = query.get("before") === "true";
    const place = [Number(query.get("time")), Number(query.get("event") ?? (isBefore ? 0 : Infinity))] as const;
    const order = (one: Recorded) => one.start - place[0] || one.id - place[1];
    const kindOf = ({ kind = "event", reason = 1 }: Recorded) => (kind !== "event" ? kind : reason === 1 ? "continuous" : "alarm");
    const found = this.recorded
      .filter((one) => cameras.includes(one.camera) && kinds?.includes(kindOf(one)) !== false && (isBefore ? order(one) < 0 : order(one) > 0))
      .sort((one, other) => (isBefore ? -1 : 1) * (one.start - other.start || one.id - other.id))[0];
    if (!found) return null;
    return (found.kind ?? "event") === "event" ? { ...rawEvent(found), kind: "event", camera_id: found.camera } : rawMark(found);
  }

  #overlapping(camera: number, from: number, to: number, isMark: boolean): Recorded[] {
    const isWanted = (one: Recorded) => one.camera === camera && (one.kind ?? "event") !== "event" === isMark;
    return this.recorded.filter((one) => isWanted(one) && one.start < to && one.stop > from);
  }

  #history(camera: number, from: number, to: number, interval: number) {
    const events = this.#overlapping(camera, from, to, false);
    const steps = new Array<number>(Math.ceil((to - from) / interval)).fill(0);
    const stepOf = (at: number) => (at - from) / interval;
    for (const { start, stop } of events) steps.fill(2, Math.max(0, Math.floor(stepOf(start))), Math.ceil(stepOf(stop)));
    const runs: [number, number][] = [];
    for (const value of steps) {
      if (runs.at(-1)?.[0] === value) runs.at(-1)![1] += 1;
      else runs.push([value, 1]);
    }
    return { camera_id: camera, event: events.map(rawEvent), event_map: { interval, runs }, total: events.length };
  }

  /** With each event by itself: nothing is joined. */
  #outline(camera: number, from: number, to: number) {
    const events = this.#overlapping(camera, from, to, false).sort((one, other) => one.start - other.start);
    const bars = (isContinuous: boolean) => events.filter(({ reason = 1 }) => (reason === 1) === isContinuous).map(({ start, stop }) => [start, stop]);
    const moments = (kind: string) => this.#overlapping(camera, from, to, true).filter((one) => one.kind === kind).map(({ start }) => start + 5);
    return { camera_id: camera, continuous: bars(true), alarm: bars(false), alert: moments("alert"), pos: moments("pos") };
  }

  #days(query: URLSearchParams): number[] {
    return Array.from({ length: Number(query.get("day_count")) }, (_, day) => {
      const from = Number(query.get("start")) + day * 86_400;
      return idsOf(query).some((camera) => this.#overlapping(camera, from, from + 86_400, false).length > 0) ? 1 : 0;
    });
  }

  #play(query: URLSearchParams, signal?: AbortSignal): Response {
    const number = (name: string, otherwise: number) => Number(query.get(name) ?? otherwise);
    const kind = (["event", "alert", "pos"] as const)[number("recEvtType", 0)];
    const found = this.recorded.find((one) => one.id === number("eventid", 0) && (one.kind ?? "event") === kind);
    const from = number("framestart", 0);
    const stop = number("framestop", -1);
    const rate = number("playrate", 1);
    this.asked.push(`${kind}${number("eventid", 0)} frame ${from} to ${stop} at ${rate}`);
    if (!found || from >= found.frames) return new Response("", { headers: { "Content-Type": "image/png" } });
    return this.#stream(found, from, stop < from ? found.frames - 1 : stop, number("timestamp", 0), rate, query.has("interval"), signal);
  }

  #stream(found: Recorded, from: number, stop: number, key: number, rate: number, isSampled: boolean, signal?: AbortSignal, isVideo = false) {
    const ended = new AbortController();
    const lost = new AbortController();
    let isStalled = false;
    const lose = () => {
      lost.abort();
      ended.abort();
    };
    const stream: Stream = { key, rate, preempt: () => ended.abort(), lose, stall: () => (isStalled = true) };
    const wait = (ms: number) => setTimeout(ms, undefined, { signal: ended.signal }).catch(() => undefined);
    // A newer player of the session takes the place of the oldest.
    if (this.streams.length >= this.playersPerSession) this.streams[0]!.preempt();
    this.streams.push(stream);
    ended.signal.addEventListener("abort", () => this.streams.splice(this.streams.indexOf(stream), 1));
    signal?.addEventListener("abort", () => ended.abort());
    const send = async (controller: ReadableStreamDefaultController<Uint8Array>) => {
      for (let index = isVideo ? from - (from % 10) : from; !ended.signal.aborted; ) {
        // A browser that does not read holds the server back.
        if (!isStalled && (controller.desiredSize ?? 0) > -20) {
          const captured = `X-Capture-Time: ${(found.start + (index * periodMs(found)) / 1000).toFixed(3)}\r\n`;
          if (!isVideo) controller.enqueue(part("text/plain", Buffer.from(`${index}\r\n`)));
          if (isVideo) controller.enqueue(videoPart(index, periodMs(found), captured));
          else controller.enqueue(part("image/jpeg", this.picture, captured));
          index = Math.min(stop, index + Math.max(1, isSampled ? 1 : stream.rate));
        }
        await wait((1000 / this.framesPerSecond) * Math.max(1, -stream.rate));
        if (isVideo && index >= found.frames) {
          while (found.isGrowing && index >= found.frames && !ended.signal.aborted) await wait(5);
          if (index < found.frames || ended.signal.aborted) continue;
          controller.enqueue(Buffer.from(`--${kBoundary}--\r\n`));
          ended.abort();
        }
        // At the end of what is still being recorded the server waits a while, and then ends the stream.
        if (index >= found.frames) await wait(kTailMs);
        if (index >= found.frames) ended.abort();
      }
      if (signal?.aborted || lost.signal.aborted) controller.error(new DOMException("left", "AbortError"));
      else controller.close();
    };
    const body = new ReadableStream<Uint8Array>({ start: (controller) => void send(controller) });
    return new Response(body, { headers: { "Content-Type": `multipart/x-mixed-replace; boundary=${kBoundary}` } });
  }
}

function idsOf(query: URLSearchParams): number[] {
  return (query.get("cameralists") ?? "").split(",").map(Number);
}

function rawEvent({ id, start, stop, frames, reason = 1, isGrowing = false, note }: Recorded) {
  const kept = note === undefined ? {} : { archived: true, note, kept_by: "admin" };
  return { id, start, stop, frame_count: frames, record_type: reason, is_recording: isGrowing, ...kept };
}

function rawMark({ id, kind, camera, start, stop, text = "" }: Recorded) {
  return { id, kind, camera_id: camera, time: start + 5, start, stop, state: "saved", reported_by: "terminal", text: text.split("\n") };
}

/** Of a camera of constant frame rate. */
function periodMs({ start, stop, frames }: Recorded): number {
  return ((stop - start) * 1000) / frames;
}

const kKeyFrame = Uint8Array.of(0, 0, 0, 1, 0x67, 0x42, 0xc0, 0x1e, 0, 0, 0, 1, 0x65, 0x88);
const kOtherFrame = Uint8Array.of(0, 0, 0, 1, 0x41, 0x9a);

/** A frame of H.264 without a picture. */
export function videoPart(index: number, periodMs: number, more: string): Uint8Array {
  const timestamp = `X-Frame: ${index}\r\nX-Timestamp: ${Math.round(index * periodMs * 1000)}\r\n`;
  return part("image/H264", index % 10 === 0 ? kKeyFrame : kOtherFrame, more + timestamp);
}

export function part(type: string, body: Uint8Array, more = ""): Uint8Array {
  const head = Buffer.from(`--${kBoundary}\r\nContent-Type: ${type}\r\nContent-Length: ${body.length}\r\n${more}\r\n`);
  return Buffer.concat([head, body, Buffer.from("\r\n")]);
}
