// SPDX-License-Identifier: Apache-2.0
//
// The keys of the events' screen.

import { hasFocusByPointer } from "../widgets/key_owner";
import type { KeyList } from "../widgets/keys_dialog";
import type { StageLayout } from "./stage_layout";
import { kJumpMs, type TransportActions } from "./transport";

export const kEventsKeys: KeyList = [
  ["Space", "Play or pause"],
  ["Left Right", "One frame back or forward; with Shift ten"],
  ["J L", "Ten seconds back or forward"],
  ["Up Down", "The event before or after"],
  ["[ ]", "Slower or faster"],
  ["M", "Sound on or off"],
  ["S", "Snapshot"],
  ["T", "Go to a time"],
  ["A", "Same moment on all cameras"],
  ["Enter", "Enlarge the active picture, or show all"],
  ["1 2 3", "One camera, two by two, three by three"],
  ["N", "Live"],
  ["Left Right", "On the timeline: move the playhead; it plays from where it is let go"],
  ["+ -", "On the timeline: show less or more time"],
  ["PageUp PageDown", "On the timeline: earlier or later"],
  ["End", "On the timeline: now"],
  ["X", "Export a span of several cameras"],
  ["F", "Full screen"],
];

export interface EventsActions extends TransportActions {
  /** To the next slower (-1) or faster (1) rate. */
  changeRate(by: 1 | -1): void;
  layout(layout: StageLayout): void;
  /** Shows the active camera alone, or all again; false where there is but one. */
  enlarge(): boolean;
  /** Closes what was opened last, export or large picture; false where nothing was. */
  back(): boolean;
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
  else if (event.key === "Enter") return actions.enlarge();
  else if (event.key === "Escape") return actions.back();
  else return pressLetter(event.key.toLowerCase(), actions);
  return true;
}

function pressLetter(key: string, actions: EventsActions): boolean {
  if (key === "x") actions.exportSpan();
  else if (key === "f") actions.fullScreen();
  else if (key === "j") actions.jump(-kJumpMs);
  else if (key === "l") actions.jump(kJumpMs);
  else if (key === "m") actions.sound();
  else if (key === "s") actions.snapshot();
  else if (key === "t") actions.askTime();
  else if (key === "a") actions.sameMoment();
  else if (key === "n") actions.live();
  else if (/^[123]$/.test(key)) actions.layout(Number(key) as StageLayout);
  else return false;
  return true;
}

/** From day to day, from row to row and along the timeline, for keyboard users. */
function isForPart(event: KeyboardEvent): boolean {
  const target = event.target as Element;
  const isWithin = (selector: string) => !hasFocusByPointer() && target.closest(selector) !== null;
  if (event.key.startsWith("Arrow") && (isWithin(".calendar-days") || target.closest(".span-handle"))) return true;
  if (/^Arrow(Left|Right)$/.test(event.key) && isWithin(".timeline-lanes")) return true;
  return /^Arrow(Up|Down)$/.test(event.key) && isWithin(".list-space");
}
