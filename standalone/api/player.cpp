// SPDX-License-Identifier: Apache-2.0
//
// Why so        A player that takes its rate from the progress file does not tell its position, and the other way round; one
//               that samples waits for no clock, so it has no rate. Only the player by times looks at the pause, and stands
//               still then at rate 1 and slower alone: a faster one is slowed down first.
#include "standalone/api/player.h"

#include <algorithm>

#include "standalone/store/settings.h"

namespace lookhaven::api {

namespace {

constexpr const char* kPlayerApi = "VEXO.Lookhaven.Player";
constexpr const char* kByFrames = "PlayMjpegEvent";
constexpr const char* kByTimes = "PlayMjpegEventNoFrameId";
constexpr int kMaxSideBySide = 16;

int IntOr(const Call& call, const char* name, int otherwise) {
    const Json::Value& value = call.Parameter(name);
    return value.isNull() ? otherwise : value.asInt();
}

}  // namespace

bool IsPlayer(const Call& call) {
    return call.api == kPlayerApi && (call.method == kByFrames || call.method == kByTimes);
}

int PlayersPerSession(store::Store& records) {
    const std::string text = store::Settings(records).Find("players_per_session").value_or("1");
    const Json::Value number = binding::JsonFromText("", text);
    return number.isInt() ? std::clamp(number.asInt(), 1, kMaxSideBySide) : 1;
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
}

}  // namespace lookhaven::api
