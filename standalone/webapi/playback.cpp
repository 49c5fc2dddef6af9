// SPDX-License-Identifier: Apache-2.0
//
// Why so        A player that takes its rate from the progress file does not tell its position, and the other way round; one
//               that samples waits for no clock, so it has no rate. Only the player by times looks at the pause, and stands
//               still then at rate 1 and slower alone: a faster one is slowed down first.
#include "standalone/webapi/playback.h"

#include <algorithm>
#include <chrono>
#include <map>
#include <thread>

#include "standalone/base/progress_file.h"
#include "standalone/binding/request.h"
#include "standalone/store/settings.h"
#include "standalone/webapi/answer.h"
#include "standalone/webapi/player_file.h"

namespace lookhaven::webapi {

namespace {

constexpr const char* kPlayerApi = "VEXO.Lookhaven.Player";
constexpr const char* kByFrames = "PlayMjpegEvent";
constexpr const char* kByTimes = "PlayMjpegEventNoFrameId";
constexpr int kMaxSideBySide = 16;
constexpr int kMaxRate = 16;
constexpr int kMinRate = -8;
constexpr std::chrono::milliseconds kSignalPoll{2};
constexpr std::chrono::milliseconds kSignalLimit{1'000};

struct Call {
    const binding::RequestContext& context;
    SlotTable& slots;
    Slot& slot;
    const Parameters& parameters;
};

int IntOr(const Parameters& parameters, const char* name, int otherwise) {
    const Json::Value value = Find(parameters, name);
    return value.isNull() ? otherwise : value.asInt();
}

base::ProgressFile Progress(const Call& call) {
    auto file =
        base::ProgressFile::Open(call.context.Home().ProgressFolder(), call.slot.player.key, call.context.Session());
    if (!file) {
        throw Failure(409, "the player cannot be reached under this timestamp");
    }
    return *std::move(file);
}

Json::Value SetRate(const Call& call) {
    const Json::Value asked = Find(call.parameters, "rate");
    const int rate = asked.isInt() ? asked.asInt() : 0;
    if (rate < kMinRate || rate > kMaxRate || (rate > -2 && rate < 1)) {
        throw Failure(400, "rate must be from -8 to -2 or from 1 to 16");
    }
    Player& player = call.slot.player;
    if (!player.takes_rate) {
        throw Failure(409, "this player does not take its rate from here");
    }
    const bool waits = player.pause_wanted && rate > 1;
    player.resumed_rate = waits ? rate : 0;
    if (!Progress(call).Set(waits ? 1 : rate)) {
        throw Failure(409, "the player has been replaced");
    }
    Json::Value data;
    data["rate"] = rate;
    return data;
}

Json::Value GetPosition(const Call& call) {
    if (!call.slot.player.tells_position) {
        throw Failure(409, "this player does not tell its position here");
    }
    const int position_ms = Progress(call).Get();
    Json::Value data;
    data["position_ms"] = position_ms == base::ProgressFile::kUnset ? Json::Value() : Json::Value(position_ms);
    return data;
}

void AwaitSignal(const Call& call, bool on) {
    call.slots.Wake();
    const std::uint64_t serial = call.slot.serial;
    const auto until = std::chrono::steady_clock::now() + kSignalLimit;
    while (call.slot.player.paused != on) {
        if (call.slot.serial != serial || std::chrono::steady_clock::now() > until) {
            throw Failure(503, "the player was not reached in time");
        }
        std::this_thread::sleep_for(kSignalPoll);
    }
}

Json::Value Pause(const Call& call) {
    const Json::Value on = Find(call.parameters, "on");
    if (!on.isBool()) {
        throw Failure(400, "on must be true or false");
    }
    Player& player = call.slot.player;
    if (!player.can_pause) {
        throw Failure(409, "this player cannot be paused");
    }
    if (on.asBool() && player.takes_rate) {
        base::ProgressFile progress = Progress(call);
        if (const int rate = progress.Get(); rate > 1) {
            player.resumed_rate = rate;
            progress.Set(1);
        }
    }
    player.pause_wanted = on.asBool();
    AwaitSignal(call, on.asBool());
    if (const int rate = on.asBool() ? 0 : player.resumed_rate.exchange(0); rate != 0) {
        Progress(call).Set(rate);
    }
    Json::Value data;
    data["on"] = on.asBool();
    return data;
}

// Has a player that was pushed out look at its file now.
Json::Value CheckOwner(const Call& call) {
    const std::string& session = call.context.Session();
    const std::vector<Slot*> surplus = call.slots.SurplusPlayers(session, ReadPlayerFile(session));
    call.slots.Wake();
    Json::Value data;
    data["owner"] = std::find(surplus.begin(), surplus.end(), &call.slot) == surplus.end();
    return data;
}

Json::Value Stop(const Call& call) {
    call.slots.End(call.slot);
    return Json::nullValue;
}

}  // namespace

bool IsPlayer(const std::string& api, const std::string& method) {
    return api == kPlayerApi && (method == kByFrames || method == kByTimes);
}

int PlayersPerSession(store::Store& records) {
    const std::string text = store::Settings(records).Find("players_per_session").value_or("1");
    const Json::Value number = binding::JsonFromText("", text);
    return number.isInt() ? std::clamp(number.asInt(), 1, kMaxSideBySide) : 1;
}

void PreparePlayer(Player& player, store::Store& records, const std::string& method, const Parameters& parameters) {
    const bool by_times = method == kByTimes;
    const bool is_paced = IntOr(parameters, "interval", -1) < 0;
    const bool shares_rate = !by_times || IntOr(parameters, "changerate", 0) != 0;
    player.takes_rate = shares_rate && is_paced;
    player.tells_position = !shares_rate;
    player.can_pause = by_times && is_paced && (shares_rate || IntOr(parameters, "playrate", 1) <= 1);
    player.side_by_side = PlayersPerSession(records);
}

std::string ServePlayback(const binding::RequestContext& context, SlotTable& slots, const ScgiRequest& request,
                          int version, const std::string& method, const Parameters& parameters) {
    struct Method {
        Json::Value (*serve)(const Call&);
        bool changes;
    };
    static const std::map<std::string, Method> kMethods = {{"SetRate", {SetRate, true}},
                                                           {"GetPosition", {GetPosition, false}},
                                                           {"Pause", {Pause, true}},
                                                           {"CheckOwner", {CheckOwner, true}},
                                                           {"Stop", {Stop, true}}};
    const auto found = kMethods.find(method);
    if (version != 1 || found == kMethods.end()) {
        throw Failure(404, "no such api, version or method");
    }
    if (found->second.changes) {
        RequirePost(request);
    }
    const Json::Value key = Find(parameters, "timestamp");
    if (key.isNull() || key.asInt64() < 1) {
        throw Failure(400, "timestamp must be the number that the player was started with");
    }
    Slot* slot = slots.FindPlayer(context.Session(), key.asInt64());
    if (slot == nullptr) {
        throw Failure(404, "this session has no such player");
    }
    return SuccessAnswer(found->second.serve({context, slots, *slot, parameters}));
}

}  // namespace lookhaven::webapi
