// SPDX-License-Identifier: Apache-2.0
//
// What can be played, recordings and marks: as the client has them, and as the web API does.

/**
 * Event: a recording on disk. Alert and pos: a mark reported by analytics or a POS terminal, with the recordings of its
 * span.
 */
export type FootageKind = "event" | "alert" | "pos";

export interface FootageRef {
  kind: FootageKind;
  id: number;
}

export function isSameFootage(one: FootageRef, other: FootageRef | null | undefined): boolean {
  return one.kind === other?.kind && one.id === other.id;
}

/** What a mark says and who reported it, and why it is kept, a line each; empty for a recording that is not kept. */
export function describe({ text, reporter, isKept, note, keeper }: Footage): string {
  const kept = isKept && `Kept${keeper && ` by ${keeper}`}${note && `: ${note}`}`;
  return [text, reporter && `Reported by ${reporter}`, kept].filter(Boolean).join("\n");
}

/** Something that can be played. */
export interface Footage extends FootageRef {
  camera: number;
  /** Unix seconds. */
  start: number;
  /** How far a growing recording can be played now. */
  stop: number;
  /** When a mark's event happened; its footage begins before. */
  moment: number;
  /** 0 where the server does not say. */
  frameCount: number;
  isGrowing: boolean;
  /** The server's number for why it was recorded; 0 for marks. */
  reason: number;
  /** A mark's text, else empty. */
  text: string;
  /** Where it was found by its text: the lines of that in pieces, of which every second one was looked for. */
  found?: readonly (readonly string[])[] | undefined;
  /** The account that reported a mark; empty where nobody is named. */
  reporter: string;
  /** There is something to play. */
  isSaved: boolean;
  /** Retention leaves it alone. Known of a mark only where it was looked up by itself. */
  isKept: boolean;
  /** Why it is kept, and which account says so; empty where that is not known. */
  note: string;
  keeper: string;
}

/** What the user tells apart: recordings by their reason, and marks. */
export type EventKind = "continuous" | "alarm" | Exclude<FootageKind, "event">;

/** A recording, as the web API has it. */
export interface RawEvent {
  id: number;
  start: number;
  stop: number;
  frame_count: number;
  record_type: number;
  is_recording: boolean;
  archived?: boolean;
  note?: string;
  kept_by?: string;
}

/** A mark, as the web API has it. */
export interface RawMark {
  id: number;
  kind: "alert" | "pos";
  camera_id: number;
  time: number;
  start: number;
  stop: number;
  /** Pending: the footage is not complete yet; missed: there is none. */
  state: "pending" | "saved" | "missed";
  reported_by: string;
  text: string[];
  found?: string[][];
  archived?: boolean;
}

export function footageOf(raw: RawEvent, camera: number): Footage {
  return {
    kind: "event",
    id: raw.id,
    camera,
    start: raw.start,
    stop: raw.stop,
    moment: raw.start,
    frameCount: raw.frame_count,
    isGrowing: raw.is_recording,
    reason: raw.record_type,
    text: "",
    reporter: "",
    isSaved: true,
    isKept: raw.archived ?? false,
    note: raw.note ?? "",
    keeper: raw.kept_by ?? "",
  };
}

export function markOf(raw: RawMark): Footage {
  const { id, kind, camera_id, start, stop, time, state, reported_by, text, found, archived } = raw;
  const unknown = { frameCount: 0, isGrowing: false, reason: 0, note: "", keeper: "" };
  return {
    id,
    kind,
    camera: camera_id,
    start,
    stop,
    moment: time,
    text: text.join("\n"),
    found,
    reporter: reported_by,
    isSaved: state === "saved",
    isKept: archived ?? false,
    ...unknown,
  };
}

/** The server takes no kind for a recorded event. */
export function kindParameter(kind: FootageKind): Record<string, string> {
  return kind === "event" ? {} : { kind };
}
