// SPDX-License-Identifier: Apache-2.0
#include "standalone/api/camera_fields.h"

#include <algorithm>
#include <set>
#include <utility>
#include <vector>

#include "standalone/api/fields.h"
#include "standalone/base/codec_words.h"
#include "standalone/base/text.h"
#include "standalone/media/source_kinds.h"
#include "standalone/store/value_names.h"

namespace lookhaven::api {

namespace {

using store::CameraProfile;
using store::RecordingPlan;

// A profile keeps what the list does not say of it.
void TakeSources(const Json::Value& list, store::Camera& camera) {
    if (list.isNull()) {
        return;
    }
    if (!list.isArray()) {
        RefuseField("source", "a list");
    }
    std::vector<CameraProfile> profiles;
    for (const Json::Value& source : list) {
        if (!source.isObject()) {
            RefuseField("source", "a list of objects");
        }
        int number = 0;
        Take(source["profile"], "source.profile", number);
        const CameraProfile* known = camera.FindProfile(number);
        CameraProfile profile = known == nullptr ? CameraProfile{number, "", 0, 0, 0} : *known;
        Take(source["address"], "source.address", profile.source);
        Take(source["width"], "source.width", profile.width);
        Take(source["height"], "source.height", profile.height);
        Take(source["fps"], "source.fps", profile.fps);
        profiles.push_back(profile);
    }
    std::ranges::sort(profiles, {}, &CameraProfile::number);
    camera.profiles = std::move(profiles);
}

void TakePlan(const Json::Value& json, std::optional<RecordingPlan>& stored) {
    if (json.isNull()) {
        return;
    }
    if (!json.isObject()) {
        RefuseField("plan", "an object");
    }
    RecordingPlan plan = stored.value_or(RecordingPlan());
    TakeNamed(json["mode"], "plan.mode", store::RecordModeNames(), plan.mode);
    Take(json["hours"], "plan.hours", plan.hours);
    Take(json["segment"], "plan.segment", plan.segment_s);
    Take(json["pre"], "plan.pre", plan.pre_s);
    Take(json["post"], "plan.post", plan.post_s);
    Take(json["mount"], "plan.mount", plan.mount_id);
    Take(json["profile"], "plan.profile", plan.profile);
    stored = plan;
}

void TakeGroups(const Json::Value& list, std::set<int>& groups) {
    if (list.isNull()) {
        return;
    }
    if (!list.isArray()) {
        RefuseField("group", "a list");
    }
    groups.clear();
    for (const Json::Value& id : list) {
        int group = 0;
        Take(id, "group", group);
        groups.insert(group);
    }
}

// Whom an address sends a password to: scheme, host and port. Empty for what is not in the network.
std::string ServerOf(const std::string& address) {
    const std::size_t scheme_end = address.find("://");
    if (scheme_end == address.npos) {
        return "";
    }
    const std::size_t begin = scheme_end + 3;
    const std::string place = address.substr(begin, address.find_first_of("/?#", begin) - begin);
    const std::size_t colon = place.find(':', place.starts_with('[') ? std::min(place.find(']'), place.size()) : 0);
    std::string port = colon == place.npos ? "" : place.substr(colon + 1);
    const media::NetworkKind* kind = media::FindNetworkKind(address);
    if (port.empty() && kind != nullptr) {
        port = kind->default_port;
    }
    return base::LowerAscii(address.substr(0, begin) + place.substr(0, colon) + ':' + port);
}

std::set<std::string> ServersOf(const store::Camera& camera) {
    std::set<std::string> servers;
    for (const CameraProfile& profile : camera.profiles) {
        servers.insert(ServerOf(profile.source));
    }
    return servers;
}

std::string LiveAddress(const store::Camera& camera) {
    const CameraProfile* live = camera.FindProfile(camera.live_profile);
    return live == nullptr ? "" : live->source;
}

}  // namespace

std::optional<store::Credentials> TakeCredentials(const Call& call, const admin::CameraSetup& stored,
                                                  const std::vector<std::string>& addresses, bool insecure) {
    store::Credentials credentials = stored.credentials.value_or(store::Credentials());
    TakeField(call, "account", credentials.account);
    TakeField(call, "password", credentials.password);
    const std::set<std::string> servers = ServersOf(stored.camera);
    const bool goes_elsewhere =
        (insecure && !stored.camera.insecure) || std::ranges::any_of(addresses, [&](const std::string& address) {
            return !servers.contains(ServerOf(address));
        });
    if (goes_elsewhere && call.Parameter("password").isNull() && !credentials.password.empty()) {
        throw Failure(400,
                      "password must be given again for another scheme, host or port, or once certificates are not "
                      "verified");
    }
    return credentials.account.empty() && credentials.password.empty() ? std::nullopt : std::optional(credentials);
}

void TakeCameraFields(const Call& call, admin::CameraSetup& setup) {
    const admin::CameraSetup before = setup;
    store::Camera& camera = setup.camera;
    TakeField(call, "name", camera.name);
    TakeField(call, "enabled", camera.enabled);
    TakeField(call, "insecure", camera.insecure);
    TakeField(call, "audio", camera.audio);
    TakeField(call, "ptz", camera.ptz);
    TakeField(call, "liveProfile", camera.live_profile);
    camera.max_age_s = AgeLimitIn(call, "limitDays").value_or(camera.max_age_s);
    TakeSources(call.Parameter("source"), camera);
    if (LiveAddress(camera) != LiveAddress(before.camera)) {
        // Until the recorder has seen it, unless the caller has.
        const media::NetworkKind* kind = media::FindNetworkKind(LiveAddress(camera));
        camera.video_type = kind == nullptr ? base::Codec::kH264 : kind->usual_codec;
    }
    TakeNamed(call.Parameter("codec"), "codec", base::VideoCodecWords(), camera.video_type);
    std::vector<std::string> addresses;
    for (const CameraProfile& profile : camera.profiles) {
        addresses.push_back(profile.source);
    }
    setup.credentials = TakeCredentials(call, before, addresses, camera.insecure);
    TakeGroups(call.Parameter("group"), setup.groups);
    TakePlan(call.Parameter("plan"), setup.plan);
}

}  // namespace lookhaven::api
