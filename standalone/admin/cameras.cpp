// SPDX-License-Identifier: Apache-2.0
#include "standalone/admin/cameras.h"

#include <algorithm>
#include <chrono>
#include <thread>

#include "standalone/admin/change.h"
#include "standalone/base/clock.h"
#include "standalone/base/codec_words.h"
#include "standalone/base/host_name.h"
#include "standalone/base/local_time.h"
#include "standalone/store/events.h"
#include "standalone/store/footage_removals.h"
#include "standalone/store/groups.h"
#include "standalone/store/text.h"
#include "standalone/store/value_names.h"

namespace lookhaven::admin {

namespace {

using store::Camera;
using store::CameraGroup;
using store::CameraProfile;
using store::RecordingPlan;

constexpr std::size_t kMaxCameras = 1'000;
constexpr std::chrono::milliseconds kMaxWaitForRecorder{5'000};
constexpr std::chrono::milliseconds kPoll{100};

Json::Value PlanJson(const std::optional<RecordingPlan>& stored) {
    const RecordingPlan plan = stored.value_or(store::NoPlan());
    Json::Value json;
    json["mode"] = base::NameOf(store::RecordModeNames(), plan.mode);
    json["hours"] = plan.hours.empty()
                        ? std::string(base::kHoursOfWeek, static_cast<char>(store::HourMode::kAroundMarks))
                        : plan.hours;
    json["segment"] = plan.segment_s;
    json["pre"] = plan.pre_s;
    json["post"] = plan.post_s;
    json["mount"] = plan.mount_id;
    json["profile"] = plan.profile;
    return json;
}

// Addresses that were there before may be of a kind that only the command line takes.
void RequireNewSources(const media::SourceKinds& kinds, const Camera& camera, const Camera& before) {
    for (const CameraProfile& profile : camera.profiles) {
        const CameraProfile* known = before.FindProfile(profile.number);
        if (known == nullptr || known->source != profile.source) {
            RequireSource(kinds, profile.source);
        }
    }
}

void WriteGroups(store::Store& store, int camera, const std::set<int>& wanted) {
    store::Groups groups(store);
    for (const int id : wanted) {
        if (!groups.Find(id)) {
            throw store::NotFound("there is no camera group " + std::to_string(id));
        }
    }
    for (CameraGroup& group : groups.List()) {
        const bool changes =
            wanted.contains(group.id) ? group.camera_ids.insert(camera).second : group.camera_ids.erase(camera) > 0;
        if (changes) {
            groups.Update(group);
        }
    }
}

void WriteRest(store::Store& store, const CameraSetup& setup) {
    const int id = setup.camera.id;
    if (setup.plan) {
        store::RecordingPlans(store).Set(id, *setup.plan);
    }
    WriteGroups(store, id, setup.groups);
}

// For the audit log: that the password is another one shows, but nothing of it.
Json::Value AuditJson(const CameraSetup& setup, bool has_new_password) {
    Json::Value json = ToJson(setup);
    if (has_new_password) {
        json["password"] = "changed";
    }
    return json;
}

std::string PasswordOf(const CameraSetup& setup) {
    return setup.credentials ? setup.credentials->password : "";
}

bool HasOpenEvent(store::Store& store, int camera) {
    return std::ranges::any_of(store::Events(store).Open(),
                               [camera](const store::Event& event) { return event.camera_id == camera; });
}

}  // namespace

void RequireSource(const media::SourceKinds& kinds, const std::string& source) {
    if (media::FindKind(kinds, source) == nullptr || !store::IsSource(source)) {
        throw store::InvalidRecord("a source begins with " + media::ListKinds(kinds) +
                                   " and contains no account or password");
    }
    const std::size_t host = source.find("://");
    if (host != source.npos &&
        !base::IsHostAndPort(source.substr(host + 3, source.find_first_of("/?#", host + 3) - host - 3))) {
        throw store::InvalidRecord("the source " + source + " names no valid host or port");
    }
}

CameraSetup ReadCamera(store::Store& store, int id) {
    store::Cameras cameras(store);
    const std::optional<Camera> camera = cameras.Find(id);
    if (!camera) {
        throw store::NotFound("there is no camera " + std::to_string(id));
    }
    CameraSetup setup{*camera, cameras.FindCredentials(id), {}, {}};
    const auto plans = store::RecordingPlans(store).List();
    if (const auto plan = plans.find(id); plan != plans.end()) {
        setup.plan = plan->second;
    }
    for (const CameraGroup& group : store::Groups(store).List()) {
        if (group.camera_ids.contains(id)) {
            setup.groups.insert(group.id);
        }
    }
    return setup;
}

Json::Value ToJson(const CameraSetup& setup) {
    const Camera& camera = setup.camera;
    Json::Value json;
    json["id"] = camera.id;
    json["name"] = camera.name;
    json["enabled"] = camera.enabled;
    json["liveProfile"] = camera.live_profile;
    json["ptz"] = camera.ptz;
    json["audio"] = camera.audio;
    json["insecure"] = camera.insecure;
    json["source"] = Json::arrayValue;
    for (const CameraProfile& profile : camera.profiles) {
        Json::Value& source = json["source"].append(Json::objectValue);
        source["profile"] = profile.number;
        source["address"] = profile.source;
        source["width"] = profile.width;
        source["height"] = profile.height;
        source["fps"] = profile.fps;
    }
    json["account"] = setup.credentials ? setup.credentials->account : "";
    json["hasPassword"] = !PasswordOf(setup).empty();
    json["plan"] = PlanJson(setup.plan);
    json["limitDays"] = DaysJson(camera.max_age_s);
    if (camera.host_id != 0) {
        json["host"] = camera.host_id;
    }
    json["group"] = Json::arrayValue;
    for (const int group : setup.groups) {
        json["group"].append(group);
    }
    json["revision"] = Json::Int64{RevisionOf(json)};
    json["codec"] = base::CodecWord(camera.video_type);
    return json;
}

CameraSetup AddCamera(store::Store& store, const Actor& actor, const media::SourceKinds& kinds, CameraSetup setup,
                      const CameraEdit& prepare) {
    RequireManager(store, actor);
    RequireNewSources(kinds, setup.camera, {});
    if (prepare) {
        prepare(setup);
    }
    Apply(store, actor, [&] {
        store::Cameras cameras(store);
        if (cameras.List().size() >= kMaxCameras) {
            throw store::InvalidRecord("there are 1,000 cameras already, and no more are possible");
        }
        setup.camera.id = cameras.Add(setup.camera);
        if (setup.credentials) {
            cameras.SetCredentials(setup.camera.id, setup.credentials);
        }
        WriteRest(store, setup);
        return Change{"camera.add", Named(setup.camera.name, setup.camera.id), {}, AuditJson(setup, false)};
    });
    return setup;
}

CameraSetup SetCamera(store::Store& store, const Actor& actor, const media::SourceKinds& kinds, int id,
                      std::optional<std::int64_t> seen, const CameraEdit& edit, bool confirmed) {
    RequireManager(store, actor);
    const CameraSetup before = ReadCamera(store, id);
    const Json::Value before_json = ToJson(before);
    RequireCurrent(before_json, seen);
    CameraSetup setup = before;
    edit(setup);
    RequireNewSources(kinds, setup.camera, before.camera);
    if (!confirmed && IsLower(setup.camera.max_age_s, before.camera.max_age_s)) {
        RequireNoLoss(before.camera, setup.camera, [&store, now_s = base::WallSeconds()](const Camera& camera) {
            return maintenance::ForecastRetention(store, camera.id, camera.max_age_s, now_s);
        });
    }
    Apply(store, actor, [&] {
        RequireCurrent(ToJson(ReadCamera(store, id)), before_json["revision"].asInt64());
        const bool has_new_credentials =
            PasswordOf(setup) != PasswordOf(before) ||
            setup.credentials.has_value() != before.credentials.has_value() ||
            (setup.credentials && setup.credentials->account != before.credentials->account);
        store::Cameras cameras(store);
        cameras.Update(setup.camera);
        if (has_new_credentials) {
            cameras.SetCredentials(id, setup.credentials);
        }
        WriteRest(store, setup);
        return Change{"camera.set", Named(setup.camera.name, id), AuditJson(before, false),
                      AuditJson(setup, PasswordOf(setup) != PasswordOf(before))};
    });
    return setup;
}

void RemoveCamera(store::Store& store, const Actor& actor, int id, std::optional<std::int64_t> seen, Footage footage) {
    Apply(store, actor, [&] {
        const CameraSetup setup = ReadCamera(store, id);
        RequireCurrent(ToJson(setup), seen);
        store::Cameras(store).Remove(id);
        if (footage == Footage::kRemove) {
            store::FootageRemovals(store).Add(id, base::WallSeconds());
        }
        Json::Value before = AuditJson(setup, false);
        before["footage"] = footage == Footage::kRemove ? "remove" : "keep";
        return Change{"camera.remove", Named(setup.camera.name, id), before, {}};
    });
    if (footage == Footage::kRemove) {
        store::Events(store).BeginDeletionOfCamera(id);
        const auto until = std::chrono::steady_clock::now() + kMaxWaitForRecorder;
        while (HasOpenEvent(store, id) && std::chrono::steady_clock::now() < until) {
            std::this_thread::sleep_for(kPoll);
        }
        store::Events(store).BeginDeletionOfCamera(id);
    }
}

Json::Value OrderRecord(const std::vector<Camera>& cameras) {
    Json::Value json;
    json["id"] = Json::arrayValue;
    for (const Camera& camera : cameras) {
        json["id"].append(camera.id);
    }
    json["revision"] = Json::Int64{RevisionOf(json)};
    return json;
}

Json::Value OrderCameras(store::Store& store, const Actor& actor, std::optional<std::int64_t> seen,
                         const std::vector<int>& ids) {
    Json::Value record;
    Apply(store, actor, [&] {
        store::Cameras cameras(store);
        const Json::Value before = OrderRecord(cameras.List());
        RequireCurrent(before, seen);
        cameras.SetOrder(ids);
        record = OrderRecord(cameras.List());
        return Change{"camera.order", "cameras", before["id"], record["id"]};
    });
    return record;
}

}  // namespace lookhaven::admin
