// SPDX-License-Identifier: Apache-2.0
//
// The recordings of all cameras: the stage with its players, the timeline below; calendar, filter and list beside.

import { EventWalk, type Direction } from "../../playback/event_walk";
import { kRates } from "../../playback/player_state";
import { SyncPlayback } from "../../playback/sync_playback";
import { Exports } from "../../wire/exports";
import { isSameFootage, type Footage } from "../../wire/footage";
import { Recordings, type EventPlace } from "../../wire/recordings";
import { ServerError } from "../../wire/server";
import { eventText } from "../events/event_list";
import { kEventsKeys, pressEventsKey, type EventsActions } from "../events/events_keys";
import { EventsLayout } from "../events/events_layout";
import { KeepButton } from "../events/keep_button";
import { ExportPanel } from "../events/export_panel";
import { Overview } from "../events/overview";
import { Stage } from "../events/stage";
import { Transport } from "../events/transport";
import { element, setText } from "../widgets/dom";
import { toggleFullScreen } from "../widgets/full_screen";
import type { KeyList } from "../widgets/keys_dialog";
import { notify } from "../widgets/notice";
import { OncePerFrame } from "../widgets/once_per_frame";
import { spanInWords } from "../widgets/text";
import { keepTrying } from "./keep_trying";
import { openFootage, recordFootage } from "./route";
import { Screen } from "./screen";
import type { Session } from "./session";

const kRefreshMs = 250;
const kReloadIntervalMs = 5_000;
const kDaysIntervalMs = 300_000;
/** Four pictures fill a stage, and four streams are what a browser carries beside its other requests. */
const kMaxPlayers = 4;

