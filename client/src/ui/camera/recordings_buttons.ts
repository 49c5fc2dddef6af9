// SPDX-License-Identifier: Apache-2.0
//
// Buttons from a camera's live picture to its recordings.

import type { Camera } from "../../wire/camera";
import { cameraAddress } from "../events/events_route";
import { iconButton } from "../widgets/button";

const kRecentMs = 30_000;

/** None for a paired host's camera, which records there. */
export function recordingsButtons({ id, name, server }: Camera): HTMLButtonElement[] {
  if (server) return [];
  const go = (atMs: number | null) => void (location.hash = cameraAddress(id, atMs));
  return [
    iconButton("recent", `Last 30 seconds of ${name}`, () => go(Date.now() - kRecentMs)),
    iconButton("events", `Recordings of ${name}`, () => go(null)),
  ];
}
