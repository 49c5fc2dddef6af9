// SPDX-License-Identifier: Apache-2.0
//
// What was recorded when, of the cameras that the user has chosen: filter, calendar, timeline and list, filled from one
// cache.

import { FootageCache } from "../../playback/footage_cache";
import { FootageOutline } from "../../playback/footage_outline";
import { RecordedDays } from "../../playback/recorded_days";
import type { Camera } from "../../wire/camera";
import type { Footage } from "../../wire/footage";
import type { Preferences } from "../../wire/preferences";
import type { Recordings } from "../../wire/recordings";
import { spanText } from "../timeline/time_scale";
import { Timeline, type TimelineActions } from "../timeline/timeline";
import { Calendar } from "./calendar";
import { EventFilter, type ListChoice } from "./event_filter";
import { EventList } from "./event_list";
import { listEvents, whyNoEvents } from "./event_listing";
import { rowOf } from "./folded_events";
import { markAt, MarkText } from "./mark_text";
import { TextSearch } from "./text_search";

const kDebounceMs = 150;

export interface OverviewActions extends Omit<TimelineActions, "stillAddress"> {
  sameMoment(footage: Footage): void;
  /** Other cameras or kinds of events were chosen. */
  filtered(): void;
  dayPicked(): void;
  /** More is known of what was recorded. */
  learned(): void;
}

export class Overview {
  readonly cache: FootageCache;
  readonly outline: FootageOutline;
  readonly filter: EventFilter;
  readonly list: EventList;
  readonly timeline: Timeline;
  readonly calendar: Calendar;
  readonly markText = new MarkText();
  readonly #days: RecordedDays;
  readonly #search: TextSearch;
  readonly #actions: OverviewActions;
  #cameras: readonly Camera[] = [];
  #onStage: readonly number[] = [];
  /** While the timeline is being moved. */
  #debounce: ReturnType<typeof setTimeout> | undefined;

