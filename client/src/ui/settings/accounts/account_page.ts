// SPDX-License-Identifier: Apache-2.0
//
// One account: its privilege, password, rights and sessions.
//
// Why so        A page left open must give nobody an account: a new account, password or privilege, and a removal,
//               take the manager's own password.

import { Accounts, type UserList, type UserRecord } from "../../../wire/accounts";
import { asServerError, type ServerError } from "../../../wire/server";
import { button } from "../../widgets/button";
import { element } from "../../widgets/dom";
import { formPart } from "../../widgets/fields";
import { openReauthDialog } from "../../widgets/form_dialog";
import { notify } from "../../widgets/notice";
import { yesNo } from "../../widgets/text";
import type { Descriptions } from "../conflict_panel";
import { changedFrom } from "../merge";
import type { PageContext } from "../page";
import { RecordPage, type RecordKind } from "../record_page";
import { AccountFields, type AccountSettings as Settings } from "./account_fields";
import { showPreview } from "./preview_dialog";
import { kNothingDenied, kPrivilegeNames, rightsText, userSettingsOf } from "./rights";
import { SessionsPanel } from "./sessions_panel";

const kKind: RecordKind<Settings, UserRecord> = {
  noun: "account",
  aNoun: "an account",
  section: "accounts",
  icon: "people",
  initial: { name: "", privilege: "viewer", mayMark: false, deny: kNothingDenied },
  settingsOf: (stored) => ({ name: stored.name, ...userSettingsOf(stored) }),
};

export class AccountPage extends RecordPage<UserList, Settings, UserRecord, AccountFields> {
  readonly #accounts: Accounts;

  constructor(context: PageContext, id: number | "new") {
    super(context, id, kKind);
    this.#accounts = new Accounts(context.server);
    this.load(
      () => this.#accounts.list(),
      ({ user }) => user,
    );
  }

  protected newFields(user: UserRecord | null, list: UserList): AccountFields {
    return new AccountFields(user, list, this.context.account.user_id);
  }

  protected descriptions(list: UserList): Descriptions<Settings> {
    return {
      name: ["Name", String],
      privilege: ["May", (value) => kPrivilegeNames[value]],
      mayMark: ["Reports alerts", yesNo],
      deny: ["Sees", (value) => rightsText(value, list)],
    };
  }

  protected override above(): Node[] {
    const show = (pressed: HTMLButtonElement) =>
      void showPreview(this.root, this.#accounts, this.record!, this.isChanged, pressed);
    return [button("See as this account", show, "plain")];
  }

  protected below({ id }: UserRecord): Node[] {
    const sessions = formPart("Sessions", new SessionsPanel(this.#accounts, id).root);
    if (id === this.context.account.user_id) return [sessions];
    return [sessions, formPart("Remove", button("Remove this account…", () => void this.#remove(), "plain"))];
  }

  protected save(settings: Settings, base: UserRecord | null, { password }: AccountFields): Promise<UserRecord | null> {
    const changes = base ? changedFrom(kKind.settingsOf(base), settings) : settings;
    return this.#store(settings, base, { ...changes, ...(password ? { password } : {}) });
  }

  /** Null where the user does not confirm with their password. */
  async #store(
    settings: Settings,
    base: UserRecord | null,
    changes: Partial<Settings> & { password?: string },
  ): Promise<UserRecord | null> {
    const { name: _, ...rest } = changes;
    const isHarmless = !("password" in rest) && !("privilege" in rest);
    if (base && isHarmless) return this.#accounts.set(base.id, base.revision, rest);
    const reason = base ? "A new password or privilege needs your own password." : "A new account needs your own password.";
    let answer: UserRecord | ServerError | null = null;
    await openReauthDialog(this.root, {
      title: base ? `Change ${base.name}` : `Add ${settings.name}`,
      content: [element("p", {}, reason)],
      submit: base ? "Change" : "Add",
      attempt: async (reauth) => {
        try {
          const added = { ...settings, password: changes.password ?? "" };
          if (base) answer = await this.#accounts.set(base.id, base.revision, { ...rest, reauth });
          else answer = await this.#accounts.add(added, reauth);
        } catch (error) {
          const failure = asServerError(error);
          // Only a wrong password, or no answer, can be mended in the dialog.
          if (failure.status === 403 || failure.status === 429 || failure.status === 0) throw failure;
          answer = failure;
        }
      },
    });
    if ((answer as unknown) instanceof Error) throw answer as unknown as ServerError;
    return answer;
  }

  async #remove(): Promise<void> {
    const user = this.record!;
    const isDone = await openReauthDialog(this.root, {
      title: `Remove ${user.name}?`,
      content: [element("p", {}, "Its sessions end, and nobody can log in with it any more. Recordings are not touched.")],
      submit: "Remove",
      attempt: async (reauth) => void (await this.#accounts.remove(user, reauth)),
    });
    if (!isDone) return;
    notify(`${user.name} is removed.`);
    this.context.done();
  }
}
