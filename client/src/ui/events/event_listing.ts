// SPDX-License-Identifier: Apache-2.0
//
// What the list tells of a span of time: which events, how many, and where there are none, why and what to do about it.

import type { Footage } from "../../wire/footage";
import type { Calendar } from "./calendar";
import type { EventFilter } from "./event_filter";
import type { EventList } from "./event_list";
import { foldContinuous, rowOf } from "./folded_events";

/** The list is for reading: a longer one is cut, and says so. */
const kMaxRows = 20_000;

/**
 * `recorded` is what the chosen cameras have, whatever its kind; `whyNone` is told where the filter leaves nothing of
 * it.
 */
export function listEvents(
  list: EventList,
  filter: EventFilter,
  recorded: readonly Footage[],
  span: string,
  whyNone: string,
): void {
  const events = recorded
    .filter((one) => filter.admits(one))
    .sort((one, other) => other.start - one.start || other.id - one.id);
  const rows = filter.choice.isKeptOnly ? events.map(rowOf) : foldContinuous(events);
  const head = `${events.length} ${events.length === 1 ? "event" : "events"} · ${span}`;
  const note = rows.length > kMaxRows ? "Show less time to list older events." : rows.length > 0 ? "" : whyNone;
  list.show(rows.slice(0, kMaxRows), head, note);
}

/**
 * Why no event is listed, and what to do about it; `hidden` are there but filtered out. Empty while that is not known.
 */
export function whyNoEvents(filter: EventFilter, hidden: number, calendar: Calendar): string {
  if (filter.cameras.length === 0) return "No camera is chosen. Choose some under “Cameras”.";
  if (hidden > 0) return `The filter hides ${hidden === 1 ? "one event" : `${hidden} events`}. Choose more kinds, or not only kept ones, to see them.`;
  if (calendar.isLoading) return "";
  if (calendar.hasRecordings) return "No events in this time span. The calendar marks the days with recordings.";
  return (
    "Nothing was recorded of these cameras in the month of the calendar. Choose another month or other cameras; " +
    "a manager can switch recording on under Settings › Cameras."
  );
}
