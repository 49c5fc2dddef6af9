// SPDX-License-Identifier: Apache-2.0
//
// The recordings of all cameras: the stage with its players, the timeline below; calendar, filter and list beside.

import { streamLimit } from "../../live/stream_budget";
import { EventWalk, type Direction } from "../../playback/event_walk";
import { kRates } from "../../playback/player_state";
import { SyncPlayback } from "../../playback/sync_playback";
import { Exports } from "../../wire/exports";
import type { Footage } from "../../wire/footage";
import { keepTrying } from "../../wire/keep_trying";
import { protocol } from "../../wire/protocol";
import { Recordings, type EventCursor } from "../../wire/recordings";
import { SnapshotDialog } from "../camera/snapshot_dialog";
import { EventsJumps } from "../events/events_jumps";
import { kEventsKeys, pressEventsKey, type EventsActions } from "../events/events_keys";
import { EventsLayout } from "../events/events_layout";
import { ExportPanel } from "../events/export_panel";
import { KeepButton } from "../events/keep_button";
import { tellNewEvents } from "../events/new_events";
import { Overview } from "../events/overview";
import { Scrubbing } from "../events/scrubbing";
import { ShownAddress } from "../events/shown_address";
import { Stage } from "../events/stage";
import { StagePicker } from "../events/stage_picker";
import { Transport } from "../events/transport";
import { showCamera } from "../route";
import { element, setText } from "../widgets/dom";
import { toggleFullScreen } from "../widgets/full_screen";
import type { KeyList } from "../widgets/keys_dialog";
import { notify } from "../widgets/notice";
import { OncePerFrame } from "../widgets/once_per_frame";
import { spanInWords } from "../widgets/text";
import { Screen } from "./screen";
import type { Session } from "./session";

const kRefreshMs = 250;
const kReloadIntervalMs = 5_000;
const kDaysIntervalMs = 300_000;
/** More are too small to see anything. */
const kMaxPlayers = 9;

