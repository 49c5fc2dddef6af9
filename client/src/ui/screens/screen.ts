// SPDX-License-Identifier: Apache-2.0
//
// What every screen of a logged-in user has: the bar with navigation, clock and log-out, the progress line, its keys, its
// part of the address, and a say in whether the user may leave.

import type { Account, Server } from "../../wire/server";
import { element, setText } from "../widgets/dom";
import { icon } from "../widgets/icons";
import { clockTime } from "../widgets/text";
import { logOutButton } from "./log_out";
import { navigation } from "./navigation";
import type { ScreenName } from "./route";

const kClockMs = 500;

/** What a screen is opened with. */
export interface Session {
  readonly server: Server;
  readonly account: Account;
  /** Called when the user has logged out. */
  readonly onLogOut: () => void;
}

export abstract class Screen {
  readonly name: ScreenName;
  readonly root: HTMLElement;
  protected readonly server: Server;
  /** Bar, progress line and content; a screen may hide it behind something that covers the window. */
  protected readonly front: HTMLElement;
  protected readonly progress = element("div", { class: "progress", role: "progressbar", "aria-label": "Loading" });
  readonly #clock = element("time", { class: "bar-clock" });
  readonly #closing = new AbortController();

  constructor(name: ScreenName, session: Session) {
    this.name = name;
    this.server = session.server;
    const brand = element("div", { class: "brand" }, icon("lighthouse"), element("h1", {}, "Lookhaven"));
    const logOut = logOutButton(session, () => this.canLeave(), (isBusy) => (this.progress.hidden = !isBusy));
    const bar = element("header", { class: "bar" }, brand, navigation(name), this.#clock, logOut);
    this.front = element("div", { class: `front ${name}` }, bar, this.progress);
    this.root = element("main", { class: "screen" }, this.front);
    document.addEventListener("keydown", (event) => this.#onKey(event), { signal: this.closed });
    const showTime = () => setText(this.#clock, clockTime(Date.now()));
    this.every(kClockMs, showTime);
    showTime();
  }

  /**
   * Whether the user may leave what is shown; an override may ask. Called before a link of the navigation, Back, Forward or
   * log-out takes effect; not when the session has ended.
   */
  canLeave(): boolean {
    return true;
  }

  /** Shows what the address names on this screen. Returns false where the user stays at what was shown before. */
  abstract followRoute(): boolean;

  /** Ends all that the screen has running. */
  close(): void {
    this.#closing.abort();
  }

  /** Aborted when the screen is closed. */
  protected get closed(): AbortSignal {
    return this.#closing.signal;
  }

  /** Adds to the bar, between navigation and clock. */
  protected addToBar(...nodes: Node[]): void {
    this.#clock.before(...nodes);
  }

  /** Calls `work` at this interval until the screen is closed. */
  protected every(intervalMs: number, work: () => void): void {
    const timer = setInterval(work, intervalMs);
    this.closed.addEventListener("abort", () => clearInterval(timer));
  }

  /** Does what a key without Ctrl, Alt or Meta asks for; returns false for one that means nothing here. */
  protected abstract pressKey(event: KeyboardEvent): boolean;

  #onKey(event: KeyboardEvent): void {
    if (event.altKey || event.ctrlKey || event.metaKey || event.defaultPrevented) return;
    if (this.pressKey(event)) event.preventDefault();
  }
}
