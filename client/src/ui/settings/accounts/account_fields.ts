// SPDX-License-Identifier: Apache-2.0
//
// The settings of an account as fields: its name, password, privilege and rights.

import type { UserList, UserRecord, UserSettings } from "../../../wire/accounts";
import { accountNameProblem, passwordProblem } from "../../widgets/credentials";
import { element } from "../../widgets/dom";
import { checkField, formPart, formRow, radioField, secretField, textField, type Field, type TextField } from "../../widgets/fields";
import type { RecordFields } from "../record_page";
import { RightsMatrix } from "./rights_matrix";

export type AccountSettings = UserSettings & { name: string };

/** Changing it here would end one's own session. */
const kOwnHint = "Change your own password in the account menu in the bar.";
const kStays = "Leave empty to keep it. A new password ends all sessions of this account.";

export class AccountFields implements RecordFields<AccountSettings> {
  readonly content: HTMLElement[];
  readonly #isNew: boolean;
  readonly #name = textField("Name", { maxlength: "64", autocapitalize: "none" }, "Letters, digits and . _ - @");
  readonly #password: TextField;
  readonly #again = secretField("Repeat password");
  readonly #privilege: Field<UserSettings["privilege"]>;
  readonly #mayMark = checkField("Report alerts and POS transactions", "For devices and POS terminals.");
  readonly #rights: RightsMatrix;

  /** `ownId` is the account that is at the page. */
  constructor(user: UserRecord | null, list: UserList, ownId: number) {
    this.#isNew = user === null;
    this.#password = secretField(user ? "New password" : "Password", user ? kStays : "At least eight characters.");
    const mayMakeOwners = list.user.some((one) => one.id === ownId && one.privilege === "owner");
    this.#privilege = privilegeField(mayMakeOwners || user?.privilege === "owner");
    this.#rights = new RightsMatrix(list);
    this.#name.root.hidden = user !== null;
    const isOwn = user?.id === ownId;
    const passwords = isOwn ? element("p", { class: "form-hint" }, kOwnHint) : formRow(this.#password, this.#again);
    const account = formPart("Account", this.#name.root, passwords, this.#privilege.root, this.#mayMark.root);
    account.addEventListener("input", () => this.#adapt());
    this.content = [account, formPart("Rights", this.#rights.root)];
  }

  get value(): AccountSettings {
    const name = this.#name.value.trim();
    return { name, privilege: this.#privilege.value, mayMark: this.#mayMark.value, deny: this.#rights.value };
  }

  set value(settings: AccountSettings) {
    this.#name.value = settings.name;
    this.#privilege.value = settings.privilege;
    this.#mayMark.value = settings.mayMark;
    this.#rights.value = settings.deny;
    this.#adapt();
  }

  /** Empty: the stored one stays. */
  get password(): string {
    return this.#password.value;
  }

  get hasSecrets(): boolean {
    return this.#password.value !== "" || this.#again.value !== "";
  }

  problem({ name }: AccountSettings): string {
    const ofName = accountNameProblem(name);
    if (ofName) return ofName;
    if (!this.hasSecrets) return this.#isNew ? "Please choose a password." : "";
    return passwordProblem(this.#password.value, this.#again.value);
  }

  focus(): void {
    this.#name.input.focus();
  }

  clearSecrets(): void {
    this.#password.value = this.#again.value = "";
  }

  /** Managers and owners report as they are. */
  #adapt(): void {
    this.#mayMark.root.hidden = this.#privilege.value !== "viewer";
  }
}

function privilegeField(hasOwner: boolean): Field<UserSettings["privilege"]> {
  return radioField<UserSettings["privilege"]>("May", [
    ["viewer", "Watch"],
    ["manager", "Watch and set up (manager)"],
    ...(hasOwner ? [["owner", "Everything (owner)"] as const] : []),
  ]);
}
