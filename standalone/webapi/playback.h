// SPDX-License-Identifier: Apache-2.0
//
// The host's own API VEXO.Playback: the other end of a running player's progress file and signals. Runs in a request
// process of the player's session.
#pragma once

#include <string>

#include "standalone/binding/request_context.h"
#include "standalone/webapi/parameters.h"
#include "standalone/webapi/scgi.h"
#include "standalone/webapi/slot_table.h"

namespace lookhaven::webapi {

constexpr const char* kPlaybackApi = "VEXO.Playback";

// True for the methods that start a player.
bool IsPlayer(const std::string& api, const std::string& method);

// How many players a session may have side by side: the setting players_per_session, 1 … 16, or 1. Throws
// store::StoreError.
int PlayersPerSession(store::Store& records);

// Notes in the slot what the player that these parameters start can do. Throws store::StoreError; Json::Exception for
// parameters of the wrong type.
void PreparePlayer(Player& player, store::Store& records, const std::string& method, const Parameters& parameters);

// The whole answer. Throws Failure for what the caller did wrong or the player cannot do: 400, 404, 405, 409, 503.
std::string ServePlayback(const binding::RequestContext& context, SlotTable& slots, const ScgiRequest& request,
                          int version, const std::string& method, const Parameters& parameters);

}  // namespace lookhaven::webapi
