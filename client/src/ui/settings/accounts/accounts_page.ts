// SPDX-License-Identifier: Apache-2.0
//
// All accounts: what each may do, whether it is in use, and when it last was. Below them the access tokens.

import { Accounts, type UserList, type UserRecord } from "../../../wire/accounts";
import { settingsAddress } from "../../route";
import { counted } from "../../widgets/amounts";
import { linkButton } from "../../widgets/button";
import { element } from "../../widgets/dom";
import { minuteText } from "../../widgets/text";
import { emptyState, LoadedPage, type PageContext } from "../page";
import { kPrivilegeNames, rightsSummary } from "./rights";
import { TokensPanel } from "./tokens_panel";

export class AccountsPage extends LoadedPage<UserList> {
  constructor(context: PageContext) {
    super(context, "Accounts", linkButton("Add an account", settingsAddress("accounts", "new"), true));
    void this.start(
      () => new Accounts(context.server).list(),
      (list) => this.#showList(list),
    );
  }

  #showList(list: UserList): void {
    const rows = list.user.map((user) => this.#row(user, list));
    const sentence =
      "Yours is the only account. Give everyone an account of their own, with only the rights they need.";
    const alone = emptyState("people", sentence);
    const tokens = new TokensPanel(this.context.server, this.closed).root;
    this.show(element("ul", { class: "settings-list" }, ...rows), ...(list.user.length === 1 ? [alone] : []), tokens);
  }

  #row(user: UserRecord, list: UserList): HTMLElement {
    const { id, name, privilege, sessions, lastUse, deny, mayMark } = user;
    const isOwn = id === this.context.account.user_id;
    const used = lastUse ? `last used ${minuteText(lastUse * 1000)}` : "";
    const marks = mayMark && privilege === "viewer" ? ", reports alerts" : "";
    const part = (look: string, ...texts: string[]) =>
      element("div", { class: look }, ...texts.map((text) => element("span", {}, text)));
    const link = element("a", { class: "row-link", href: settingsAddress("accounts", id) }, name);
    return element(
      "li",
      { class: "card record-row" },
      element("div", { class: "record-row-name" }, link, element("span", { class: "quiet" }, isOwn ? "you" : "")),
      part("record-row-facts", kPrivilegeNames[privilege], `sees ${rightsSummary(deny, list)}${marks}`),
      part("record-row-facts quiet", sessions > 0 ? `${counted(sessions, "session")} open` : "not logged in", used),
    );
  }
}
