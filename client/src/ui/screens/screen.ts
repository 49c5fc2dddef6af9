// SPDX-License-Identifier: Apache-2.0
//
// What every screen of a logged-in user has: title and heading, the bar with navigation, clock and account, the
// progress line, its keys and the dialog that shows them, its part of the address, and a say in whether the user may
// leave.

import type { Preferences } from "../../wire/preferences";
import type { Server } from "../../wire/server";
import type { ScreenName } from "../route";
import { iconButton } from "../widgets/button";
import { element, setText } from "../widgets/dom";
import { icon } from "../widgets/icons";
import { isForFocused } from "../widgets/key_owner";
import { KeysDialog, type KeyList } from "../widgets/keys_dialog";
import { clockTime } from "../widgets/text";
import { titleScreen } from "../widgets/title";
import { AccountMenu } from "./account_menu";
import { navigation } from "./navigation";
import type { Session } from "./session";

const kClockMs = 500;
const kNames: Record<ScreenName, string> = { wall: "Live", events: "Events", maps: "Maps", settings: "Settings" };

export abstract class Screen {
  readonly name: ScreenName;
  readonly root: HTMLElement;
  protected readonly server: Server;
  protected readonly preferences: Preferences;
  /** Bar, progress line and content; a screen may hide it behind something that covers the window. */
  protected readonly front: HTMLElement;
  protected readonly progress = element("div", { class: "progress", role: "progressbar", "aria-label": "Loading" });
  readonly #heading = element("h1", { class: "unseen", tabindex: "-1" });
  readonly #clock = element("time", { class: "bar-clock" });
  readonly #keysDialog = new KeysDialog();
  readonly #closing = new AbortController();

  constructor(name: ScreenName, session: Session) {
    this.name = name;
    this.server = session.server;
    this.preferences = session.preferences;
    titleScreen(kNames[name]);
    setText(this.#heading, kNames[name]);
    const brand = element("div", { class: "brand" }, icon("lighthouse"), element("span", {}, "Lookhaven"), this.#heading);
    const keys = iconButton("keys", "Keys", () => this.#keysDialog.show(this.keys), "?");
    keys.classList.add("show-keys");
    const account = new AccountMenu(session, () => this.canLeave(), (isBusy) => (this.progress.hidden = !isBusy));
    const links = navigation(name, session.account.is_manager, this.server.alerts, this.closed);
    const bar = element("header", { class: "bar" }, brand, links, this.#clock, keys, account.button);
    this.front = element("div", { class: `front ${name}` }, bar, this.progress);
    this.root = element("main", { class: "screen" }, this.front, this.#keysDialog.root, account.root);
    // Before the control that has the focus, which gets what the screen leaves to it.
    document.addEventListener("keydown", (event) => this.#onKey(event), { signal: this.closed, capture: true });
    const showTime = () => setText(this.#clock, clockTime(Date.now()));
    this.every(kClockMs, showTime);
    showTime();
  }

  /**
   * Whether the user may leave what is shown; an override may ask. Called before a link of the navigation, Back,
   * Forward or log-out takes effect; not when the session has ended.
   */
  canLeave(): boolean {
    return true;
  }

  /** Shows what the address names on this screen. Returns false where the user stays at what was shown before. */
  abstract followRoute(): boolean;

  /** Tells a screen reader where the user is now. */
  focus(): void {
    this.#heading.focus({ preventScroll: true });
  }

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

  /** What `pressKey` does, and what the browser does, where nobody would guess. */
  protected abstract get keys(): KeyList;

  /**
   * Does what a key without Ctrl, Alt or Meta asks for; returns false for one that means nothing here. Not called for a
   * key that belongs to what has the focus.
   */
  protected abstract pressKey(event: KeyboardEvent): boolean;

  #onKey(event: KeyboardEvent): void {
    if (event.altKey || event.ctrlKey || event.metaKey || isCovered() || isForFocused(event)) return;
    if (event.key === "?") this.#keysDialog.show(this.keys);
    else if (!this.pressKey(event)) return;
    event.preventDefault();
    event.stopPropagation();
  }
}

/**
 * Keys, menus and forms keep the screen's keys out, wherever a click has left the focus; a screen's own dialog does
 * not.
 */
function isCovered(): boolean {
  return document.querySelector("dialog:is(.keys, .form-dialog, .account-menu, .wall-menu)[open]") !== null;
}
