// SPDX-License-Identifier: Apache-2.0
//
// The recordings of all cameras: the stage with its players, the timeline below; calendar, filter and list beside.

import { kindOf } from "../../playback/coverage";
import { EventWalk, type Direction } from "../../playback/event_walk";
import { FootageCache } from "../../playback/footage_cache";
import { kRates } from "../../playback/player_state";
import { RecordedDays } from "../../playback/recorded_days";
import { SyncPlayback } from "../../playback/sync_playback";
import { Exports } from "../../wire/exports";
import { isSameFootage, Recordings, type EventPlace, type Footage } from "../../wire/recordings";
import { ServerError, type Camera } from "../../wire/server";
import { Calendar } from "../events/calendar";
import { EventFilter } from "../events/event_filter";
import { EventList, eventText } from "../events/event_list";
import { KeepButton } from "../events/keep_button";
import { ExportPanel } from "../events/export_panel";
import { Stage } from "../events/stage";
import { Transport } from "../events/transport";
import { spanText } from "../timeline/time_scale";
import { Timeline } from "../timeline/timeline";
import { iconButton } from "../widgets/button";
import { Choice } from "../widgets/choice";
import { element, setText } from "../widgets/dom";
import { toggleFullScreen } from "../widgets/full_screen";
import { hasFocusByPointer } from "../widgets/key_owner";
import type { KeyList } from "../widgets/keys_dialog";
import { notify } from "../widgets/notice";
import { spanInWords } from "../widgets/text";
import { keepTrying } from "./keep_trying";
import { openFootage, recordFootage } from "./route";
import { Screen, type Session } from "./screen";

const kRefreshMs = 250;
const kReloadIntervalMs = 5_000;
const kDaysIntervalMs = 300_000;
/** Four pictures fill a stage, and four streams are what a browser carries beside its other requests. */
const kMaxPlayers = 4;
/** The list is for reading: a longer one is cut, and says so. */
const kMaxRows = 20_000;
const kZoomStep = 2;
const kSettleMs = 150;
const kPanels = { list: "Events", calendar: "Calendar", timeline: "Timeline", filter: "Filter" };

