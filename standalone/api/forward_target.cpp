// SPDX-License-Identifier: Apache-2.0
#include "standalone/api/forward_target.h"

#include <algorithm>
#include <chrono>
#include <optional>
#include <set>
#include <string>
#include <utility>
#include <vector>

#include "platform/admission/pairauth.h"
#include "platform/camera/camera.h"
#include "standalone/api/footage.h"
#include "standalone/api/footage_place.h"
#include "standalone/api/forward.h"
#include "standalone/api/own_apis.h"
#include "standalone/api/player.h"
#include "standalone/binding/live_ring.h"
#include "standalone/binding/rights.h"
#include "standalone/maintenance/host_status.h"
#include "standalone/store/hosts.h"

namespace lookhaven::api {

namespace {

// How long hosts are asked for a player, one after another; the last may take three seconds more.
constexpr std::chrono::seconds kMaxSearch{9};
// For the recorder to have it; after that the request is forwarded.
constexpr std::chrono::seconds kMaxWaitForStream{3};
constexpr const char* kLiveApi = "VEXO.Lookhaven.Player.LiveviewSrc";

// 0 for what is no number; the handler says what is wrong with it.
int IdOf(const Call& call, const char* name) {
    const Json::Value& value = call.Parameter(name);
    return value.isInt() ? value.asInt() : 0;
}

bool IsLive(const Call& call) {
    const bool shows_camera = IdOf(call, "itemType") == 0 || IdOf(call, "snapshot") == 1;
    return (call.api == kLiveApi && shows_camera) || (call.api == kPictureApi.name && call.method == "Get");
}

// By a session, or as a paired host. Anyone else is refused by this host's handler.
bool IsAdmitted(const Call& call) {
    const auto timestamp = call.cookies.find("timestamp");
    return call.login || (timestamp != call.cookies.end() && call.Parameter("cookie").isString() &&
                          IsAuthPairMatch(call.Parameter("cookie").asString(), timestamp->second));
}

// Notes that the camera is watched here. From its second viewer on, waits for this host's recorder to fetch the stream,
// unless the other host is known to be offline; whether the module finds it here.
bool AwaitRingHere(const Call& call, int camera_id, int host) {
    if (call.api != kLiveApi || IdOf(call, "snapshot") == 1 || call.is_forwarded) {
        return false;
    }
    call.slot.other_hosts_camera = camera_id;
    if (!call.slots.IsWatchedByOthers(call.slot, camera_id) ||
        maintenance::OfflineHosts(call.context.Installation()).contains(host)) {
        return false;
    }
    Camera camera;
    if (camera.Load(camera_id, 0, 0) != 0) {
        return false;
    }
    const auto asked = static_cast<CAM_PROFILE_TYPE>(call.NumberOr("profileType", CAM_PROFILE_DEFAULT));
    const int stream = camera.GetUiStreamNo(asked == CAM_PROFILE_DEFAULT ? camera.GetLiveProfile() : asked);
    call.context.CloseRecords();
    return binding::AwaitLiveRing({camera_id, stream}, kMaxWaitForStream);
}

ForwardTarget TargetOfLive(const Call& call, int own_host) {
    const int camera = IdOf(call, "camera");
    const int host = camera > 0 ? HostOfCamera(call.Records(), camera) : 0;
    const bool is_for_caller =
        host != 0 && host != own_host && IsAdmitted(call) && binding::MayUse(camera, store::CameraAccess::kLive);
    const bool is_elsewhere = is_for_caller && !AwaitRingHere(call, camera, host);
    return {is_elsewhere ? host : 0, Forwarded::kLive, "camera " + std::to_string(camera)};
}

// The event that a player of the module plays, by the names that its methods have for it.
std::optional<Footage> FootageOfPlayer(const Call& call) {
    const bool by_frames = call.method == "PlayMjpegEvent";
    const int kind = !by_frames                                            ? 0
                     : IdOf(call, "recEvtType") != 0                       ? IdOf(call, "recEvtType")
                     : call.Parameter("blAnalyEvent") == Json::Value(true) ? static_cast<int>(store::MarkKind::kAlert)
                                                                           : 0;
    return FindFootage(call.Records(), kind == 0 ? std::nullopt : std::optional(static_cast<store::MarkKind>(kind)),
                       IdOf(call, "eventid"));
}

std::optional<Footage> FootageOf(const Call& call) {
    if (IsPlayer(call)) {
        return FootageOfPlayer(call);
    }
    const bool by_time = call.method == "At" || call.method == "Stream";
    return by_time ? FindRequestedFootage(call)
                   : FindFootage(call.Records(), KindOf(call), call.Parameter("event").asInt());
}

ForwardTarget TargetOf(const Call& call, int own_host) {
    const bool is_event = call.api == kEventApi.name;
    if (IsLive(call)) {
        return TargetOfLive(call, own_host);
    }
    if (is_event && (call.method == "Export" || call.method == "PlanExport")) {
        return TargetOfExport(call, own_host);
    }
    const bool needs_footage =
        IsPlayer(call) || (call.api == kPictureApi.name && call.method == "At") ||
        (is_event && (call.method == "Frame" || call.method == "Download" || call.method == "Stream"));
    return needs_footage ? TargetOfFootage(call, FootageOf(call), own_host) : ForwardTarget();
}

// The hosts that may have a player that does not run here: the one whose stream of it this host forwards, else all
// others. Those without a recorder come last: where the machine is off, asking it is slow.
std::vector<store::Host> HostsToAsk(const Call& call, int own_host, int known_host) {
    const std::set<int> offline = maintenance::OfflineHosts(call.context.Installation());
    std::vector<store::Host> hosts = store::Hosts(call.Records()).All();
    std::erase_if(
        hosts, [&](const store::Host& host) { return known_host != 0 ? host.id != known_host : host.id == own_host; });
    std::stable_partition(hosts.begin(), hosts.end(),
                          [&](const store::Host& host) { return !offline.contains(host.id); });
    return hosts;
}

// Steers the player at the host where it runs; false where no other host has it.
bool ForwardControl(const Call& call, int own_host) {
    const Json::Value& key = call.Parameter("timestamp");
    if (!key.isInt64() || key.asInt64() < 1 || call.is_forwarded ||
        call.slots.FindPlayer(call.context.Session(), key.asInt64())) {
        return false;
    }
    const int known = call.slots.FindForwardedPlayer(call.context.Session(), key.asInt64());
    const Forwarded kind = known != 0 ? Forwarded::kControl : Forwarded::kSearch;
    const auto until = std::chrono::steady_clock::now() + kMaxSearch;
    for (const store::Host& host : HostsToAsk(call, own_host, known)) {
        if (std::chrono::steady_clock::now() > until) {
            break;  // machines that are off, each of which takes seconds to ask
        }
        try {
            if (Forward(call, host, kind, "the player")) {
                return true;
            }
        } catch (const Failure&) {
            if (known != 0) {
                throw;
            }
        }
    }
    return false;
}

}  // namespace

int HostOfCamera(store::Store& records, int camera_id) {
    const int recording = store::Hosts(records).HostOfCamera(camera_id);
    const auto camera = recording == 0 ? store::Cameras(records).Find(camera_id) : std::nullopt;
    return camera ? camera->host_id : recording;
}

bool ForwardIfNeeded(const Call& call) {
    const bool steers_player = call.api == kPlaybackApi.name;
    if (!steers_player && !IsLive(call) && !IsPlayer(call) && call.api != kPictureApi.name &&
        call.api != kEventApi.name) {
        return false;
    }
    const int own_host = call.context.Installation().HostId();
    if (own_host == 0) {
        return false;
    }
    if (steers_player) {
        return ForwardControl(call, own_host);
    }
    const ForwardTarget target = TargetOf(call, own_host);
    if (target.host_id == 0 || target.host_id == own_host) {
        return false;
    }
    const auto host = store::Hosts(call.Records()).Find(target.host_id);
    if (!host) {
        throw Failure(503, target.what + " is on a host that was removed from this installation");
    }
    if (call.is_forwarded) {
        throw Failure(503, target.what + " has moved to host " + host->name + "; try again", http::kRetrySoonSeconds);
    }
    if (IsPlayer(call) || (call.api == kEventApi.name && call.method == "Stream")) {
        control::SlotTable::NoteForwardedPlayer(call.slot, call.NumberOr("timestamp", 0), host->id);
    }
    Forward(call, *host, target.kind, target.what);
    return true;
}

}  // namespace lookhaven::api