  constructor(recordings: Recordings, preferences: Preferences, actions: OverviewActions) {
    this.#actions = actions;
    this.cache = new FootageCache(recordings, () => {
      this.#showFootage();
      actions.learned();
    });
    this.outline = new FootageOutline(recordings, () => this.timeline.redraw());
    this.#days = new RecordedDays(recordings, () => this.#showDays());
    const scope = () => ({ cameras: this.#chosen, kinds: this.filter.kinds });
    this.#search = new TextSearch(recordings, scope, () => this.#showFootage());
    this.filter = new EventFilter(preferences, () => actions.filtered(), this.#search.root);
    this.list = new EventList(
      (camera) => this.nameOf(camera),
      (footage, widthPx) => recordings.stillAddress(footage, footage.moment * 1000, widthPx),
      actions,
    );
    const stillAddress = recordings.stillAddress.bind(recordings);
    this.timeline = new Timeline(this.cache, this.outline, { ...actions, stillAddress, moved: () => this.#onMoved() });
    this.calendar = new Calendar(this.#days, () => this.#chosen, (dayMs) => this.#pickDay(dayMs));
  }

  /** All that there are; of these the user chooses. */
  set cameras(cameras: readonly Camera[]) {
    this.#cameras = cameras;
    this.filter.setCameras(cameras);
    this.filter.setGroups([]);
  }

  get cameras(): readonly Camera[] {
    return this.#cameras;
  }

  /** What is listed now: of the cameras that were chosen those that there are. */
  get choice(): ListChoice {
    return { ...this.filter.choice, cameras: this.#chosen, words: this.#search.words };
  }

  /** Lists what a link asks for. */
  follow(choice: ListChoice): void {
    this.#search.words = choice.words;
    this.filter.follow(choice);
  }

  nameOf(camera: number): string {
    return this.#cameras.find(({ id }) => id === camera)?.name ?? `Camera ${camera}`;
  }

  /** Shows a lane for each camera that is chosen, or on the stage. */
  showLanes(onStage: readonly number[]): void {
    this.#onStage = onStage;
    this.timeline.setKinds(this.filter.kinds);
    const lanes = this.#cameras.filter(({ id }) => this.#loaded.includes(id));
    this.timeline.setLanes(lanes.map(({ id, name }) => ({ camera: id, name })), onStage);
    this.#search.refresh();
    // On a phone the timeline may be out of sight, and then tells of no span that has to be loaded.
    this.reload();
  }

  /** Brings the footage, of which that time is played, into sight. */
  reveal(footage: Footage, atMs: number): void {
    this.filter.include(footage.camera);
    this.timeline.reveal(atMs);
  }

  showPlayback(footage: Footage | null, playheadMs: number | null, isPlaying: boolean): void {
    this.timeline.setPlayhead(playheadMs, footage, isPlaying);
    this.calendar.mark(footage && playheadMs);
    this.list.select(footage);
    const atS = (playheadMs ?? 0) / 1000;
    this.markText.show(footage && markAt([footage, ...this.cache.get(footage.camera, atS, atS).footage], atS));
  }

  /** Loads what the timeline shows now, and what has been recorded since. */
  reload(): void {
    if (document.hidden || this.#cameras.length === 0) return;
    const { startMs, endMs, msPerPx, widthPx } = this.timeline.scale;
    if (!this.timeline.showsEvents) this.outline.load(this.#loaded, startMs, msPerPx, widthPx);
    else void this.cache.load(this.#loaded, startMs / 1000, endMs / 1000, true).then(() => this.#showFootage());
    // Asks again for days that the server did not answer for.
    this.calendar.refresh();
    this.#showFootage();
  }

  /** Whether a day has recordings is asked again: retention deletes them. */
  forgetDays(): void {
    this.#days.clear();
  }

  close(): void {
    clearTimeout(this.#debounce);
    this.#search.close();
    this.timeline.close();
    this.list.close();
  }

  get #chosen(): number[] {
    return this.filter.cameras.map(({ id }) => id);
  }

  get #loaded(): number[] {
    return [...new Set([...this.#chosen, ...this.#onStage])];
  }

  #pickDay(dayMs: number): void {
    this.timeline.showDay(dayMs);
    this.calendar.select(dayMs);
    this.#actions.dayPicked();
  }

  /** Loads what the timeline shows now, but not while it is still being moved. */
  #onMoved(): void {
    const { startMs, endMs } = this.timeline.scale;
    if (this.timeline.showsEvents) this.calendar.select((startMs + Math.min(endMs, Date.now())) / 2);
    clearTimeout(this.#debounce);
    this.#debounce = setTimeout(() => {
      this.#debounce = undefined;
      this.reload();
    }, kDebounceMs);
    this.#actions.moved();
  }

  #showDays(): void {
    this.calendar.refresh();
    this.#showFootage();
  }

  #showFootage(): void {
    this.timeline.redraw();
    // Listed when it has come to rest: thousands of events take longer than a frame.
    if (this.#debounce !== undefined) return;
    if (this.#search.isActive) return this.list.show(this.#search.found.map(rowOf), this.#search.head, this.#search.note);
    const { startMs, endMs } = this.timeline.scale;
    const span = spanText(startMs, Math.min(endMs, Date.now()));
    if (!this.timeline.showsEvents) return this.list.show([], span, "Show four days or less to list events.");
    const [fromS, toS] = [startMs / 1000, endMs / 1000];
    const recorded = this.#chosen
      .flatMap((camera) => this.cache.get(camera, fromS, toS).footage)
      .filter((one) => one.stop >= fromS && one.start < toS);
    const isKnown = this.#cameras.length > 0 && !this.cache.requests.isBusy && !this.cache.requests.error;
    const whyNone = isKnown ? whyNoEvents(this.filter, recorded.length, this.calendar) : "";
    listEvents(this.list, this.filter, recorded, span, whyNone);
  }
}
