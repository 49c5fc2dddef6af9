// SPDX-License-Identifier: Apache-2.0
//
// What is open, kept in the address, so that a reload keeps it and "back" leaves it: #camera=5 on the wall; #events, and
// there #event=7, #alert=8 or #pos=9.

import type { FootageRef } from "../wire/recordings";

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

/** Says in the address what is being played; as with cameras, all of it is one entry in the history. */
export function nameFootage({ kind, id }: FootageRef): void {
  const hash = `#${kind}=${id}`;
  if (location.hash === hash) return;
  if (openFootage() === null) history.pushState(null, "", hash);
  else history.replaceState(null, "", hash);
}
