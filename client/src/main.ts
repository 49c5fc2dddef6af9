// SPDX-License-Identifier: Apache-2.0
//
// Starts the web client. Where things are:
//
//   wire/      the network: the web API (server, camera, recordings and their footage, exports, emaps; for managers
//              camera_setup, groups, emap_setup, devices, hosts with their pairing_code, accounts, mounts, system,
//              audit), what the account prefers (preferences, of earlier versions browser_preferences), what is being
//              reported (alerts, from an event_stream), why cameras send nothing (signal_losses), the parts of an
//              endless answer (multipart), files that are sent (upload), requests that end in time (deadline), take
//              turns (semaphore) and are repeated (keep_trying, backoff), cancellable waits (delay), what the page came
//              over (protocol)
//   live/      live pictures: sources of them behind one interface (source: stream_source, snapshot_source), kept
//              running by a feed, watched by signal_state, limited by stream_budget. video_player (with frame_gate)
//              and audio_player (with jitter_buffer) decode compressed streams, av_clock keeps them in sync.
//              unplayable: why a stream cannot be played in this browser. alert_watch: alerts, as they are reported
//   playback/  recordings: what is known of them (footage_cache, footage_lookup, coverage, recorded_days), fetched a
//              few requests at a time (request_queue); a player plays one (player_state, open_footage, shown_frame,
//              still_reader, playback): footage_stream chooses between pictures (frame_stream) and what was recorded
//              (video_stream, with video_decoding and recorded_sound). sync_playback keeps the players of several
//              cameras (tracks) in step by one playback_clock; scrub_stills: the pictures of a playhead that is
//              dragged; still_loader: those of a list; event_walk: the events before and after
//   ui/        app goes from screen to screen, as the address says (route, events/events_route)
//     screens/    what fills the window: login, first account (setup), wall, events, maps, settings; what they have in
//                 common (screen)
//     wall/       the grid of tiles and its layouts; those that are saved, sequences of them, and their menu
//     camera/     one camera live: its picture, the large view, snapshots
//     events/     the stage of players with its transport controls; the overview: calendar, filter and list of events
//     timeline/   the lanes of recordings
//     map/        e-maps and their editor
//     settings/   the sections of the settings: cameras and their groups, maps and devices, accounts, hosts, storage,
//                 system, audit. Most have a list and a page of one record (record_page), whose form (record_form)
//                 notices what others have changed meanwhile (merge, conflict_panel), as do dialogs (seen_record)
//     widgets/    what all of these use: elements, buttons, icons, fields, credentials, dialogs, texts, titles,
//                 notices, keys, panning and zooming
//   style/     base and components are for all, screen for the bar of each screen; every other file is for what its
//              name says
//
// ui may use live, playback and wire; playback uses live and wire, live uses wire. Nothing here writes markup from text
// (see dom), and the page needs neither inline styles nor scripts, so that a content security policy of 'self' holds.

import "./style/base.css";
import "./style/components.css";
import "./style/screen.css";
import "./style/login.css";
import "./style/setup.css";
import "./style/picture.css";
import "./style/wall.css";
import "./style/wall_menu.css";
import "./style/large.css";
import "./style/dialog.css";
import "./style/snapshot.css";
import "./style/keep.css";
import "./style/export.css";
import "./style/stage.css";
import "./style/transport.css";
import "./style/events.css";
import "./style/calendar.css";
import "./style/event_filter.css";
import "./style/event_list.css";
import "./style/mark_text.css";
import "./style/timeline.css";
import "./style/map.css";
import "./style/map_editor.css";
import "./style/form.css";
import "./style/account_menu.css";
import "./style/settings.css";
import "./style/cameras.css";
import "./style/accounts.css";
import "./style/emaps.css";
import "./style/devices.css";
import "./style/storage.css";
import "./style/hosts.css";
import "./style/audit.css";
import "./style/system.css";
import { App } from "./ui/app";

void new App(document.querySelector<HTMLElement>("#app")!).start();
