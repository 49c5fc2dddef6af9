// SPDX-License-Identifier: Apache-2.0
//
// What is open, kept in the address, so that a reload keeps it and Back leaves it:
//
//   #camera=5, #group=3    on the wall, a camera, or the cameras of one group; of a saved layout, #layout=1f0c, or of a
//                          sequence of these, #sequence=1f0c
//   #events                and what events_route.ts says
//   #maps, #map=2          the maps, or one of them; &edit its editor, &camera=5 a camera on it, &camera=5@3 one of the
//                          paired host 3
//   #settings=cameras      a section of the settings; &open=5 a record of it, &open=new a new one
//   #setup=                and a one-time token, before there is an account
//
// Why so        A link, Back and Forward have changed the address before anyone can be asked. So each entry of the
//               browser's history has a number, by which a refused step is taken back.

import type { Camera } from "../wire/camera";

export type ScreenName = "wall" | "events" | "maps" | "settings";
export const kSettingsSections = [
  "cameras", "groups", "maps", "devices", "accounts", "storage", "hosts", "system", "audit",
] as const;
export type SettingsSection = (typeof kSettingsSections)[number];

const kCameraPattern = /^#camera=(\d+)$/;
const kGroupPattern = /^#group=(\d+)$/;
const kSavedPattern = /^#(layout|sequence)=([\w-]{1,40})$/;
const kEventsPattern = /^#(events|(event|alert|pos)=\d+)(&|$)/;
const kSettingsPattern = /^#settings(?:=([a-z]+)(?:&open=(\d+|new))?)?$/;
const kMapPattern = /^#map=(\d+)(?:&camera=(\d+)(?:@(\d+))?|(&edit))?$/;

const kSetupPattern = /^#setup=([0-9a-f]+)$/;

/** What an entry of the browser's history keeps beside its address. */
interface EntryState {
  position: number;
  /** Opened from the entry before, so that Back leads there. */
  hasOpener: boolean;
}

interface Entry {
  position: number;
  address: string;
}

let shown: Entry = { position: 0, address: "" };

/** Numbers an entry that came from a link or was typed; the browser makes none where the address is the same. */
function currentEntry(): Entry {
  const address = location.href;
  const state = history.state as EntryState | null;
  const position = state?.position ?? (address === shown.address ? shown.position : shown.position + 1);
  if (!state) history.replaceState({ position, hasOpener: false } satisfies EntryState, "");
  return { position, address };
}

/** Calls `follow` for each change of the address. Where that returns false, the address becomes again what it was. */
export function followRoute(follow: () => boolean): void {
  shown = currentEntry();
  addEventListener("popstate", () => {
    const [before, now] = [shown, currentEntry()];
    if (now.position === before.position && now.address === before.address) return;
    shown = now;
    if (follow()) return;
    shown = before;
    if (now.position !== before.position) history.go(before.position - now.position);
    else history.replaceState(history.state, "", before.address);
  });
}

function push(hash: string, hasOpener: boolean): void {
  history.pushState({ position: shown.position + 1, hasOpener } satisfies EntryState, "", hash);
}

function replace(hash: string, hasOpener: boolean): void {
  history.replaceState({ position: shown.position, hasOpener } satisfies EntryState, "", hash);
}

/** Has the new address followed. */
function announce(): void {
  dispatchEvent(new PopStateEvent("popstate"));
}

function hasOpener(): boolean {
  return (history.state as EntryState | null)?.hasOpener ?? false;
}

export function openScreen(): ScreenName {
  if (location.hash === "#maps" || kMapPattern.test(location.hash)) return "maps";
  if (kSettingsPattern.test(location.hash)) return "settings";
  return kEventsPattern.test(location.hash) ? "events" : "wall";
}

/** The id of the open camera; null means the wall. */
export function openCamera(): number | null {
  const found = kCameraPattern.exec(location.hash);
  return found ? Number(found[1]) : null;
}

