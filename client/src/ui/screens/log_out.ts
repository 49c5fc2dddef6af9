// SPDX-License-Identifier: Apache-2.0
//
// The button that ends the session, in the bar of each screen.

import { ServerError } from "../../wire/server";
import { iconButton } from "../widgets/button";
import { notify } from "../widgets/notice";
import type { Session } from "./screen";

/** Does nothing where `canLeave` returns false. `showBusy` is called when a log-out begins (true) and when it failed (false). */
export function logOutButton(
  { server, account, onLogOut }: Session,
  canLeave: () => boolean,
  showBusy: (isBusy: boolean) => void,
): HTMLButtonElement {
  const button = iconButton("logout", `Log out ${account.account}`, () => {
    if (!canLeave()) return;
    showBusy(true);
    server.logout().then(onLogOut, (error: unknown) => {
      showBusy(false);
      if (error instanceof ServerError && error.status === 401) return;
      notify(`You are still logged in: ${error instanceof ServerError ? error.message : String(error)}`);
    });
  });
  button.classList.add("log-out");
  return button;
}
