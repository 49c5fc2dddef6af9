// SPDX-License-Identifier: Apache-2.0
//
// The button that ends the session, in the bar of each screen.

import { ServerError } from "../../wire/server";
import { iconButton } from "../widgets/button";
import { notify } from "../widgets/notice";
import type { Session } from "./screen";

/** Nothing happens where `canLeave` says no. `showBusy` is told when a log-out begins and when it failed. */
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