/** What the wall shows: one of these, or all cameras. */
export interface OpenWall {
  group: number | null;
  /** Ids of what the account has saved. */
  layout: string | null;
  sequence: string | null;
}

export function openWall(): OpenWall {
  const group = kGroupPattern.exec(location.hash)?.[1];
  const [, kind, id] = kSavedPattern.exec(location.hash) ?? [];
  return {
    group: group === undefined ? null : Number(group),
    layout: kind === "layout" ? id! : null,
    sequence: kind === "sequence" ? id! : null,
  };
}

export function groupAddress(id: number): string {
  return `#group=${id}`;
}

export function savedAddress(kind: "layout" | "sequence", id: string): string {
  return `#${kind}=${id}`;
}

/** Opens a camera. Going from one camera to the next leaves one entry in the history, not one for each. */
export function showCamera(id: number): void {
  if (openCamera() === null) push(`#camera=${id}`, true);
  else replace(`#camera=${id}`, hasOpener());
  announce();
}

export function showWall(): void {
  if (openCamera() === null) return;
  if (hasOpener()) return history.back();
  replace(location.pathname + location.search, false);
  announce();
}

let recordedAtMs = 0;

/** Writes into the address what is shown already. In place of the entry before it does so once in the interval. */
export function recordAddress(hash: string, isNewEntry: boolean, intervalMs: number): void {
  if (location.hash === hash || (!isNewEntry && performance.now() - recordedAtMs < intervalMs)) return;
  recordedAtMs = performance.now();
  if (isNewEntry) push(hash, false);
  else replace(hash, false);
  shown = currentEntry();
}

export interface OpenMap {
  map: number;
  /** What is seen large over the map. */
  camera: Pick<Camera, "id" | "server"> | null;
  /** Its editor is to be opened. */
  isEdited: boolean;
}

export function openMap(): OpenMap | null {
  const found = kMapPattern.exec(location.hash);
  if (!found) return null;
  const camera = found[2] ? { id: Number(found[2]), server: Number(found[3] ?? 0) } : null;
  return { map: Number(found[1]), camera, isEdited: found[4] !== undefined };
}

export function editedMapAddress(map: number): string {
  return `#map=${map}&edit`;
}

/**
 * Opens a map, or a camera over it. Each is an entry in the history, so that Back leads along the way that one came.
 */
export function showMap(map: number, camera: OpenMap["camera"] = null): void {
  const of = camera ? `&camera=${camera.id}${camera.server ? `@${camera.server}` : ""}` : "";
  push(`#map=${map}${of}`, true);
  announce();
}

/** Writes the map that is shown into an address that named none. */
export function replaceRoute(map: number): void {
  replace(`#map=${map}`, false);
  shown = currentEntry();
}

/** Back from a camera to its map. */
export function leaveMapCamera(): void {
  const open = openMap();
  if (!open?.camera) return;
  if (hasOpener()) return history.back();
  replace(`#map=${open.map}`, false);
  announce();
}

export interface OpenSettings {
  section: SettingsSection;
  /** A record of it; null: the list of all. */
  open: number | "new" | null;
}

export function openSettings(): OpenSettings {
  const [, section, open] = kSettingsPattern.exec(location.hash) ?? [];
  const known = kSettingsSections.find((name) => name === section) ?? "cameras";
  return { section: known, open: open === "new" ? "new" : open ? Number(open) : null };
}

export function settingsAddress(section: SettingsSection, open: OpenSettings["open"] = null): string {
  return `#settings=${section}${open === null ? "" : `&open=${open}`}`;
}

/** From a record to the list that it is in; Back does not lead to the record again. */
export function leaveSettingsRecord(): void {
  replace(settingsAddress(openSettings().section), false);
  announce();
}

/** The token of the one-time address at which the first account is made. */
export function setupToken(): string | null {
  return kSetupPattern.exec(location.hash)?.[1] ?? null;
}

/** Replaces the address, whose token is of no use any more. */
export function leaveSetup(hash: string): void {
  replace(hash, false);
  shown = currentEntry();
}
