// SPDX-License-Identifier: Apache-2.0
//
// The button that ends the session, in the bar of each screen.

import { ServerError, type Account, type Server } from "../../wire/server";
import { iconButton } from "../widgets/button";
import { notify } from "../widgets/notice";

/** `busy` is told when a log-out begins and when it failed. */
export function logoutButton(
  server: Server,
  { account }: Account,
  onLogout: () => void,
  busy: (isBusy: boolean) => void,
): HTMLButtonElement {
  return iconButton("logout", `Log out ${account}`, () => {
    busy(true);
    server.logout().then(onLogout, (error: unknown) => {
      busy(false);
      if (error instanceof ServerError && error.status === 401) return;
      notify(`You are still logged in: ${error instanceof ServerError ? error.message : String(error)}`);
    });
  });
}
