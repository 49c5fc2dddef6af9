// SPDX-License-Identifier: Apache-2.0
//
// Goes from the log-in to the screens, from screen to screen as the address says, and back to the log-in.

import { Server, type Account } from "../wire/server";
import { EventsScreen } from "./screens/events_screen";
import { keepTrying } from "./screens/keep_trying";
import { loginScreen } from "./screens/login_screen";
import { MapsScreen } from "./screens/maps_screen";
import { followRoute, openScreen } from "./screens/route";
import type { Kept, Screen } from "./screens/screen";
import { SettingsScreen } from "./screens/settings_screen";
import { WallScreen } from "./screens/wall_screen";
import { AbsentCameras } from "./wall/absent_cameras";
import { element } from "./widgets/dom";
import { hideNotice } from "./widgets/notice";
import { titleScreen } from "./widgets/title";

const keptFor = (userId: number): Kept => ({ userId, absentCameras: new AbsentCameras(), mapDraft: null, settingsDraft: null });
const kScreens = { wall: WallScreen, events: EventsScreen, maps: MapsScreen, settings: SettingsScreen };

export class App {
  readonly #root: HTMLElement;
  readonly #server = new Server(() => this.#showLogin("Your session has ended. Please log in again."));
  #account: Account | null = null;
  /** Of the account that was the last to log in. */
  #kept = keptFor(0);
  /** Null at the log-in. */
  #screen: Screen | null = null;

  constructor(root: HTMLElement) {
    this.#root = root;
  }

  async start(): Promise<void> {
    this.#root.replaceChildren(element("div", { class: "progress", role: "progressbar", "aria-label": "Loading" }));
    followRoute(() => this.#followRoute());
    const forever = new AbortController().signal;
    const account = await keepTrying(() => this.#server.status(), (sentence) => this.#showWaiting(sentence), forever);
    if (account) this.#showScreens(account);
    else this.#showLogin("");
  }

  /** Nobody can log in, nor need to, while the server does not say whether there is a session. */
  #showWaiting(sentence: string): void {
    const wait = element("div", { class: "waiting" }, element("div", { class: "spinner" }), element("p", { role: "alert" }, sentence));
    this.#root.replaceChildren(element("main", { class: "login" }, wait));
  }

  /** `hint` says why the user is here again, if there is a reason. */
  #showLogin(hint: string): void {
    // A screen closes many requests, each of which may report once more that the session has ended.
    if (this.#screen === null && this.#root.querySelector(".login")) return;
    this.#screen?.close();
    this.#screen = this.#account = null;
    hideNotice();
    titleScreen("Log in");
    this.#root.replaceChildren(loginScreen(this.#server, hint, (account) => this.#showScreens(account)));
    this.#root.querySelector("input")?.focus();
  }

  #showScreens(account: Account): void {
    this.#account = account;
    if (this.#kept.userId !== account.user_id) this.#kept = keptFor(account.user_id);
    this.#followRoute();
  }

  /** False where the user stays at what is shown. */
  #followRoute(): boolean {
    const name = openScreen();
    if (!this.#account) return true;
    if (this.#screen?.name === name) return this.#screen.followRoute();
    if (this.#screen && !this.#screen.canLeave()) return false;
    this.#screen?.close();
    const session = {
      server: this.#server,
      account: this.#account,
      kept: this.#kept,
      onLogOut: () => this.#showLogin(""),
    };
    this.#screen = new kScreens[name](session);
    this.#root.replaceChildren(this.#screen.root);
    this.#screen.focus();
    return true;
  }
}
