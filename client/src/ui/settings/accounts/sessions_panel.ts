// SPDX-License-Identifier: Apache-2.0
//
// The open sessions of an account: where each is used, and when it was last; one or all of them are ended.

import type { Accounts, OpenSession } from "../../../wire/accounts";
import { asServerError } from "../../../wire/server";
import { counted } from "../../widgets/amounts";
import { button } from "../../widgets/button";
import { element } from "../../widgets/dom";
import { openDialog } from "../../widgets/form_dialog";
import { notify } from "../../widgets/notice";
import { plainTable, scrolled } from "../../widgets/table";
import { minuteText } from "../../widgets/text";

export class SessionsPanel {
  readonly root = element("div", { class: "form-group", tabindex: "-1", role: "group", "aria-label": "Sessions" });
  readonly #accounts: Accounts;
  readonly #user: number | undefined;
  readonly #host: HTMLElement;

  /**
   * `user`: undefined for the caller's own account. `host` is what the dialog that asks goes away with; where a form is
   * around the panel, one outside of it.
   */
  constructor(accounts: Accounts, user: number | undefined, host?: HTMLElement) {
    this.#accounts = accounts;
    this.#user = user;
    this.#host = host ?? this.root;
    void this.load();
  }

  async load(): Promise<void> {
    this.root.replaceChildren(element("p", { class: "quiet" }, "Loading…"));
    try {
      this.#show(await this.#accounts.sessions(this.#user));
    } catch (error) {
      const again = button("Try again", () => void this.load());
      this.root.replaceChildren(element("p", { role: "alert" }, asServerError(error).message), again);
    }
  }

  #show(sessions: readonly OpenSession[]): void {
    const none = element("p", { class: "quiet" }, "Nobody is logged in with this account.");
    if (sessions.length === 0) return this.root.replaceChildren(none);
    const rows = sessions.map(({ key, address: from, started, lastUse, current }) => {
      const address = from || "unknown";
      const end = button("End", () => void this.#end(`The session from ${address} is ended.`, key));
      end.setAttribute("aria-label", `End the session from ${address}`);
      const last = current ? element("span", {}, "this session") : end;
      const cells = [minuteText(started * 1000), minuteText(lastUse * 1000)].map((text) => element("td", {}, text));
      return element("tr", {}, element("th", { scope: "row" }, address), ...cells, element("td", {}, last));
    });
    const table = scrolled("Sessions", plainTable(["From", "Since", "Last use", ""], rows));
    const others = sessions.filter(({ current }) => !current).length;
    const all = button(sessions.length === others ? "End all" : "End all others", () => void this.#endAll(others));
    all.disabled = others === 0;
    this.root.replaceChildren(table, element("div", { class: "form-buttons" }, all));
  }

  async #end(said: string, key: string): Promise<void> {
    try {
      await this.#accounts.endSessions(this.#user, key);
      notify(said);
    } catch (error) {
      notify(asServerError(error).message);
    }
    await this.#reload();
  }

  async #endAll(count: number): Promise<void> {
    const isDone = await openDialog(this.#host, {
      title: `End ${counted(count, "session")}?`,
      content: [element("p", {}, "Their users must log in again.")],
      submit: "End them",
      attempt: async () => {
        notify(`${counted(await this.#accounts.endSessions(this.#user), "session")} ended.`);
      },
    });
    if (isDone) await this.#reload();
  }

  /** The button that was pressed goes with what was shown, and must not take the focus with it. */
  async #reload(): Promise<void> {
    await this.load();
    this.root.focus();
  }
}
