// SPDX-License-Identifier: Apache-2.0
//
// Shows what an account sees, as the server judges it.

import { type Accounts, kCameraRights, type UserRecord } from "../../../wire/accounts";
import { asServerError } from "../../../wire/server";
import { whileBusy } from "../../widgets/button";
import { element } from "../../widgets/dom";
import { openDialog } from "../../widgets/form_dialog";
import { notify } from "../../widgets/notice";
import { plainTable, scrolled } from "../../widgets/table";
import { kRightNames } from "./rights";

/**
 * `isChanged`: what is shown is stored, and the form holds something else. `pressed` is busy until there is something
 * to show.
 */
export async function showPreview(
  host: HTMLElement,
  accounts: Accounts,
  { id, name }: UserRecord,
  isChanged: boolean,
  pressed: HTMLButtonElement,
): Promise<void> {
  const asked = accounts.preview(id).catch((error: unknown) => void notify(asServerError(error).message));
  const cameras = await whileBusy(pressed, asked);
  if (!cameras) return;
  const rows = cameras.map((camera) => {
    const cells = kCameraRights.map((right) => element("td", {}, camera[right] ? "yes" : "–"));
    return element("tr", {}, element("th", { scope: "row" }, camera.name), ...cells);
  });
  const table = plainTable(["Camera", ...kCameraRights.map((right) => kRightNames[right])], rows);
  const seen = cameras.length > 0 ? scrolled("Cameras", table) : element("p", {}, "No camera at all.");
  const note = isChanged ? [element("p", { class: "form-hint" }, "As stored: your changes are not saved yet.")] : [];
  await openDialog(host, { title: `What ${name} sees`, content: [...note, seen], submit: "", attempt: async () => undefined });
}
