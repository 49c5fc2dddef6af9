// SPDX-License-Identifier: Apache-2.0
//
// Starts the web client: shows the login or the wall, and goes from one to the other.
//
//   wire/   what comes over the network: the web API (server), the parts of an endless answer (multipart),
//           requests that end in time (deadline)
//   live/   how a picture is kept live: sources of pictures behind one interface (source: stream_source streams,
//           snapshot_source polls), reconnecting (feed, backoff), the verdict on what is shown (signal_state), and the
//           sharing of few connections (stream_budget). Of a compressed stream, media_part tells the pieces apart;
//           video_player decodes the picture (annexb, frame_gate), sound the sound (speaker_worklet with its
//           jitter_buffer), and av_clock keeps them in step. An unplayable is why that cannot be done here.
//   playback/  how the past is played: history and days keep what the server told of it (coverage sorts it); a player plays
//           one recording (frame_stream reads its frames, frame_clock knows their times), a deck several cameras in step.
//   ui/     what is on the screen: login; wall with grid and tiles, large_view, snapshot_dialog; events_screen with the
//           stage of player_tiles and their transport, timeline (time_scale, timeline_drawing), calendar, event_filter and
//           event_list; maps_screen with a map_view of map_items, the map_card of the one that is pointed at, and the
//           map_editor, which keeps its steps in edit_history. A picture is one camera's canvas with its messages. The address says what is open (route).
//
// ui knows live, playback and wire; playback knows wire and of live what waits and takes turns; live knows wire. Nothing here writes markup from text (see dom), and the page needs neither
// inline styles nor scripts, so that a content security policy of 'self' holds.

import "./style/base.css";
import "./style/login.css";
import "./style/wall.css";
import "./style/large.css";
import "./style/snapshot.css";
import "./style/events.css";
import "./style/timeline.css";
import "./style/map.css";
import "./style/map_editor.css";
import { element } from "./ui/widgets/dom";
import { EventsScreen } from "./ui/screens/events_screen";
import { loginScreen } from "./ui/screens/login_screen";
import { MapsScreen } from "./ui/screens/maps_screen";
import { hideNotice } from "./ui/widgets/notice";
import { openScreen, type Screen } from "./ui/screens/route";
import { Wall } from "./ui/screens/wall_screen";
import { Server, ServerError, type Account } from "./wire/server";

const app = document.querySelector<HTMLElement>("#app")!;
/** What a logged-in user sees; null at the login. */
let shown: { screen: Screen; view: { readonly root: HTMLElement; close(): void } } | null = null;
let account: Account | null = null;

const server = new Server(() => showLogin("Your session has ended. Please log in again."));

function showLogin(hint: string): void {
  // A screen closes many requests, each of which may bring the news once more.
  if (shown === null && app.querySelector(".login")) return;
  shown?.view.close();
  shown = account = null;
  hideNotice();
  app.replaceChildren(loginScreen(server, hint, showScreenOf));
  app.querySelector("input")?.focus();
}

function showScreenOf(user: Account): void {
  account = user;
  followRoute();
}

function followRoute(): void {
  const screen = openScreen();
  if (!account || shown?.screen === screen) return;
  shown?.view.close();
  const Made = { live: Wall, events: EventsScreen, maps: MapsScreen }[screen];
  shown = { screen, view: new Made(server, account, () => showLogin("")) };
  app.replaceChildren(shown.view.root);
}

async function start(): Promise<void> {
  app.replaceChildren(element("div", { class: "progress", role: "progressbar", "aria-label": "Loading" }));
  addEventListener("popstate", followRoute);
  try {
    const user = await server.status();
    if (user) showScreenOf(user);
    else showLogin("");
  } catch (error) {
    showLogin(error instanceof ServerError ? error.message : String(error));
  }
}

void start();
