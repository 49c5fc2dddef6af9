// SPDX-License-Identifier: Apache-2.0
//
// What is open, kept in the address, so that a reload keeps it and "back" leaves it: #camera=5 on the wall; #events, and
// there #event=7, #alert=8 or #pos=9.

import type { FootagePlace, FootageRef } from "../wire/recordings";

const kPattern = /^#(camera|event|alert|pos)=(\d+)$/;

function opened(): { what: string; id: number } | null {
  const found = kPattern.exec(location.hash);
  return found ? { what: found[1]!, id: Number(found[2]) } : null;
}

export type Screen = "live" | "events";

export function openScreen(): Screen {
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

/** Where it was when it was opened here; null for an address that came from elsewhere. */
export function placeOf({ kind, id }: FootageRef): FootagePlace | null {
  const place = (history.state as { footage?: FootagePlace } | null)?.footage;
  return place?.kind === kind && place.id === id ? place : null;
}

/** Says in the address what is being played; as with cameras, all of it is one entry in the history. */
export function nameFootage({ kind, id, camera, start }: FootagePlace): void {
  const hash = `#${kind}=${id}`;
  if (location.hash === hash) return;
  const state = { footage: { kind, id, camera, start } };
  if (openFootage() === null) history.pushState(state, "", hash);
  else history.replaceState(state, "", hash);
}
