// SPDX-License-Identifier: Apache-2.0
//
// What is open on the events' screen, as a part of the address: #events, or #event=7, #alert=8 or #pos=9, and behind it
//
//   &at=1764183438123            the picture of that Unix time in milliseconds
//   &play=1                      plays from there
//   &layout=2&cameras=1,0,4      how many cells a row has, and their cameras in order, 0 for an empty one
//   &large=4                     the camera of these that is shown alone
//   &filter=1,4&kinds=alarm,pos  which cameras and kinds of events are listed; without kinds all
//   &kept=1&text=two+words       of these only what is kept, and what has these words in its text
//
// What an address does not say stays as it is.

import { kEventKinds } from "../../playback/coverage";
import type { EventKind, FootageRef } from "../../wire/footage";
import { recordAddress } from "../route";
import type { ListChoice } from "./event_filter";
import { kStageLayouts, type StagePlan } from "./stage_layout";

export interface EventsAddress {
  /** Null where nothing was recorded, or nothing plays. */
  footage: FootageRef | null;
  atMs: number | null;
  /** From that time on. */
  isPlaying: boolean;
  stage: { plan: StagePlan; large: number | null } | null;
  filter: ListChoice | null;
}

const kKinds = ["event", "alert", "pos"] as const;
const kIds = /^\d+(,\d+)*$/;

/** Null for an address of another screen. */
export function parseEventsAddress(hash: string): EventsAddress | null {
  const said = new URLSearchParams(hash.replace(/^#/, ""));
  const number = (name: string) => (/^\d{1,15}$/.test(said.get(name) ?? "") ? Number(said.get(name)) : null);
  const ids = (name: string) => (kIds.test(said.get(name) ?? "") ? said.get(name)!.split(",").map(Number) : null);
  const kind = kKinds.find((name) => number(name) !== null);
  if (!kind && !/^#events(&|$)/.test(hash)) return null;
  const layout = kStageLayouts.find((side) => side === number("layout"));
  const cells = ids("cameras")?.map((camera) => camera || null);
  const listed = ids("filter");
  const kinds = said.get("kinds")?.split(",") ?? kEventKinds;
  const known = kEventKinds.filter((one) => kinds.includes(one));
  return {
    footage: kind ? { kind, id: number(kind)! } : null,
    atMs: number("at"),
    isPlaying: said.has("play"),
    stage: layout && cells ? { plan: { layout, cells }, large: number("large") } : null,
    filter: listed && {
      cameras: listed,
      kinds: known.length > 0 ? known : kEventKinds,
      isKeptOnly: said.has("kept"),
      words: said.get("text")?.trim() ?? "",
    },
  };
}

/** The address of one camera's recordings; where a time is given, they are played from there on. */
export function cameraAddress(camera: number, atMs: number | null): string {
  const stage = { plan: { layout: 1 as const, cells: [camera] }, large: null };
  return formatEventsAddress({ footage: null, atMs, isPlaying: atMs !== null, stage, filter: null });
}

export function formatEventsAddress({ footage, atMs, isPlaying, stage, filter }: EventsAddress): string {
  const parts = [footage ? `#${footage.kind}=${footage.id}` : "#events"];
  // Not rounded down, which would lead to the frame before.
  if (atMs !== null) parts.push(`at=${Math.ceil(atMs)}`);
  if (isPlaying) parts.push("play=1");
  if (stage) parts.push(`layout=${stage.plan.layout}`, `cameras=${stage.plan.cells.map((camera) => camera ?? 0).join()}`);
  if (stage && stage.large !== null) parts.push(`large=${stage.large}`);
  if (filter && filter.cameras.length > 0) parts.push(`filter=${filter.cameras.join()}`, ...moreOf(filter));
  return parts.join("&");
}

function moreOf({ kinds, isKeptOnly, words }: ListChoice): string[] {
  const isAll = kEventKinds.every((kind: EventKind) => kinds.includes(kind));
  const text = new URLSearchParams({ text: words }).toString();
  return [...(isAll ? [] : [`kinds=${kinds.join()}`]), ...(isKeptOnly ? ["kept=1"] : []), ...(words ? [text] : [])];
}

/**
 * Writes what is shown into the address: as an entry of its own in the history, to which Back leads, or in place of the
 * one before, which it does once in the interval: call it again until the address has it.
 */
export function recordEventsAddress(address: EventsAddress, isNewEntry: boolean, intervalMs: number): void {
  const before = parseEventsAddress(location.hash);
  const isFirst = before !== null && before.footage === null && before.atMs === null;
  recordAddress(formatEventsAddress(address), isNewEntry || isFirst, intervalMs);
}
