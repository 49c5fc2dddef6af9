// SPDX-License-Identifier: Apache-2.0
//
// What users do with their own account: change its password, see and end its sessions, log out. Opened from the bar of
// each screen.

import { Accounts } from "../../wire/accounts";
import { ServerError } from "../../wire/server";
import { SessionsPanel } from "../settings/accounts/sessions_panel";
import { iconButton } from "../widgets/button";
import { passwordProblem } from "../widgets/credentials";
import { element } from "../widgets/dom";
import { secretField } from "../widgets/fields";
import { openDialog } from "../widgets/form_dialog";
import { icon, type IconName } from "../widgets/icons";
import { notify } from "../widgets/notice";
import { zoneText } from "../widgets/text";
import { AlertNotifications } from "./alert_notifications";
import type { Session } from "./session";

export class AccountMenu {
  readonly button: HTMLButtonElement;
  readonly root: HTMLDialogElement;
  readonly #session: Session;
  readonly #canLeave: () => boolean;
  readonly #showBusy: (isBusy: boolean) => void;

  /**
   * Logs nobody out where `canLeave` returns false. `showBusy` is called when a log-out begins (true) and when it
   * failed (false).
   */
  constructor(session: Session, canLeave: () => boolean, showBusy: (isBusy: boolean) => void) {
    this.#session = session;
    this.#canLeave = canLeave;
    this.#showBusy = showBusy;
    const name = session.account.account;
    this.button = iconButton("account", `Account ${name}`, () => this.root.showModal());
    this.button.classList.add("account");
    this.button.setAttribute("aria-haspopup", "dialog");
    this.root = element(
      "dialog",
      { class: "card account-menu", "aria-label": `Account ${name}` },
      element("p", { class: "account-name" }, name),
      element("p", { class: "account-name account-zone" }, `Times are those of ${zoneText(new Date())}`),
      this.#item("edit", "Change password", "change-password", () => void this.#changePassword()),
      this.#item("hosts", "Your sessions", "own-sessions", () => void this.#showSessions()),
      ...(AlertNotifications.arePossible ? [this.#notifications()] : []),
      this.#item("logout", "Log out", "log-out", () => this.#logOut()),
    );
    this.root.addEventListener("click", (event) => event.target === this.root && this.root.close());
  }

  #item(name: IconName, label: string, look: string, onClick: () => void): HTMLButtonElement {
    const item = element("button", { type: "button", class: `account-item ${look}` }, icon(name), element("span", {}, label));
    item.addEventListener("click", () => {
      this.root.close();
      onClick();
    });
    return item;
  }

  #notifications(): HTMLElement {
    const notifications = new AlertNotifications(this.#session.account.user_id);
    const box = element("input", { type: "checkbox", checked: notifications.areOn });
    box.addEventListener("change", async () => {
      if (!box.checked) return notifications.turnOff();
      box.checked = await notifications.turnOn();
      if (!box.checked) notify("Your browser blocks notifications from this site. Allow them in its settings for this site.");
    });
    return element("label", { class: "account-item" }, box, "Notify me of alerts");
  }

  #logOut(): void {
    if (!this.#canLeave()) return;
    const { server, preferences, onLogOut } = this.#session;
    this.#showBusy(true);
    const logOut = preferences.flush().then(() => server.logout());
    logOut.then(onLogOut, (error: unknown) => {
      this.#showBusy(false);
      if (error instanceof ServerError && error.status === 401) return;
      notify(`You are still logged in: ${error instanceof ServerError ? error.message : String(error)}`);
    });
  }

  #showSessions(): Promise<boolean> {
    const host = this.root.parentElement!;
    const hint = "Where you are logged in now. If you do not know one of them, end it and change your password.";
    const sessions = new SessionsPanel(new Accounts(this.#session.server), undefined, host).root;
    const content = [element("p", { class: "form-hint" }, hint), sessions];
    return openDialog(host, { title: "Your sessions", content, submit: "", attempt: async () => undefined });
  }

  async #changePassword(): Promise<void> {
    const password = secretField("Current password");
    const wanted = secretField("New password", "At least eight characters.");
    const again = secretField("Repeat new password");
    const isDone = await openDialog(this.root.parentElement!, {
      title: "Change your password",
      content: [password.root, wanted.root, again.root],
      submit: "Change",
      attempt: async () => {
        const problem = password.value ? passwordProblem(wanted.value, again.value) : "Please enter your current password.";
        if (problem) return problem;
        await new Accounts(this.#session.server).changePassword(password.value, wanted.value);
        return undefined;
      },
    });
    if (isDone) notify("Your password is changed.");
  }
}