export class EventsScreen extends Screen {
  readonly #recordings = new Recordings(this.server);
  readonly #exports = new Exports(this.server);
  readonly #showing = new OncePerFrame(() => this.#showPlayback());
  readonly #overview = new Overview(this.#recordings, this.preferences, {
    seek: (atMs, camera) => this.#seek(atMs, camera),
    open: (footage) => this.#jumps.open(footage),
    sameMoment: (footage) => void this.#jumps.sameMoment(footage),
    scrub: (atMs) => this.#scrubbing.to(atMs),
    release: (atMs) => this.#scrubbing.release(atMs),
    toggle: (camera) => this.#stage.toggle(camera),
    moved: () => this.#showing.request(),
    choose: (span) => this.#export.setSpan(span),
    filtered: () => this.#showLanes(),
    dayPicked: () => this.#layout.choose("list"),
    learned: () => this.#scrubbing.refresh(),
  });
  readonly #playback = new SyncPlayback(
    this.#recordings,
    this.#overview.cache,
    () => this.#showing.request(),
    (seconds) => notify(`Skipped ${spanInWords(seconds)} without recordings.`),
  );
  readonly #walk = new EventWalk(this.#recordings, () => this.#cursor(), () => this.#showing.request());
  readonly #export = new ExportPanel(this.#exports, (span) => this.#overview.timeline.chooseSpan(span));
  readonly #stage: Stage;
  readonly #picker: StagePicker;
  readonly #scrubbing: Scrubbing;
  readonly #jumps: EventsJumps;
  readonly #transport: Transport;
  readonly #layout: EventsLayout;
  readonly #address: ShownAddress;
  readonly #snapshots = new SnapshotDialog(this.server);
  readonly #status = element("p", { class: "bar-status" });
  readonly #actions: EventsActions = {
    toggle: () => this.#togglePlaying(),
    step: (by) => this.#playback.step(by),
    skip: (by) => void this.#jumps.skip(by),
    jump: (ms) => this.#jumps.by(ms),
    askTime: () => this.#jumps.ask(this.root),
    sameMoment: () => void this.#jumps.sameMoment(null),
    live: () => this.#goLive(),
    layout: (layout) => this.#stage.setLayout(layout),
    enlarge: () => this.#stage.enlarge(),
    back: () => this.#closeExport() || (this.#stage.large !== null && this.#stage.enlarge()),
    rate: (rate) => this.#playback.setRate(rate),
    changeRate: (by) => this.#changeRate(by),
    exportSpan: () => this.#toggleExport(),
    sound: () => this.#toggleSound(),
    snapshot: () => this.#takeSnapshot(),
    fullScreen: toggleFullScreen,
  };
  /** Why there is no list of cameras; empty when there is. */
  #error = "";
  #isListed = false;

  constructor(session: Session) {
    super("events", session);
    const limits = [session.account.players_per_session ?? 1, streamLimit(protocol()), kMaxPlayers];
    const maxPlayers = Math.max(1, Math.min(...limits));
    const nameOf = (camera: number) => this.#overview.nameOf(camera);
    this.#stage = new Stage(this.#playback, maxPlayers, () => this.#showLanes());
    this.#picker = new StagePicker(maxPlayers, (layout) => this.#stage.setLayout(layout));
    this.#scrubbing = new Scrubbing(this.#recordings, this.#playback, this.#stage);
    this.#jumps = new EventsJumps(this.#playback, this.#overview, this.#stage, this.#walk, () => this.#address.leave());
    const shown = { recordings: this.#recordings, playback: this.#playback, overview: this.#overview };
    this.#address = new ShownAddress({ ...shown, stage: this.#stage, jumps: this.#jumps });
    const changed = (footage: Footage) => this.#onKeepingChanged(footage);
    const keeping = new KeepButton(this.#recordings, this.#exports, session.account.is_manager, changed);
    this.#transport = new Transport(this.#playback, this.#walk, nameOf, keeping, this.#actions);
    this.#layout = new EventsLayout(this.#stage, this.#transport, this.#export, this.#overview);
    this.addToBar(this.#status, this.#picker.root);
    this.front.append(this.#layout.root, keeping.dialog, this.#snapshots.root);
    const onVisibility = () => this.#onVisibility();
    document.addEventListener("visibilitychange", onVisibility, { signal: this.closed });
    this.every(kRefreshMs, () => this.#refresh());
    this.every(kReloadIntervalMs, () => this.#overview.reload());
    this.every(kDaysIntervalMs, () => this.#overview.forgetDays());
    tellNewEvents(this.server.alerts, this.closed);
    void this.#load();
  }

  override close(): void {
    super.close();
    this.#showing.cancel();
    this.#scrubbing.close();
    this.#playback.close();
    this.#export.close();
    this.#export.cancel();
    this.#snapshots.root.close();
    this.#overview.close();
  }

  /** Asks first where an export would end. */
  override canLeave(): boolean {
    return !this.#export.isRunning || confirm("Leave, and cancel the export that runs?");
  }

  followRoute(): boolean {
    void this.#address.follow();
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
    const footage = this.#playback.active?.player.footage ?? null;
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
    this.#isListed = true;
    this.#overview.cameras = list.camera ?? [];
    this.#stage.setCameras(this.#overview.cameras);
    this.#error = "";
    const ignore = () => undefined;
    // A host without a catalogue has no groups; and whatever is offered, the server refuses what is denied.
    void this.#recordings.groups().then((groups) => this.#overview.filter.setGroups(groups.filter(({ cameras }) => cameras.length > 0)), ignore);
    const deny = (denied: ReadonlySet<number>) => [this.#transport, this.#export].forEach((one) => one.deny(denied));
    void this.#exports.denied().then(deny, ignore);
    this.#showLanes();
    await this.#address.follow();
  }

  #seek(atMs: number, camera: number): void {
    this.#stage.include(camera);
    this.#playback.seek(atMs, camera, true);
  }

  #showLanes(): void {
    const [first] = this.#overview.filter.cameras;
    if (this.#stage.cameras.length === 0 && first) return this.#stage.include(first.id);
    this.#picker.show(this.#stage.plan.layout);
    this.#overview.showLanes(this.#stage.cameras);
  }

  #showPlayback(): void {
    const footage = this.#playback.active?.player.footage ?? null;
    this.#stage.refresh();
    this.#transport.refresh();
    this.#overview.showPlayback(footage, this.#playback.playheadMs, this.#playback.isPlaying);
    this.#walk.refresh();
    this.#address.record();
  }

  #refresh(): void {
    this.#playback.tick();
    this.#address.record();
    const { cache, outline, cameras, timeline } = this.#overview;
    const error = this.#error || (timeline.showsEvents ? cache : outline).requests.error;
    const empty = this.#isListed && cameras.length === 0 ? "No cameras" : "";
    this.progress.hidden = !cache.requests.isBusy && !outline.requests.isBusy && (this.#isListed || error !== "");
    setText(this.#status, error || empty);
    this.#status.classList.toggle("alarm", error !== "");
  }

  #takeSnapshot(): void {
    const { active } = this.#stage;
    const taken = active === null || this.#transport.isDenied(active) ? null : this.#stage.snapshot();
    if (taken) void this.#snapshots.take(taken.camera, () => taken.picture);
  }

  #toggleSound(): void {
    const error = this.#playback.active?.player.sound.error;
    if (error) notify(`${error}.`);
    this.#playback.toggleSound();
  }

  #togglePlaying(): void {
    if (this.#playback.isPlaying) this.#playback.pause();
    else this.#playback.play();
  }

  /** Where the walk through the events is, and which it stops at. */
  #cursor(): EventCursor | null {
    const { filter } = this.#overview;
    const cameras = filter.cameras.map(({ id }) => id);
    if (cameras.length === 0) return null;
    const kinds = [...filter.kinds];
    const footage = this.#playback.active?.player.footage;
    if (footage) return { cameras, kinds, atS: footage.start, id: footage.id };
    return { cameras, kinds, atS: Math.floor((this.#playback.playheadMs ?? Date.now()) / 1000) };
  }

  /** What nobody sees is not played. */
  #onVisibility(): void {
    if (document.hidden) this.#playback.pause();
    else this.#overview.reload();
  }

  /** To the live picture of the camera on the stage, or to the wall. */
  #goLive(): void {
    const [camera, another] = this.#stage.cameras;
    this.#address.leave();
    if (camera !== undefined && another === undefined) showCamera(camera);
    else location.hash = "#";
  }

  #changeRate(by: Direction): void {
    const at = kRates.findIndex((rate) => rate === this.#playback.rate);
    const rate = kRates[at + by];
    if (rate !== undefined) this.#playback.setRate(rate);
  }
}
