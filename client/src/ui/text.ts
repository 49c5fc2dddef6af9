// SPDX-License-Identifier: Apache-2.0
//
// Words and numbers as the user reads them.

import type { SignalState } from "../live/signal_state";

const two = (value: number) => String(value).padStart(2, "0");

/** hh:mm:ss in the browser's time zone. */
export function clockTime(unixMs: number): string {
  const time = new Date(unixMs);
  return [time.getHours(), time.getMinutes(), time.getSeconds()].map(two).join(":");
}

/** yyyy-mm-dd in the browser's time zone. */
export function calendarDate(unixMs: number): string {
  const time = new Date(unixMs);
  return [time.getFullYear(), time.getMonth() + 1, time.getDate()].map(two).join("-");
}

/** A file name that every file system takes: the camera's name and the time, without characters that some refuse. */
export function snapshotFileName(cameraName: string, takenMs: number): string {
  const plain = cameraName
    .replace(/[\u0000-\u001f\u007f/\\:*?"<>|]+/g, " ")
    .trim()
    .replace(/\s+/g, "-");
  const name = plain.replace(/^[.-]+|[.-]+$/g, "") || "camera";
  return `${name}_${calendarDate(takenMs)}_${clockTime(takenMs).replaceAll(":", "-")}.jpg`;
}

/** `everyMs` is the time between two pictures of a source that polls. */
export function sentenceOf(state: SignalState, everyMs = 0): string {
  switch (state.kind) {
    case "idle":
      return "paused";
    case "connecting":
      return "connecting";
    case "live":
      return everyMs > 0 ? `live, every ${everyMs / 1000} s` : "live";
    case "lost":
      return `no signal since ${clockTime(state.sinceMs)}`;
  }
}
