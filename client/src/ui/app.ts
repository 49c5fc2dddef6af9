// SPDX-License-Identifier: Apache-2.0
//
// Goes from the log-in, or the first account, to the screens, from screen to screen as the address says, and back to
// the log-in.

import { watchAlerts } from "../live/alert_watch";
import { streamLimit } from "../live/stream_budget";
import type { EventKind } from "../playback/coverage";
import { keepTrying } from "../wire/keep_trying";
import { LastLookStore } from "../wire/last_look";
import { Preferences } from "../wire/preferences";
import { protocol } from "../wire/protocol";
import { Server, type Account } from "../wire/server";
import { isKindChosen } from "./events/event_filter";
import { followRoute, leaveSetup, openScreen, settingsAddress, setupToken } from "./route";
import { AlertNotifications } from "./screens/alert_notifications";
import { EventsScreen } from "./screens/events_screen";
import { loginScreen } from "./screens/login_screen";
import { MapsScreen } from "./screens/maps_screen";
import type { Screen } from "./screens/screen";
import type { RememberedState } from "./screens/session";
import { SettingsScreen } from "./screens/settings_screen";
import { noAccountScreen, setupScreen } from "./screens/setup_screen";
import { WallScreen } from "./screens/wall_screen";
import { AbsentCameras } from "./wall/absent_cameras";
import { element } from "./widgets/dom";
import { hideNotice } from "./widgets/notice";
import { titleScreen } from "./widgets/title";

const rememberedFor = (userId: number, isSettingUp = false): RememberedState => {
  return { userId, absentCameras: new AbsentCameras(), mapDraft: null, settingsDraft: null, isSettingUp };
};
const kScreens = { wall: WallScreen, events: EventsScreen, maps: MapsScreen, settings: SettingsScreen };

const kNamesMs = 30_000;

/** Names by id. A burst of alerts asks for the list of cameras once. */
function cameraNames(server: Server): (id: number) => Promise<string> {
  let list: ReturnType<Server["cameras"]> | null = null;
  let askedMs = 0;
  return async (id) => {
    if (!list || performance.now() - askedMs > kNamesMs) [list, askedMs] = [server.cameras(), performance.now()];
    return (await list).camera?.find((one) => one.id === id)?.name ?? "";
  };
}

export class App {
  readonly #root: HTMLElement;
  readonly #server = new Server(() => this.#showLogin("Your session has ended. Please log in again."));
  #account: Account | null = null;
  /** Null where there is no account. */
  #preferences: Preferences | null = null;
  /** The account that was the last to log in. */
  #remembered = rememberedFor(0);
  /** Null at the log-in. */
  #screen: Screen | null = null;
  #watching: AbortController | null = null;
  /** Whether the server has no account yet. */
  #isWithoutAccounts = false;

  constructor(root: HTMLElement) {
    this.#root = root;
  }

  async start(): Promise<void> {
    this.#root.replaceChildren(element("div", { class: "progress", role: "progressbar", "aria-label": "Loading" }));
    followRoute(() => this.#followRoute());
    await this.#enter();
  }

  async #enter(): Promise<void> {
    const forever = new AbortController().signal;
    const status = await keepTrying(() => this.#server.status(), (sentence) => this.#showWaiting(sentence), forever);
    this.#isWithoutAccounts = status === "no-account";
    if (typeof status === "object") await this.#showScreens(status);
    else if (this.#isWithoutAccounts) this.#showSetup();
    else this.#showLogin(setupToken() === null ? "" : "There is an account already. Please log in.");
  }

  /** Nobody can log in, nor need to, while the server does not say whether there is a session. */
  #showWaiting(sentence: string): void {
    const wait = element("div", { class: "waiting" }, element("div", { class: "spinner" }), element("p", { role: "alert" }, sentence));
    this.#root.replaceChildren(element("main", { class: "login" }, wait));
  }

  /** `hint` says why the user is here again, if there is a reason. */
  #showLogin(hint: string): void {
    // A screen closes many requests, each of which may report once more that the session has ended.
    if (this.#screen === null && this.#root.querySelector(".login-form")) return;
    this.#screen?.close();
    this.#preferences?.close();
    this.#screen = this.#account = this.#preferences = null;
    this.#watching?.abort();
    hideNotice();
    if (setupToken() !== null) leaveSetup(location.pathname + location.search);
    titleScreen("Log in");
    this.#root.replaceChildren(loginScreen(this.#server, hint, (account) => this.#showScreens(account)));
    this.#root.querySelector("input")?.focus();
  }

  /** What was typed stays where a newer address is opened. */
  #showSetup(): void {
    if (this.#root.querySelector(setupToken() === null ? ".setup-form" : "form.setup-form")) return;
    titleScreen("Set up");
    const made = (account: Account) => {
      this.#remembered = rememberedFor(account.user_id, true);
      leaveSetup(settingsAddress("cameras", "new"));
      return this.#showScreens(account);
    };
    const hasAccount = (sentence: string) => {
      this.#isWithoutAccounts = false;
      this.#showLogin(sentence);
    };
    const screen = setupToken()
      ? setupScreen(this.#server, setupToken, { made, hasAccount })
      : noAccountScreen(() => this.#enter());
    this.#root.replaceChildren(screen);
    this.#root.querySelector("input")?.focus();
  }

  async #showScreens(account: Account): Promise<void> {
    this.#isWithoutAccounts = false;
    const preferences = await Preferences.load(this.#server, account.user_id);
    this.#account = account;
    this.#preferences?.close();
    this.#preferences = preferences;
    if (this.#remembered.userId !== account.user_id) this.#remembered = rememberedFor(account.user_id);
    this.#watching?.abort();
    this.#watching = new AbortController();
    const { signal } = this.#watching;
    this.#server.alerts.begin(new LastLookStore(account.user_id), signal);
    const admits = (kind: EventKind) => isKindChosen(preferences, kind);
    void watchAlerts(this.#server, streamLimit(protocol()) < Infinity, admits, signal);
    new AlertNotifications(account.user_id).follow(this.#server.alerts, cameraNames(this.#server), signal);
    this.#followRoute();
  }

  /** False where the user stays at what is shown. */
  #followRoute(): boolean {
    const name = openScreen();
    if (this.#isWithoutAccounts) this.#showSetup();
    if (!this.#account || !this.#preferences) return true;
    if (this.#screen?.name === name) return this.#screen.followRoute();
    if (this.#screen && !this.#screen.canLeave()) return false;
    this.#screen?.close();
    const session = {
      server: this.#server,
      account: this.#account,
      remembered: this.#remembered,
      preferences: this.#preferences,
      onLogOut: () => this.#showLogin(""),
    };
    this.#screen = new kScreens[name](session);
    this.#root.replaceChildren(this.#screen.root);
    this.#screen.focus();
    return true;
  }
}
