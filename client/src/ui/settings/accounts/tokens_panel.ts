// SPDX-License-Identifier: Apache-2.0
//
// The access tokens: what each may report, when it was last used, and until when it is valid.

import { AccessTokens, type AccessToken, type AccessTokenList } from "../../../wire/access_tokens";
import type { Named } from "../../../wire/camera_setup";
import type { Server } from "../../../wire/server";
import { button } from "../../widgets/button";
import { element } from "../../widgets/dom";
import { formPart } from "../../widgets/fields";
import { notify } from "../../widgets/notice";
import { plainTable, scrolled } from "../../widgets/table";
import { calendarDate, minuteText } from "../../widgets/text";
import { LoadedPart } from "../loaded_part";
import { askToAddToken, askToRemoveToken, kKindNames } from "./token_dialogs";

const kPurpose =
  "With a token an analytics box or a POS terminal reports alerts and transactions. It can see nothing and change nothing.";

export class TokensPanel {
  readonly root: HTMLElement;
  readonly #tokens: AccessTokens;
  readonly #part: LoadedPart;

  constructor(server: Server, closed: AbortSignal) {
    this.#tokens = new AccessTokens(server);
    this.#part = new LoadedPart("Access tokens", closed);
    this.root = this.#part.root;
    void this.#load();
  }

  #load(): Promise<void> {
    return this.#part.fill(async () => [this.#shown(await this.#tokens.list())]);
  }

  #shown({ token, camera }: AccessTokenList): HTMLElement {
    const add = button("Add a token…", () => void this.#after(askToAddToken(this.root, this.#tokens, camera)));
    const heads = ["Name", "Cameras", "Reports", "Last use", "Expires", ""];
    const rows = token.map((each) => this.#row(each, camera));
    const table = rows.length > 0 ? [scrolled("Access tokens", plainTable(heads, rows))] : [];
    const buttons = element("div", { class: "form-buttons" }, add);
    return formPart("Access tokens", element("p", { class: "form-hint" }, kPurpose), ...table, buttons);
  }

  #row(token: AccessToken, cameras: readonly Named[]): HTMLElement {
    const { name, camera, kind, lastUse } = token;
    const remove = button("Remove…", () => {
      const said = `The token ${name} is removed.`;
      void this.#after(askToRemoveToken(this.root, this.#tokens, token), said);
    });
    remove.setAttribute("aria-label", `Remove the token ${name}`);
    const names = camera.map((id) => cameras.find((one) => one.id === id)?.name ?? `camera ${id}`);
    const cells = [
      names.join(", ") || "none any more",
      kind.map((each) => kKindNames[each]).join(", "),
      lastUse ? minuteText(lastUse * 1000) : "never",
      expiryText(token, Date.now()),
      remove,
    ];
    return element("tr", {}, element("th", { scope: "row" }, name), ...cells.map((cell) => element("td", {}, cell)));
  }

  async #after(dialog: Promise<boolean>, said = ""): Promise<void> {
    if (!(await dialog)) return;
    if (said) notify(said);
    await this.#load();
  }
}

function expiryText({ expires }: AccessToken, nowMs: number): string {
  if (expires === null) return "never";
  return expires * 1000 <= nowMs ? "expired" : calendarDate(expires * 1000);
}
