// SPDX-License-Identifier: Apache-2.0
//
// One account: its privilege, password, rights and sessions.
//
// Why so        Who leaves a page open gives nobody an account: a new account, password or privilege, and a removal, take
//               the manager's own password.

import { People, type UserList, type UserRecord, type UserSettings } from "../../../wire/people";
import { asServerError, type ServerError } from "../../../wire/server";
import { passwordProblem } from "../../screens/account_menu";
import { settingsAddress } from "../../screens/route";
import { element } from "../../widgets/dom";
import { checkField, formPart, formRow, radioField, secretField, textField, type TextField } from "../../widgets/fields";
import { openReauthDialog } from "../../widgets/form_dialog";
import { notify } from "../../widgets/notice";
import { changedFrom } from "../merge";
import { button, emptyState, LoadedPage, type PageContext } from "../page";
import { RecordForm, type Draft } from "../record_form";
import { showPreview } from "./preview_dialog";
import { kNothingDenied, kPrivilegeNames, rightsText, userSettingsOf } from "./rights";
import { RightsMatrix } from "./rights_matrix";
import { SessionsPanel } from "./sessions_panel";

/** Whoever changed it here would end the own session. */
const kOwnHint = "Change your own password in the account menu in the bar.";

type Settings = UserSettings & { name: string };

const kFirstSettings: Settings = { name: "", privilege: "viewer", mayMark: false, deny: kNothingDenied };

export class AccountPage extends LoadedPage<UserList> {
  readonly #people: People;
  #form: RecordForm<Settings, UserRecord> | null = null;
  #user: UserRecord | null = null;

  constructor(context: PageContext, id: number | "new") {
    super(context, id === "new" ? "Add an account" : "Account");
    this.linkBack("All accounts", settingsAddress("accounts"));
    this.#people = new People(context.server);
    void this.start(
      () => this.#people.list(),
      (list) => {
        this.#user = list.user.find((one) => one.id === id) ?? null;
        if (id === "new" || this.#user) this.#showForm(list);
        else this.show(emptyState("people", "There is no such account any more.", button("All accounts", context.done)));
      },
    );
  }

  override get isChanged(): boolean {
    return this.#form?.isChanged ?? false;
  }

  override get draft(): Draft | null {
    return this.#form ? this.#form.draft : super.draft;
  }

  #showForm(list: UserList): void {
    const user = this.#user;
    const name = textField("Name", { maxlength: "64", autocapitalize: "none" }, "Letters, digits and . _ - @");
    const stays = "Leave empty to keep it. A new password ends all sessions of this account.";
    const password = secretField(user ? "New password" : "Password", user ? stays : "At least eight characters.");
    const again = secretField("Repeat password");
    const mayMakeOwners = list.user.some((one) => one.id === this.context.account.user_id && one.privilege === "owner");
    const privilege = radioField<UserSettings["privilege"]>("May", [
      ["viewer", "Watch"],
      ["manager", "Watch and set up (manager)"],
      ...(mayMakeOwners || user?.privilege === "owner" ? [["owner", "Everything (owner)"] as const] : []),
    ]);
    const mayMark = checkField("Report alerts and POS transactions", "For devices and cash registers.");
    const rights = new RightsMatrix(list);
    name.root.hidden = user !== null;
    const isOwn = user?.id === this.context.account.user_id;
    const passwords = isOwn ? element("p", { class: "form-hint" }, kOwnHint) : formRow(password, again);
    const account = formPart("Account", name.root, passwords, privilege.root, mayMark.root);
    const adapt = () => (mayMark.root.hidden = privilege.value !== "viewer");
    account.addEventListener("input", adapt);
    const settingsOf = (stored: UserRecord) => ({ name: stored.name, ...userSettingsOf(stored) });
    this.#form = new RecordForm<Settings, UserRecord>(
      {
        content: [account, formPart("Rights", rights.root)],
        stored: user,
        initial: kFirstSettings,
        settingsOf,
        read: () => ({ name: name.value.trim(), privilege: privilege.value, mayMark: mayMark.value, deny: rights.value }),
        show: (settings) => {
          name.value = settings.name;
          privilege.value = settings.privilege;
          mayMark.value = settings.mayMark;
          rights.value = settings.deny;
          adapt();
        },
        hasSecrets: () => password.value !== "" || again.value !== "",
        problem: (settings) => this.#problem(settings, password, again),
        save: async (settings, base) => {
          const changes = base ? changedFrom(settingsOf(base), settings) : settings;
          return this.#save(settings, base, { ...changes, ...(password.value ? { password: password.value } : {}) });
        },
        describe: {
          name: ["Name", String],
          privilege: ["May", (value) => kPrivilegeNames[value]],
          mayMark: ["Reports alerts", (value) => (value ? "yes" : "no")],
          deny: ["Sees", (value) => rightsText(value, list)],
        },
        onSaved: (stored) => {
          password.value = again.value = "";
          this.#user = stored;
          notify(user ? "The account is saved." : `${stored.name} is added.`);
          if (!user) this.context.done();
        },
        noun: "account",
        submit: user ? "Save" : "Add the account",
        leave: this.context.leave,
      },
      this.context.draft,
    );
    this.show(this.#form.root);
    if (!user) return name.input.focus();
    this.title = user.name;
    const showIt = (pressed: HTMLButtonElement) =>
      void showPreview(this.root, this.#people, this.#user!, this.isChanged, pressed);
    const preview = button("See as this account", showIt, "plain");
    const sessions = formPart("Sessions", new SessionsPanel(this.#people, user.id).root);
    const remove = button("Remove this account…", () => void this.#remove(), "plain");
    this.show(preview, this.#form.root, sessions, ...(isOwn ? [] : [formPart("Remove", remove)]));
  }

  #problem({ name }: Settings, password: TextField, again: TextField): string {
    const isName = /^[A-Za-z0-9][A-Za-z0-9._@-]{0,63}$/.test(name);
    if (!isName) return "The name begins with a letter or digit, and has letters, digits and . _ - @ only.";
    if (!password.value && !again.value) return this.#user ? "" : "Please choose a password.";
    return passwordProblem(password.value, again.value);
  }

  /** Null where the user does not confirm with their password. */
  async #save(
    settings: Settings,
    base: UserRecord | null,
    changes: Partial<Settings> & { password?: string },
  ): Promise<UserRecord | null> {
    const { name: _, ...rest } = changes;
    const isHarmless = !("password" in rest) && !("privilege" in rest);
    if (base && isHarmless) return this.#people.set(base.id, base.revision, rest);
    const reason = base ? "A new password or privilege needs your own password." : "A new account needs your own password.";
    let answer: UserRecord | ServerError | null = null;
    await openReauthDialog(this.root, {
      title: base ? `Change ${base.name}` : `Add ${settings.name}`,
      content: [element("p", {}, reason)],
      submit: base ? "Change" : "Add",
      attempt: async (reauth) => {
        try {
          const added = { ...settings, password: changes.password ?? "" };
          if (base) answer = await this.#people.set(base.id, base.revision, { ...rest, reauth });
          else answer = await this.#people.add(added, reauth);
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
    const user = this.#user!;
    const isDone = await openReauthDialog(this.root, {
      title: `Remove ${user.name}?`,
      content: [element("p", {}, "Its sessions end, and nobody can log in with it any more. Recordings are not touched.")],
      submit: "Remove",
      attempt: async (reauth) => void (await this.#people.remove(user, reauth)),
    });
    if (!isDone) return;
    notify(`${user.name} is removed.`);
    this.context.done();
  }
}