export class EventsScreen extends Screen {
  readonly #recordings = new Recordings(this.server);
  readonly #exports = new Exports(this.server);
  readonly #cache = new FootageCache(this.#recordings, () => this.#showFootage());
  readonly #days = new RecordedDays(this.#recordings, () => this.#showDays());
  readonly #playback = new SyncPlayback(
    this.#recordings,
    this.#cache,
    () => this.#showPlaybackSoon(),
    (seconds) => notify(`Skipped ${spanInWords(seconds)} without recordings.`),
  );
  readonly #walk = new EventWalk(this.#recordings, () => this.#place(), () => this.#showPlaybackSoon());
  readonly #filter = new EventFilter(() => this.#showLanes());
  readonly #list = new EventList(
    (camera) => this.#nameOf(camera),
    (footage, widthPx) => this.#recordings.stillAddress(footage, widthPx),
    (footage) => this.#open(footage),
  );
  readonly #export = new ExportPanel(this.#exports, (span) => this.#timeline.chooseSpan(span));
  readonly #stage: Stage;
  readonly #timeline: Timeline;
  readonly #calendar: Calendar;
  readonly #transport: Transport;
  readonly #status = element("p", { class: "bar-status" });
  readonly #body = element("div", { class: "events-body" });
  /** What is shown below the player where there is no room for all of it. */
  readonly #panels = new Choice<keyof typeof kPanels>("Show", kPanels, "list", (panel) => (this.#body.dataset["panel"] = panel));
  #cameras: Camera[] = [];
  /** What the address asks for while it is being looked up. */
  #opening = "";
  /** Why there is no list of cameras; empty when there is. */
  #error = "";
  #settling: ReturnType<typeof setTimeout> | undefined;
  #animationFrame = 0;

  constructor(session: Session) {
    super("events", session);
    const maxPlayers = Math.max(1, Math.min(session.account.players_per_session ?? 1, kMaxPlayers));
    this.#stage = new Stage(this.#playback, maxPlayers, (camera) => this.#nameOf(camera), () => this.#showLanes());
    this.#timeline = new Timeline(this.#cache, this.#days, {
      seek: (atMs, camera) => this.#seek(atMs, camera),
      open: (footage) => this.#open(footage),
      scrub: (atMs) => this.#playback.seek(atMs),
      toggle: (camera) => this.#stage.toggle(camera),
      moved: () => this.#onTimelineMoved(),
      choose: (span) => this.#export.setSpan(span),
    });
    this.#calendar = new Calendar(this.#days, () => this.#chosenCameras(), (dayMs) => this.#pickDay(dayMs));
    const changed = (footage: Footage) => this.#onKeepingChanged(footage);
    const keeping = new KeepButton(this.#recordings, this.#exports, session.account.is_manager, changed);
    this.#transport = new Transport(this.#playback, this.#walk, (camera) => this.#nameOf(camera), keeping, {
      toggle: () => this.#togglePlaying(),
      step: (by) => this.#playback.step(by),
      skip: (by) => void this.#skip(by),
      rate: (rate) => this.#playback.setRate(rate),
      now: () => this.#timeline.showNow(),
      exportSpan: () => this.#openExport(),
      fullScreen: toggleFullScreen,
    });
    this.#build(keeping);
    const onVisibility = () => this.#onVisibility();
    document.addEventListener("visibilitychange", onVisibility, { signal: this.closed });
    this.every(kRefreshMs, () => this.#refresh());
    this.every(kReloadIntervalMs, () => this.#reload());
    this.every(kDaysIntervalMs, () => this.#days.clear());
    void this.#load();
  }

  override close(): void {
    super.close();
    clearTimeout(this.#settling);
    cancelAnimationFrame(this.#animationFrame);
    this.#playback.close();
    this.#export.close();
    this.#timeline.close();
    this.#list.close();
  }

  followRoute(): boolean {
    void this.#openRoute();
    return true;
  }

  protected get keys(): KeyList {
    return [
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
  }

  protected pressKey(event: KeyboardEvent): boolean {
    if (this.root.querySelector("dialog[open]")) return false;
    // From day to day and from row to row, for whoever came there with the keyboard.
    const isWithin = (selector: string) => !hasFocusByPointer() && (event.target as Element).closest(selector) !== null;
    if (event.key.startsWith("Arrow") && isWithin(".calendar-days")) return false;
    if (event.key.startsWith("Arrow") && (event.target as Element).closest(".span-handle")) return false;
    if (/^Arrow(Up|Down)$/.test(event.key) && isWithin(".list-space")) return false;
    if (event.key === " ") this.#togglePlaying();
    else if (event.key === "ArrowLeft") this.#playback.step(event.shiftKey ? -10 : -1);
    else if (event.key === "ArrowRight") this.#playback.step(event.shiftKey ? 10 : 1);
    else if (event.key === "ArrowUp") void this.#skip(-1);
    else if (event.key === "ArrowDown") void this.#skip(1);
    else if (event.key === "[") this.#changeRate(-1);
    else if (event.key === "]") this.#changeRate(1);
    else if (event.key.toLowerCase() === "x") this.#openExport();
    else if (event.key === "Escape" && this.#export.isOpen) this.#export.close();
    else if (event.key.toLowerCase() === "f") toggleFullScreen();
    else return false;
    return true;
  }

  #build(keeping: KeepButton): void {
    const zoom = element(
      "div",
      { class: "timeline-zoom", role: "group", "aria-label": "Zoom" },
      iconButton("zoomOut", "Show more time", () => this.#timeline.zoom(kZoomStep), "-"),
      iconButton("zoomIn", "Show less time", () => this.#timeline.zoom(1 / kZoomStep), "+"),
    );
    this.#transport.root.append(zoom);
    const side = element("div", { class: "side" }, this.#calendar.root, this.#filter.root, this.#list.root);
    const main = element(
      "div",
      { class: "events-main" },
      this.#stage.root,
      this.#transport.root,
      this.#export.root,
      this.#panels.root,
      this.#timeline.root,
    );
    this.#body.append(main, side);
    this.addToBar(this.#status);
    this.front.append(this.#body, keeping.dialog);
  }

  #openExport(): void {
    if (this.#export.isOpen) return this.#export.close();
    const atMs = this.#playback.playheadMs ?? Date.now();
    const footage = this.#playback.lead?.player.footage ?? null;
    this.#panels.choose("timeline");
    this.#timeline.reveal(footage ? footage.start * 1000 : atMs);
    this.#export.open(this.#filter.cameras, this.#stage.cameras, footage, atMs);
  }

  #onKeepingChanged(footage: Footage): void {
    this.#cache.expire(footage);
    this.#reload();
  }

  async #load(): Promise<void> {
    const failed = (sentence: string) => {
      this.#error = sentence;
      this.#refresh();
    };
    const list = await keepTrying(() => this.server.cameras(), failed, this.closed);
    if (!list) return;
    this.#cameras = list.camera ?? [];
    this.#error = "";
    this.#filter.setCameras(this.#cameras);
    this.#filter.setGroups([]);
    // A host without a catalogue has no groups.
    void this.#recordings.groups().then(
      (groups) => this.#filter.setGroups(groups),
      () => undefined,
    );
    this.#showLanes();
    await this.#openRoute();
  }

  #chosenCameras(): number[] {
    return this.#filter.cameras.map(({ id }) => id);
  }

  #nameOf(camera: number): string {
    return this.#cameras.find(({ id }) => id === camera)?.name ?? `Camera ${camera}`;
  }

  /** Opens what the address names, unless it is being shown. */
  async #openRoute(): Promise<void> {
    const wanted = openFootage();
    // Back from what is being played ends it.
    if (!wanted) return this.#playback.close();
    if (isSameFootage(wanted, this.#playback.lead?.player.footage)) return;
    const opening = (this.#opening = `${wanted.kind}${wanted.id}`);
    try {
      const footage = await this.#recordings.find(wanted);
      if (this.#opening !== opening) return;
      if (footage && wanted.atMs !== null) this.#showPicture(footage, wanted.atMs);
      else if (footage) this.#open(footage);
      else notify("This recording no longer exists, or you do not have permission to view it.");
    } catch (error) {
      notify(error instanceof ServerError ? error.message : String(error));
    }
  }

  #open(footage: Footage, isPlaying = true): void {
    this.#filter.include(footage.camera);
    this.#stage.include(footage.camera);
    this.#timeline.reveal(footage.start * 1000);
    this.#playback.open(footage, footage.start * 1000, isPlaying);
  }

  /** As a link has it that names the time. */
  #showPicture(footage: Footage, atMs: number): void {
    this.#filter.include(footage.camera);
    this.#stage.include(footage.camera);
    this.#timeline.reveal(atMs);
    this.#playback.open(footage, atMs, false);
  }

  #seek(atMs: number, camera: number): void {
    this.#stage.include(camera);
    this.#playback.seek(atMs, camera, true);
  }

  #showLanes(): void {
    const lanes = this.#filter.cameras;
    if (this.#stage.cameras.length === 0 && lanes[0]) return this.#stage.show([lanes[0].id]);
    this.#timeline.setKinds(this.#filter.kinds);
    this.#timeline.setLanes(lanes.map(({ id, name }) => ({ camera: id, name })), this.#stage.cameras);
    // On a phone the timeline may be out of sight, and then tells of no span that has to be loaded.
    this.#reload();
  }

  #pickDay(dayMs: number): void {
    this.#timeline.showDay(dayMs);
    this.#calendar.select(dayMs);
    this.#panels.choose("list");
  }

  /** Loads what the timeline shows now, but not while it is still being moved. */
  #onTimelineMoved(): void {
    const { startMs, endMs } = this.#timeline.scale;
    if (this.#timeline.showsEvents) this.#calendar.select((startMs + Math.min(endMs, Date.now())) / 2);
    clearTimeout(this.#settling);
    this.#settling = setTimeout(() => this.#reload(), kSettleMs);
    this.#showPlaybackSoon();
  }

  #reload(): void {
    if (document.hidden || this.#cameras.length === 0) return;
    const { startMs, endMs } = this.#timeline.scale;
    if (!this.#timeline.showsEvents) this.#days.load(this.#chosenCameras(), startMs, endMs);
    else void this.#cache.load(this.#chosenCameras(), startMs / 1000, endMs / 1000, true);
    // Asks again for days that the server did not answer for.
    this.#calendar.refresh();
    this.#showFootage();
  }

  #showDays(): void {
    this.#calendar.refresh();
    this.#showFootage();
  }

  #showFootage(): void {
    this.#timeline.redraw();
    const { startMs, endMs } = this.#timeline.scale;
    const span = spanText(startMs, Math.min(endMs, Date.now()));
    if (!this.#timeline.showsEvents) return this.#list.show([], span, "Show four days or less to list events.");
    const [fromS, toS] = [startMs / 1000, endMs / 1000];
    const recorded = this.#chosenCameras()
      .flatMap((camera) => this.#cache.get(camera, fromS, toS).footage)
      .filter((one) => one.stop >= fromS && one.start < toS);
    const rows = recorded
      .filter((one) => this.#filter.kinds.has(kindOf(one)) && (one.isKept || !this.#filter.isKeptOnly))
      .sort((one, other) => other.start - one.start || other.id - one.id);
    const head = `${rows.length} ${rows.length === 1 ? "event" : "events"} · ${span}`;
    const nothing = this.#cache.isBusy ? "" : this.#whyNothing(recorded.length);
    const note = rows.length > kMaxRows ? "Show less time to list older events." : rows.length > 0 ? "" : nothing;
    this.#list.show(rows.slice(0, kMaxRows), head, note);
  }

  /** Why no event is listed, and what to do about it; `hidden` are there but filtered out. */
  #whyNothing(hidden: number): string {
    if (this.#cameras.length === 0) return "";
    if (this.#chosenCameras().length === 0) return "No camera is chosen. Choose some under “Cameras”.";
    if (hidden > 0) return `The filter hides ${hidden === 1 ? "one event" : `${hidden} events`}. Choose more kinds, or not only kept ones, to see them.`;
    if (this.#calendar.isLoading) return "";
    if (this.#calendar.hasRecordings) return "No events in this time span. The calendar marks the days with recordings.";
    return (
      "Nothing was recorded of these cameras in the month of the calendar. Look at another month or other cameras; " +
      "a manager starts recording with “lookhaven camera set 1 --record always”."
    );
  }

  /** At most once for each picture of the screen, however many frames the players show. */
  #showPlaybackSoon(): void {
    this.#animationFrame ||= requestAnimationFrame(() => {
      this.#animationFrame = 0;
      this.#showPlayback();
    });
  }

  #showPlayback(): void {
    const footage = this.#playback.lead?.player.footage ?? null;
    this.#stage.refresh();
    this.#timeline.setPlayhead(this.#playback.playheadMs, footage, this.#playback.isPlaying);
    this.#transport.refresh();
    this.#calendar.mark(footage && this.#playback.playheadMs);
    this.#list.select(footage);
    this.#walk.refresh();
    if (!footage) return;
    this.#opening = "";
    this.#recordShown();
  }

  /** Where a picture stands still, the address leads to this one. */
  #recordShown(): void {
    const footage = this.#playback.lead?.player.footage;
    if (footage) recordFootage(footage, this.#playback.isPlaying ? null : this.#playback.playheadMs);
  }

  #refresh(): void {
    this.#playback.tick();
    this.#recordShown();
    const error = this.#error || this.#cache.error;
    const empty = this.#cameras.length === 0 && this.progress.hidden ? "No cameras" : "";
    this.progress.hidden = !this.#cache.isBusy && (this.#cameras.length > 0 || error !== "");
    setText(this.#status, error || empty);
    this.#status.classList.toggle("alarm", error !== "");
  }

  #togglePlaying(): void {
    if (this.#playback.isPlaying) this.#playback.pause();
    else this.#playback.play();
  }

  /** Where the walk through the events is, and which it stops at. */
  #place(): EventPlace | null {
    const cameras = this.#chosenCameras();
    if (cameras.length === 0) return null;
    const kinds = [...this.#filter.kinds];
    const footage = this.#playback.lead?.player.footage;
    if (footage) return { cameras, kinds, atS: footage.start, id: footage.id };
    return { cameras, kinds, atS: Math.floor((this.#playback.playheadMs ?? Date.now()) / 1000) };
  }

  async #skip(by: Direction): Promise<void> {
    try {
      const next = await this.#walk.find(by);
      if (!next) return notify(`There is no ${by > 0 ? "later" : "earlier"} event of these cameras and kinds.`);
      notify(eventText(next, (camera) => this.#nameOf(camera)));
      this.#open(next, this.#playback.isPlaying);
    } catch (error) {
      notify(error instanceof ServerError ? error.message : String(error));
    }
  }

  /** What nobody sees is not played. */
  #onVisibility(): void {
    if (document.hidden) this.#playback.pause();
    else this.#reload();
  }

  #changeRate(by: number): void {
    const at = kRates.findIndex((rate) => rate === this.#playback.rate);
    const rate = kRates[at + by];
    if (rate !== undefined) this.#playback.setRate(rate);
  }
}
