// SPDX-License-Identifier: Apache-2.0
//
// VEXO.Playback: controls a running player of the caller's session through its progress file and signals.
#include <algorithm>
#include <chrono>
#include <functional>
#include <optional>
#include <thread>
#include <utility>

#include "standalone/api/own_apis.h"
#include "standalone/control/player_file.h"
#include "standalone/control/progress_file.h"

namespace lookhaven::api {

namespace {

constexpr int kFastestPlaybackRate = 16;
constexpr int kSlowestPlaybackRate = -8;
constexpr std::chrono::milliseconds kPoll{2};
constexpr std::chrono::milliseconds kSignalLimit{1'000};
constexpr std::chrono::milliseconds kOpenLimit{1'000};

// The player that the call is for. Throws Failure 400 without a stream key, 404 when there is no such player.
control::RequestRef FindPlayer(const Call& call) {
    const std::int64_t key = call.NumberOr("timestamp", 0);
    if (key < 1) {
        throw Failure(400, "timestamp must be the number that the player was started with");
    }
    const auto player_request = call.slots.FindPlayer(call.context.Session(), key);
    if (!player_request) {
        throw Failure(404, "this session has no such player");
    }
    return *player_request;
}

// As SlotTable::ChangePause. Throws Failure 404 when the player has ended.
void ChangePause(const control::RequestRef& player_request, const std::function<void(control::Pause&)>& change) {
    if (!control::SlotTable::ChangePause(player_request, change)) {
        throw Failure(404, "the player has ended");
    }
}

std::optional<control::ProgressFile> FindProgress(const Call& call, const control::Player& player) {
    return control::ProgressFile::Open(call.context.Installation().ProgressFolder(), player.key,
                                       call.context.Session());
}

control::ProgressFile ProgressOf(const Call& call, const control::Player& player) {
    auto file = FindProgress(call, player);
    if (!file) {
        throw Failure(409, "the player has been replaced");
    }
    return *std::move(file);
}

// A player first takes its signals and its progress file, then sets the rate that it was started with there.
bool IsOpen(const Call& call, const control::Player& player) {
    if (player.started_us == 0) {
        return false;
    }
    const auto progress = player.takes_rate ? FindProgress(call, player) : std::nullopt;
    return !player.takes_rate || (progress && progress->Get() != control::ProgressFile::kUnset);
}

// As FindPlayer, but waits while the player opens its recording: what is asked of it before that would be lost. Throws
// Failure 409 when that takes too long.
control::RequestRef AwaitPlayer(const Call& call) {
    const control::RequestRef player_request = FindPlayer(call);
    const auto until = std::chrono::steady_clock::now() + kOpenLimit;
    while (!IsOpen(call, player_request.slot->player)) {
        if (player_request.IsOver()) {
            throw Failure(404, "the player has ended");
        }
        if (std::chrono::steady_clock::now() > until) {
            throw Failure(409, "the player is still opening the recording");
        }
        std::this_thread::sleep_for(kPoll);
    }
    return player_request;
}

control::SharedLock LockPlayers(const Call& call) {
    control::SharedLock lock = call.slots.LockPlayers();
    if (!lock) {
        throw Failure(503, "the player was not reached in time", http::kRetrySoonSeconds);
    }
    return lock;
}

std::string SetRate(const Call& call) {
    const Json::Value& asked = call.Parameter("rate");
    const int rate = asked.isInt() ? asked.asInt() : 0;
    if (rate < kSlowestPlaybackRate || rate > kFastestPlaybackRate || (rate > -2 && rate < 1)) {
        throw Failure(400, "rate must be from -8 to -2 or from 1 to 16");
    }
    const control::RequestRef player_request = AwaitPlayer(call);
    const control::Player& player = player_request.slot->player;
    if (!player.takes_rate) {
        throw Failure(409, "the rate of this player cannot be changed");
    }
    const control::SharedLock lock = LockPlayers(call);
    bool waits = false;
    ChangePause(player_request, [&waits, rate](control::Pause& pause) {
        waits = pause.on && rate > 1;
        pause.resumed_rate = waits ? rate : 0;
    });
    if (!ProgressOf(call, player).Set(waits ? 1 : rate)) {
        throw Failure(409, "the player has been replaced");
    }
    Json::Value data;
    data["rate"] = rate;
    return SuccessAnswer(data);
}

std::string GetPosition(const Call& call) {
    const control::Player& player = AwaitPlayer(call).slot->player;
    if (!player.tells_position) {
        throw Failure(409, "this player does not report its position");
    }
    const int position_ms = ProgressOf(call, player).Get();
    Json::Value data;
    data["position_ms"] = position_ms == control::ProgressFile::kUnset ? Json::Value() : Json::Value(position_ms);
    return SuccessAnswer(data);
}

// Waits until the host has told the player of its pause.
void AwaitPause(const Call& call, const control::RequestRef& player_request, bool on) {
    call.slots.Wake();
    const auto until = std::chrono::steady_clock::now() + kSignalLimit;
    while (player_request.slot->player.paused != on) {
        if (player_request.IsOver() || std::chrono::steady_clock::now() > until) {
            throw Failure(503, "the player was not reached in time", http::kRetrySoonSeconds);
        }
        std::this_thread::sleep_for(kPoll);
    }
}

// Changes the request, and the rate with it: a player that stands still has rate 1 at most.
void RequestPause(const Call& call, const control::RequestRef& player_request, bool on) {
    const control::SharedLock lock = LockPlayers(call);
    std::optional<control::ProgressFile> progress;
    if (player_request.slot->player.takes_rate) {
        progress = ProgressOf(call, player_request.slot->player);
    }
    const int rate = progress ? progress->Get() : 1;
    int next = 0;  // 0: as it is
    ChangePause(player_request, [&next, on, rate](control::Pause& pause) {
        pause.on = on;
        if (on) {
            next = rate > 1 ? 1 : 0;
            pause.resumed_rate = rate > 1 ? rate : pause.resumed_rate;
        } else {
            next = std::exchange(pause.resumed_rate, 0);
        }
    });
    if (progress && next != 0) {
        progress->Set(next);
    }
}

std::string Pause(const Call& call) {
    const Json::Value& asked = call.Parameter("on");
    if (!asked.isBool()) {
        throw Failure(400, "on must be true or false");
    }
    const bool on = asked.asBool();
    const control::RequestRef player_request = AwaitPlayer(call);
    if (!player_request.slot->player.can_pause) {
        throw Failure(409, "this player cannot be paused");
    }
    RequestPause(call, player_request, on);
    AwaitPause(call, player_request, on);
    Json::Value data;
    data["on"] = on;
    return SuccessAnswer(data);
}

// Has a player that a newer one has replaced look at its file now.
std::string CheckOwner(const Call& call) {
    const control::Slot* slot = FindPlayer(call).slot;
    const std::string& session = call.context.Session();
    const std::vector<control::Slot*> excess = call.slots.ExcessPlayers(session, control::ReadPlayerFile(session));
    call.slots.Wake();
    Json::Value data;
    data["owner"] = std::find(excess.begin(), excess.end(), slot) == excess.end();
    return SuccessAnswer(data);
}

std::string Stop(const Call& call) {
    call.slots.End(FindPlayer(call));
    return SuccessAnswer(Json::nullValue);
}

using enum Method::Accepts;

constexpr Method kMethods[] = {{"SetRate", SetRate, kPostOnly},
                               {"GetPosition", GetPosition},
                               {"Pause", Pause, kPostOnly},
                               {"CheckOwner", CheckOwner, kPostOnly},
                               {"Stop", Stop, kPostOnly}};

}  // namespace

const OwnApi kPlaybackApi{"VEXO.Playback", kMethods};

}  // namespace lookhaven::api
