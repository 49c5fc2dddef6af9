// SPDX-License-Identifier: Apache-2.0
//
// Starts the web client: shows the login or the wall, and goes from one to the other.
//
//   wire/   what comes over the network: the web API (server), the parts of an endless answer (multipart),
//           requests that end in time (deadline)
//   live/   how a picture is kept live: sources of pictures behind one interface (source: stream_source streams,
//           snapshot_source polls), reconnecting (feed, backoff), the verdict on what is shown (signal_state), and the
//           sharing of few connections (stream_budget, turns). Of a compressed stream, media_part tells the pieces apart;
//           video_player decodes the picture (annexb, frame_gate), sound the sound (speaker_worklet with its
//           jitter_buffer), and av_clock keeps them in step. An obstacle is why that cannot be done here.
//   ui/     what is on the screen: login; wall with grid and tiles; large_view; snapshot_dialog. A picture is one
//           camera's canvas with its messages. The address says which camera is large (route).
//
// ui knows live and wire, live knows wire. Nothing here writes markup from text (see dom), and the page needs neither
// inline styles nor scripts, so that a content security policy of 'self' holds.

import "./style/base.css";
import "./style/login.css";
import "./style/wall.css";
import "./style/large.css";
import "./style/snapshot.css";
import { element } from "./ui/dom";
import { loginScreen } from "./ui/login";
import { hideNotice } from "./ui/notice";
import { Wall } from "./ui/wall";
import { Server, ServerError, type Account } from "./wire/server";

const app = document.querySelector<HTMLElement>("#app")!;
let wall: Wall | null = null;

const server = new Server(() => showLogin("Your session has ended. Please log in again."));

function showLogin(hint: string): void {
  // A wall closes many requests, each of which may bring the news once more.
  if (wall === null && app.querySelector(".login")) return;
  wall?.close();
  wall = null;
  hideNotice();
  app.replaceChildren(loginScreen(server, hint, showWallOf));
  app.querySelector("input")?.focus();
}

function showWallOf(account: Account): void {
  wall = new Wall(server, account, () => showLogin(""));
  app.replaceChildren(wall.root);
}

async function start(): Promise<void> {
  app.replaceChildren(element("div", { class: "progress", role: "progressbar", "aria-label": "Loading" }));
  try {
    const account = await server.status();
    if (account) showWallOf(account);
    else showLogin("");
  } catch (error) {
    showLogin(error instanceof ServerError ? error.message : String(error));
  }
}

void start();
