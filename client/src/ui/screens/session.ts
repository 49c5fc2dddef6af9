// SPDX-License-Identifier: Apache-2.0
//
// The session of a logged-in user, which the app hands from screen to screen.

import type { EditedMap } from "../../wire/emaps";
import type { Preferences } from "../../wire/preferences";
import type { Account, Server } from "../../wire/server";
import type { Draft } from "../settings/draft";
import type { AbsentCameras } from "../wall/absent_cameras";

/** What the page remembers of an account from one screen or session to the next. */
export interface RememberedState {
  readonly userId: number;
  readonly absentCameras: AbsentCameras;
  /** Changes to a map that were not saved when the session ended. */
  mapDraft: EditedMap | null;
  /** The same of the settings' page with this address. */
  settingsDraft: { address: string; draft: Draft } | null;
  /** The first account was just made, and the steps that follow are not done. */
  isSettingUp: boolean;
}

/** What a screen is opened with. */
export interface Session {
  readonly server: Server;
  readonly account: Account;
  readonly remembered: RememberedState;
  /** What follows the account to every browser. */
  readonly preferences: Preferences;
  /** Called when the user has logged out. */
  readonly onLogOut: () => void;
}
