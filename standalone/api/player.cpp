// SPDX-License-Identifier: Apache-2.0
//
// Why so        The progress file holds one number, so a player that reads its rate there cannot report its position
//               there. A player with an interval is not paced and has no rate. Only PlayMjpegEventNoFrameId can pause,
//               and only at rate 1 or slower; a faster one is first set to rate 1.
#include "standalone/api/player.h"

#include <algorithm>

#include "standalone/store/settings.h"

namespace lookhaven::api {

namespace {

constexpr const char* kPlayerApi = "VEXO.Lookhaven.Player";
constexpr const char* kByFrames = "PlayMjpegEvent";
constexpr const char* kByTimes = "PlayMjpegEventNoFrameId";
constexpr int kDefaultPlayers = 9;  // three by three cameras of one moment
constexpr int kMaxSideBySide = 16;

int IntOr(const Call& call, const char* name, int fallback) {
    const Json::Value& value = call.Parameter(name);
    return value.isNull() ? fallback : value.asInt();
}

}  // namespace

bool IsPlayer(const Call& call) {
    return call.api == kPlayerApi && (call.method == kByFrames || call.method == kByTimes);
}

int PlayersPerSession(store::Store& records) {
    return std::clamp(store::Settings(records).NumberOr("players_per_session", kDefaultPlayers), 1, kMaxSideBySide);
}

void PreparePlayer(const Call& call) {
    const bool by_times = call.method == kByTimes;
    const bool is_paced = IntOr(call, "interval", -1) < 0;
    const bool shares_rate = !by_times || IntOr(call, "changerate", 0) != 0;
    control::Player& player = call.slot.player;
    player.takes_rate = shares_rate && is_paced;
    player.tells_position = !shares_rate;
    player.can_pause = by_times && is_paced && (shares_rate || IntOr(call, "playrate", 1) <= 1);
    player.max_players = PlayersPerSession(call.Records());
    player.key = call.NumberOr("timestamp", 0);  // last: from here on others may look at it
}

}  // namespace lookhaven::api