export class EventsScreen extends Screen {
  readonly #recordings = new Recordings(this.server);
  readonly #exports = new Exports(this.server);
  readonly #showing = new OncePerFrame(() => this.#showPlayback());
  readonly #overview = new Overview(this.#recordings, {
    seek: (atMs, camera) => this.#seek(atMs, camera),
    open: (footage) => this.#open(footage),
    scrub: (atMs) => this.#playback.seek(atMs),
    toggle: (camera) => this.#stage.toggle(camera),
    moved: () => this.#showing.request(),
    choose: (span) => this.#export.setSpan(span),
    filtered: () => this.#showLanes(),
    dayPicked: () => this.#layout.choose("list"),
  });
  readonly #playback = new SyncPlayback(
    this.#recordings,
    this.#overview.cache,
    () => this.#showing.request(),
    (seconds) => notify(`Skipped ${spanInWords(seconds)} without recordings.`),
  );
  readonly #walk = new EventWalk(this.#recordings, () => this.#place(), () => this.#showing.request());
  readonly #export = new ExportPanel(this.#exports, (span) => this.#overview.timeline.chooseSpan(span));
  readonly #stage: Stage;
  readonly #transport: Transport;
  readonly #layout: EventsLayout;
  readonly #status = element("p", { class: "bar-status" });
  readonly #actions: EventsActions = {
    toggle: () => this.#togglePlaying(),
    step: (by) => this.#playback.step(by),
    skip: (by) => void this.#skip(by),
    rate: (rate) => this.#playback.setRate(rate),
    changeRate: (by) => this.#changeRate(by),
    now: () => this.#overview.timeline.showNow(),
    exportSpan: () => this.#toggleExport(),
    closeExport: () => this.#closeExport(),
    fullScreen: toggleFullScreen,
  };
  /** What the address asks for while it is being looked up. */
  #opening = "";
  /** Why there is no list of cameras; empty when there is. */
  #error = "";

  constructor(session: Session) {
    super("events", session);
    const maxPlayers = Math.max(1, Math.min(session.account.players_per_session ?? 1, kMaxPlayers));
    const nameOf = (camera: number) => this.#overview.nameOf(camera);
    this.#stage = new Stage(this.#playback, maxPlayers, nameOf, () => this.#showLanes());
    const changed = (footage: Footage) => this.#onKeepingChanged(footage);
    const keeping = new KeepButton(this.#recordings, this.#exports, session.account.is_manager, changed);
    this.#transport = new Transport(this.#playback, this.#walk, nameOf, keeping, this.#actions);
    this.#layout = new EventsLayout(this.#stage, this.#transport, this.#export, this.#overview);
    this.addToBar(this.#status);
    this.front.append(this.#layout.root, keeping.dialog);
    const onVisibility = () => this.#onVisibility();
    document.addEventListener("visibilitychange", onVisibility, { signal: this.closed });
    this.every(kRefreshMs, () => this.#refresh());
    this.every(kReloadIntervalMs, () => this.#overview.reload());
    this.every(kDaysIntervalMs, () => this.#overview.forgetDays());
    void this.#load();
  }

  override close(): void {
    super.close();
    this.#showing.cancel();
    this.#playback.close();
    this.#export.close();
    this.#overview.close();
  }

  followRoute(): boolean {
    void this.#openRoute();
    return true;
  }

  protected get keys(): KeyList {
    return kEventsKeys;
  }

  protected pressKey(event: KeyboardEvent): boolean {
    if (this.root.querySelector("dialog[open]")) return false;
    return pressEventsKey(event, this.#actions);
  }

  #toggleExport(): void {
    if (this.#closeExport()) return;
    const atMs = this.#playback.playheadMs ?? Date.now();
    const footage = this.#playback.lead?.player.footage ?? null;
    this.#layout.choose("timeline");
    this.#overview.timeline.reveal(footage ? footage.start * 1000 : atMs);
    this.#export.open(this.#overview.filter.cameras, this.#stage.cameras, footage, atMs);
  }

  #closeExport(): boolean {
    const wasOpen = this.#export.isOpen;
    if (wasOpen) this.#export.close();
    return wasOpen;
  }

  #onKeepingChanged(footage: Footage): void {
    this.#overview.cache.expire(footage);
    this.#overview.reload();
  }

  async #load(): Promise<void> {
    const failed = (sentence: string) => {
      this.#error = sentence;
      this.#refresh();
    };
    const list = await keepTrying(() => this.server.cameras(), failed, this.closed);
    if (!list) return;
    this.#overview.cameras = list.camera ?? [];
    this.#error = "";
    // A host without a catalogue has no groups.
    void this.#recordings.groups().then(
      (groups) => this.#overview.filter.setGroups(groups),
      () => undefined,
    );
    this.#showLanes();
    await this.#openRoute();
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
      // An address that names a time leads to the picture of it.
      if (footage && wanted.atMs !== null) this.#open(footage, false, wanted.atMs);
      else if (footage) this.#open(footage);
      else notify("This recording no longer exists, or you do not have permission to view it.");
    } catch (error) {
      notify(error instanceof ServerError ? error.message : String(error));
    }
  }

  #open(footage: Footage, isPlaying = true, atMs = footage.start * 1000): void {
    this.#overview.reveal(footage, atMs);
    this.#stage.include(footage.camera);
    this.#playback.open(footage, atMs, isPlaying);
  }

  #seek(atMs: number, camera: number): void {
    this.#stage.include(camera);
    this.#playback.seek(atMs, camera, true);
  }

  #showLanes(): void {
    const [first] = this.#overview.filter.cameras;
    if (this.#stage.cameras.length === 0 && first) return this.#stage.show([first.id]);
    this.#overview.showLanes(this.#stage.cameras);
  }

  #showPlayback(): void {
    const footage = this.#playback.lead?.player.footage ?? null;
    this.#stage.refresh();
    this.#transport.refresh();
    this.#overview.showPlayback(footage, this.#playback.playheadMs, this.#playback.isPlaying);
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
    const { cache, cameras } = this.#overview;
    const error = this.#error || cache.error;
    const empty = cameras.length === 0 && this.progress.hidden ? "No cameras" : "";
    this.progress.hidden = !cache.isBusy && (cameras.length > 0 || error !== "");
    setText(this.#status, error || empty);
    this.#status.classList.toggle("alarm", error !== "");
  }

  #togglePlaying(): void {
    if (this.#playback.isPlaying) this.#playback.pause();
    else this.#playback.play();
  }

  /** Where the walk through the events is, and which it stops at. */
  #place(): EventPlace | null {
    const { filter } = this.#overview;
    const cameras = filter.cameras.map(({ id }) => id);
    if (cameras.length === 0) return null;
    const kinds = [...filter.kinds];
    const footage = this.#playback.lead?.player.footage;
    if (footage) return { cameras, kinds, atS: footage.start, id: footage.id };
    return { cameras, kinds, atS: Math.floor((this.#playback.playheadMs ?? Date.now()) / 1000) };
  }

  async #skip(by: Direction): Promise<void> {
    try {
      const next = await this.#walk.find(by);
      if (!next) return notify(`There is no ${by > 0 ? "later" : "earlier"} event of these cameras and kinds.`);
      notify(eventText(next, (camera) => this.#overview.nameOf(camera)));
      this.#open(next, this.#playback.isPlaying);
    } catch (error) {
      notify(error instanceof ServerError ? error.message : String(error));
    }
  }

  /** What nobody sees is not played. */
  #onVisibility(): void {
    if (document.hidden) this.#playback.pause();
    else this.#overview.reload();
  }

  #changeRate(by: Direction): void {
    const at = kRates.findIndex((rate) => rate === this.#playback.rate);
    const rate = kRates[at + by];
    if (rate !== undefined) this.#playback.setRate(rate);
  }
}
