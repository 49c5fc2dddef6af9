// SPDX-License-Identifier: Apache-2.0
//
// The past of all cameras: the stage with its players, the timeline below, calendar, filter and list beside.

import { kindOf } from "../../playback/coverage";
import { RecordedDays } from "../../playback/recorded_days";
import { SyncPlayback } from "../../playback/sync_playback";
import { FootageCache } from "../../playback/footage_cache";
import { kRates } from "../../playback/player";
import { Recordings, type Footage } from "../../wire/recordings";
import { ServerError, type Account, type Camera, type Server } from "../../wire/server";
import { iconButton } from "../widgets/button";
import { Calendar } from "../events/calendar";
import { element, setText } from "../widgets/dom";
import { EventFilter } from "../events/event_filter";
import { EventList } from "../events/event_list";
import { toggleFullScreen } from "../widgets/full_screen";
import { icon } from "../widgets/icons";
import { navigation } from "./navigation";
import { notify } from "../widgets/notice";
import { PlayerTile } from "../events/player_tile";
import { nameFootage, openFootage } from "./route";
import { logoutButton } from "./log_out";
import { clockTime } from "../widgets/text";
import { spanText } from "../timeline/time_scale";
import { Timeline } from "../timeline/timeline";
import { Transport } from "../events/transport";

const kTickMs = 250;
const kLiveEveryMs = 5_000;
const kForgetDaysMs = 300_000;
/** Four pictures fill a stage, and four streams are what a browser carries beside its other requests. */
const kMostPlayers = 4;
/** The list is for reading: a longer one is cut, and says so. */
const kMostRows = 20_000;
const kZoomStep = 2;
const kSettleMs = 150;

export class EventsScreen {
  readonly root: HTMLElement;
  readonly #server: Server;
  readonly #recordings: Recordings;
  readonly #history: FootageCache;
  readonly #days: RecordedDays;
  readonly #playback: SyncPlayback;
  readonly #timeline: Timeline;
  readonly #calendar: Calendar;
  readonly #filter: EventFilter;
  readonly #list: EventList;
  readonly #transport: Transport;
  readonly #stage = element("div", { class: "stage" });
  readonly #status = element("p", { class: "wall-count" });
  readonly #clock = element("time", { class: "wall-clock" });
  readonly #progress = element("div", { class: "progress", role: "progressbar", "aria-label": "Loading" });
  readonly #players: number;
  readonly #onRoute = () => void this.#followRoute();
  readonly #onKey = (event: KeyboardEvent) => this.#key(event);
  readonly #onVisible = () => this.#onHidden();
  readonly #tick = setInterval(() => this.#refresh(), kTickMs);
  readonly #liveTimer = setInterval(() => this.#askAnew(), kLiveEveryMs);
  readonly #daysTimer = setInterval(() => this.#days.forget(), kForgetDaysMs);
  #tiles: PlayerTile[] = [];
  #cameras: Camera[] = [];
  #opening = "";
  #trouble = "";
  #settling: ReturnType<typeof setTimeout> | undefined;
  #drawing = 0;

