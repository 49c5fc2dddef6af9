// SPDX-License-Identifier: Apache-2.0
//
// The keys of the events' screen.

import { hasFocusByPointer } from "../widgets/key_owner";
import type { KeyList } from "../widgets/keys_dialog";
import type { TransportActions } from "./transport";

export const kEventsKeys: KeyList = [
  ["Space", "Play or pause"],
  ["Left Right", "One frame back or on; with Shift ten"],
  ["Up Down", "The event before or after"],
  ["[ ]", "Slower or faster"],
  ["+ -", "On the timeline: show less or more time"],
  ["PageUp PageDown", "On the timeline: earlier or later"],
  ["End", "On the timeline: now"],
  ["X", "Export a span of several cameras"],
  ["F", "Full screen"],
];

export interface EventsActions extends TransportActions {
  /** To the next slower (-1) or faster (1) rate. */
  changeRate(by: 1 | -1): void;
  /** False where it is not open. */
  closeExport(): boolean;
}

/** Does what the key asks for; false for one that means nothing here, or that belongs to what has the focus. */
export function pressEventsKey(event: KeyboardEvent, actions: EventsActions): boolean {
  if (isForPart(event)) return false;
  if (event.key === " ") actions.toggle();
  else if (event.key === "ArrowLeft") actions.step(event.shiftKey ? -10 : -1);
  else if (event.key === "ArrowRight") actions.step(event.shiftKey ? 10 : 1);
  else if (event.key === "ArrowUp") actions.skip(-1);
  else if (event.key === "ArrowDown") actions.skip(1);
  else if (event.key === "[") actions.changeRate(-1);
  else if (event.key === "]") actions.changeRate(1);
  else if (event.key.toLowerCase() === "x") actions.exportSpan();
  else if (event.key === "Escape") return actions.closeExport();
  else if (event.key.toLowerCase() === "f") actions.fullScreen();
  else return false;
  return true;
}

/** From day to day and from row to row, for whoever came there with the keyboard. */
function isForPart(event: KeyboardEvent): boolean {
  const target = event.target as Element;
  const isWithin = (selector: string) => !hasFocusByPointer() && target.closest(selector) !== null;
  if (event.key.startsWith("Arrow") && (isWithin(".calendar-days") || target.closest(".span-handle"))) return true;
  return /^Arrow(Up|Down)$/.test(event.key) && isWithin(".list-space");
}
