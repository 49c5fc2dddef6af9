// SPDX-License-Identifier: Apache-2.0
//
// Which of the module's methods start a player of recordings, and what that player can do.
#pragma once

#include "standalone/api/call.h"

namespace lookhaven::api {

// True for those methods.
bool IsPlayer(const Call& call);

// How many players a session may have side by side: the setting players_per_session, 1 … 16, or 9. Throws
// store::StoreError.
int PlayersPerSession(store::Store& records);

// Notes in the call's slot what the player that it starts can do. Throws store::StoreError; Json::Exception for
// parameters of the wrong type.
void PreparePlayer(const Call& call);

}  // namespace lookhaven::api