  constructor(server: Server, account: Account, onLogout: () => void) {
    this.#server = server;
    this.#players = Math.max(1, Math.min(account.players_per_session ?? 1, kMostPlayers));
    this.#recordings = new Recordings(server);
    this.#history = new FootageCache(this.#recordings, () => this.#showPast());
    this.#days = new RecordedDays(this.#recordings, () => this.#showDays());
    this.#playback = new SyncPlayback(this.#recordings, this.#history, () => this.#showSoon());
    this.#filter = new EventFilter(() => this.#showLanes());
    this.#list = new EventList((camera) => this.#nameOf(camera), (footage) => this.#open(footage));
    this.#timeline = new Timeline(this.#history, this.#days, {
      seek: (atMs, camera) => this.#seek(atMs, camera),
      open: (footage) => this.#open(footage),
      scrub: (atMs) => this.#playback.seek(atMs),
      toggle: (camera) => this.#toggleCamera(camera),
      moved: () => this.#moved(),
    });
    this.#calendar = new Calendar(this.#days, () => this.#chosen(), (dayMs) => this.#pickDay(dayMs));
    this.#transport = new Transport(this.#playback, this.#recordings, {
      toggle: () => this.#toggle(),
      step: (by) => this.#playback.step(by),
      skip: (by) => void this.#skip(by),
      rate: (rate) => this.#playback.setRate(rate),
      now: () => this.#timeline.showNow(),
      fullScreen: toggleFullScreen,
    });
    this.root = this.#build(account, onLogout);
    addEventListener("popstate", this.#onRoute);
    document.addEventListener("keydown", this.#onKey);
    document.addEventListener("visibilitychange", this.#onVisible);
    void this.#load();
  }

  /** Ends all streams. */
  close(): void {
    for (const timer of [this.#tick, this.#liveTimer, this.#daysTimer]) clearInterval(timer);
    clearTimeout(this.#settling);
    cancelAnimationFrame(this.#drawing);
    removeEventListener("popstate", this.#onRoute);
    document.removeEventListener("keydown", this.#onKey);
    document.removeEventListener("visibilitychange", this.#onVisible);
    this.#playback.close();
    this.#timeline.close();
    this.#list.close();
  }

  #build(account: Account, onLogout: () => void): HTMLElement {
    const busy = (isBusy: boolean) => (this.#progress.hidden = !isBusy);
    const brand = element("div", { class: "brand" }, icon("lighthouse"), element("h1", {}, "Lookhaven"));
    const logout = logoutButton(this.#server, account, onLogout, busy);
    const bar = element("header", { class: "bar" }, brand, navigation("events"), this.#status, this.#clock, logout);
    const zoom = element(
      "div",
      { class: "timeline-zoom", role: "group", "aria-label": "Zoom" },
      iconButton("zoomOut", "Show more time", () => this.#timeline.zoom(kZoomStep), "-"),
      iconButton("zoomIn", "Show less time", () => this.#timeline.zoom(1 / kZoomStep), "+"),
    );
    this.#transport.root.append(zoom);
    const side = element("aside", { class: "side" }, this.#calendar.root, this.#filter.root, this.#list.root);
    const main = element("div", { class: "events-main" }, this.#stage, this.#transport.root, this.#timeline.root);
    const body = element("div", { class: "events-body" }, main, side);
    return element("main", { class: "screen events" }, bar, this.#progress, body);
  }

  async #load(): Promise<void> {
    try {
      this.#cameras = (await this.#server.cameras()).camera ?? [];
      this.#trouble = "";
    } catch (error) {
      this.#trouble = error instanceof ServerError ? error.message : String(error);
      return this.#refresh();
    }
    this.#filter.setCameras(this.#cameras);
    this.#filter.setGroups([]);
    // A host without a catalogue has no groups.
    void this.#recordings.groups().then(
      (groups) => this.#filter.setGroups(groups),
      () => undefined,
    );
    this.#showLanes();
    await this.#followRoute();
  }

  #chosen(): number[] {
    return this.#filter.cameras.map(({ id }) => id);
  }

  #nameOf(camera: number): string {
    return this.#cameras.find(({ id }) => id === camera)?.name ?? `Camera ${camera}`;
  }

  /** Shows what the address names, unless it is being shown. */
  async #followRoute(): Promise<void> {
    const wanted = openFootage();
    // "Back" from what is being played ends it.
    if (!wanted) return this.#playback.close();
    if (isSame(wanted, this.#playback.lead?.player.footage)) return;
    const opening = (this.#opening = `${wanted.kind}${wanted.id}`);
    try {
      const footage = await this.#recordings.find(wanted);
      if (this.#opening !== opening) return;
      if (footage) this.#open(footage);
      else notify("There is no such recording any more, or it is not for you to see.");
    } catch (error) {
      notify(error instanceof ServerError ? error.message : String(error));
    }
  }

  #open(footage: Footage): void {
    this.#filter.include(footage.camera);
    this.#stageOn(footage.camera);
    this.#timeline.reveal(footage.start * 1000);
    this.#playback.open(footage);
  }

  #seek(atMs: number, camera: number): void {
    this.#stageOn(camera);
    this.#playback.seek(atMs, camera, true);
  }

  /** Makes sure that the camera has a player; the stage's last camera makes room where there is none. */
  #stageOn(camera: number): void {
    const staged = this.#playback.tracks.map((track) => track.camera);
    if (staged.includes(camera)) return;
    this.#setStage([...staged.slice(0, this.#players - 1), camera]);
  }

  #toggleCamera(camera: number): void {
    const staged = this.#playback.tracks.map((track) => track.camera);
    if (!staged.includes(camera)) this.#setStage([...staged, camera].slice(-this.#players));
    else if (staged.length > 1) this.#setStage(staged.filter((one) => one !== camera));
  }

  #setStage(cameras: readonly number[]): void {
    this.#playback.setCameras(cameras);
    this.#tiles = this.#playback.tracks.map(({ camera, player }) => {
      return new PlayerTile(this.#nameOf(camera), player, () => this.#playback.play());
    });
    this.#stage.dataset["players"] = String(this.#tiles.length);
    this.#stage.replaceChildren(...this.#tiles.map(({ root }) => root));
    this.#showLanes();
  }

  #showLanes(): void {
    const lanes = this.#filter.cameras;
    if (this.#playback.tracks.length === 0 && lanes[0]) return this.#setStage([lanes[0].id]);
    const staged = this.#playback.tracks.map((track) => track.camera);
    this.#timeline.setKinds(this.#filter.kinds);
    this.#timeline.setLanes(lanes.map(({ id, name }) => ({ camera: id, name })), staged);
    this.#calendar.refresh();
    this.#showPast();
  }

  #pickDay(dayMs: number): void {
    this.#timeline.showDay(dayMs);
    this.#calendar.select(dayMs);
  }

  /** Asks for what the timeline shows now, but not while it is still being moved. */
  #moved(): void {
    const { startMs, endMs } = this.#timeline.scale;
    if (this.#timeline.isFine) this.#calendar.select((startMs + Math.min(endMs, Date.now())) / 2);
    clearTimeout(this.#settling);
    this.#settling = setTimeout(() => this.#askAnew(), kSettleMs);
    this.#showSoon();
  }

  #askAnew(): void {
    if (document.hidden || this.#cameras.length === 0) return;
    const { startMs, endMs } = this.#timeline.scale;
    if (!this.#timeline.isFine) this.#days.ask(this.#chosen(), startMs, endMs);
    else void this.#history.ask(this.#chosen(), startMs / 1000, endMs / 1000, true);
    this.#showPast();
  }

  #showDays(): void {
    this.#calendar.refresh();
    this.#timeline.redraw();
  }

  #showPast(): void {
    this.#timeline.redraw();
    const { startMs, endMs } = this.#timeline.scale;
    const toMs = Math.min(endMs, Date.now());
    if (!this.#timeline.isFine) return this.#list.show([], spanText(startMs, toMs), "Show four days or less to list events.");
    const [fromS, toS] = [startMs / 1000, endMs / 1000];
    const rows = this.#chosen()
      .flatMap((camera) => this.#history.of(camera, fromS, toS).footage)
      .filter((one) => one.stop >= fromS && one.start < toS && this.#filter.kinds.has(kindOf(one)))
      .sort((one, other) => other.start - one.start || other.id - one.id);
    const head = `${rows.length} ${rows.length === 1 ? "event" : "events"} · ${spanText(startMs, toMs)}`;
    const nothing = this.#history.isBusy ? "" : "Nothing here. The calendar shows the days with recordings.";
    const note = rows.length > kMostRows ? "Older ones: show less time." : rows.length > 0 ? "" : nothing;
    this.#list.show(rows.slice(0, kMostRows), head, note);
  }

  /** At most once a screen, however many frames the players show. */
  #showSoon(): void {
    this.#drawing ||= requestAnimationFrame(() => {
      this.#drawing = 0;
      this.#showDeck();
    });
  }

  #showDeck(): void {
    const footage = this.#playback.lead?.player.footage ?? null;
    for (const tile of this.#tiles) tile.refresh(this.#playback.playheadMs);
    this.#timeline.setPlayhead(this.#playback.playheadMs, footage, this.#playback.isPlaying);
    this.#transport.refresh();
    this.#list.select(footage);
    if (!footage) return;
    this.#opening = "";
    nameFootage(footage);
  }

  #refresh(): void {
    this.#playback.tick();
    const trouble = this.#trouble || this.#history.error;
    const empty = this.#cameras.length === 0 && this.#progress.hidden ? "No cameras" : "";
    this.#progress.hidden = !this.#history.isBusy && (this.#cameras.length > 0 || trouble !== "");
    setText(this.#status, trouble || empty);
    this.#status.classList.toggle("alarm", trouble !== "");
    setText(this.#clock, clockTime(Date.now()));
  }

  #toggle(): void {
    if (this.#playback.isPlaying) this.#playback.pause();
    else this.#playback.play();
  }

  async #skip(by: 1 | -1): Promise<void> {
    const next = await this.#playback.neighbour(by);
    if (!next) return notify(by > 0 ? "There is no later event." : "There is no earlier event in these hours.");
    this.#timeline.reveal(next.start * 1000);
    this.#playback.open(next, next.start * 1000, this.#playback.isPlaying);
  }

  /** What nobody sees is not played. */
  #onHidden(): void {
    if (document.hidden) this.#playback.pause();
    else this.#askAnew();
  }

  #key(event: KeyboardEvent): void {
    if (event.altKey || event.ctrlKey || event.metaKey || event.defaultPrevented) return;
    const target = event.target as HTMLElement;
    const isTyping = /^(SELECT|SUMMARY)$/.test(target.tagName) || target.closest("label") !== null;
    const isButton = /^(BUTTON|A|INPUT)$/.test(target.tagName);
    if (isTyping) return;
    if (event.key === " " && !isButton) this.#toggle();
    else if (event.key === "ArrowLeft") this.#playback.step(event.shiftKey ? -10 : -1);
    else if (event.key === "ArrowRight") this.#playback.step(event.shiftKey ? 10 : 1);
    else if (event.key === "ArrowUp") void this.#skip(-1);
    else if (event.key === "ArrowDown") void this.#skip(1);
    else if (event.key === "[") this.#changeRate(-1);
    else if (event.key === "]") this.#changeRate(1);
    else if (event.key.toLowerCase() === "f") toggleFullScreen();
    else return;
    event.preventDefault();
  }

  #changeRate(by: number): void {
    const at = kRates.findIndex((rate) => rate === this.#playback.rate);
    const rate = kRates[at + by];
    if (rate !== undefined) this.#playback.setRate(rate);
  }
}

function isSame(one: { kind: string; id: number }, other: Footage | null | undefined): boolean {
  return one.kind === other?.kind && one.id === other.id;
}
