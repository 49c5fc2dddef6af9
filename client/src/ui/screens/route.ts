// SPDX-License-Identifier: Apache-2.0
//
// What is open, kept in the address, so that a reload keeps it and "back" leaves it: #camera=5 on the wall; #events, and
// there #event=7, #alert=8 or #pos=9; #maps, and there #map=2, and of that map a camera, #map=2&camera=5 or, of the
// recording server 3, #map=2&camera=5@3.

import type { FootageRef } from "../../wire/recordings";
import type { Camera } from "../../wire/server";

const kPattern = /^#(camera|event|alert|pos)=(\d+)$/;
const kMapPattern = /^#map=(\d+)(?:&camera=(\d+)(?:@(\d+))?)?$/;

function opened(): { what: string; id: number } | null {
  const found = kPattern.exec(location.hash);
  return found ? { what: found[1]!, id: Number(found[2]) } : null;
}

export type Screen = "live" | "events" | "maps";

export function openScreen(): Screen {
  if (location.hash === "#maps" || kMapPattern.test(location.hash)) return "maps";
  const what = opened()?.what;
  return location.hash === "#events" || (what !== undefined && what !== "camera") ? "events" : "live";
}

/** The id of the open camera; null means the wall. */
export function openCamera(): number | null {
  const open = opened();
  return open?.what === "camera" ? open.id : null;
}

/** What is open on the events' screen. */
export function openFootage(): FootageRef | null {
  const open = opened();
  return open && open.what !== "camera" ? { kind: open.what as FootageRef["kind"], id: open.id } : null;
}

/** Opens a camera. Going from one camera to the next leaves one entry in the history, not one for each. */
export function showCamera(id: number): void {
  if (openCamera() === null) history.pushState({ fromWall: true }, "", `#camera=${id}`);
  else history.replaceState(history.state, "", `#camera=${id}`);
  dispatchEvent(new PopStateEvent("popstate"));
}

export function showWall(): void {
  if (openCamera() === null) return;
  if ((history.state as { fromWall?: boolean } | null)?.fromWall) return history.back();
  history.replaceState(null, "", location.pathname + location.search);
  dispatchEvent(new PopStateEvent("popstate"));
}

/** Says in the address what is being played; as with cameras, all of it is one entry in the history. */
export function nameFootage({ kind, id }: FootageRef): void {
  const hash = `#${kind}=${id}`;
  if (location.hash === hash) return;
  if (openFootage() === null) history.pushState(null, "", hash);
  else history.replaceState(null, "", hash);
}

export interface OpenMap {
  map: number;
  /** What is seen large over the map. */
  camera: Pick<Camera, "id" | "server"> | null;
}

export function openMap(): OpenMap | null {
  const found = kMapPattern.exec(location.hash);
  if (!found) return null;
  return { map: Number(found[1]), camera: found[2] ? { id: Number(found[2]), server: Number(found[3] ?? 0) } : null };
}

/** Opens a map, or a camera over it. Each is an entry in the history, so that "back" leads along the way that one came. */
export function showMap(map: number, camera: OpenMap["camera"] = null): void {
  const of = camera ? `&camera=${camera.id}${camera.server ? `@${camera.server}` : ""}` : "";
  history.pushState({ fromMap: true }, "", `#map=${map}${of}`);
  dispatchEvent(new PopStateEvent("popstate"));
}

/** Names the map that is shown where the address named none. */
export function replaceRoute(map: number): void {
  history.replaceState(null, "", `#map=${map}`);
}

/** Back from a camera to its map. */
export function leaveMapCamera(): void {
  const open = openMap();
  if (!open?.camera) return;
  if ((history.state as { fromMap?: boolean } | null)?.fromMap) return history.back();
  history.replaceState(null, "", `#map=${open.map}`);
  dispatchEvent(new PopStateEvent("popstate"));
}
