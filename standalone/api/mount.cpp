// SPDX-License-Identifier: Apache-2.0
//
// VEXO.Mount: storage mounts: what they hold, for how long it lasts, and their limits.
#include <algorithm>
#include <cerrno>
#include <cmath>
#include <map>
#include <optional>
#include <vector>

#include <unistd.h>

#include "standalone/admin/change.h"
#include "standalone/admin/hosts.h"
#include "standalone/admin/mount_claim.h"
#include "standalone/admin/mount_forecast.h"
#include "standalone/admin/mount_place.h"
#include "standalone/admin/mounts.h"
#include "standalone/api/confirm.h"
#include "standalone/api/fields.h"
#include "standalone/api/own_apis.h"
#include "standalone/api/revision.h"
#include "standalone/archive/layout.h"
#include "standalone/base/clock.h"
#include "standalone/control/common_config.h"
#include "standalone/maintenance/mount_folder.h"
#include "standalone/maintenance/mount_status.h"
#include "standalone/maintenance/shared_folder.h"
#include "standalone/store/cameras.h"
#include "standalone/store/events.h"
#include "standalone/store/hosts.h"
#include "standalone/store/settings.h"

namespace lookhaven::api {

namespace {

using maintenance::MountState;

constexpr std::int64_t kDayS = 86'400;
constexpr std::int64_t kRateDays = 7;
constexpr int kHistoryDays = 30;
constexpr double kMaxLimitBytes = 9e15;  // exact in JavaScript

// What all mounts are described by.
struct MountContext {
    const base::Installation& installation;
    std::int64_t now_s = base::WallSeconds();
    std::vector<maintenance::MountStatus> states = {};  // as the recorder that runs sees them
    std::vector<store::RecentFootage> recent = {};
    std::map<int, std::string> camera_names = {};
};

MountContext ReadMountContext(const Call& call) {
    const base::Installation& installation = call.context.Installation();
    MountContext known{installation};
    if (control::FindRecorder(installation) == control::RecorderState::kAlive) {
        known.states = maintenance::ReadMountStatus(installation);
    }
    known.recent = store::Events(call.Records()).RecordedSince(known.now_s - kRateDays * kDayS);
    for (const store::Camera& camera : store::Cameras(call.Records()).List()) {
        known.camera_names[camera.id] = camera.name;
    }
    return known;
}

struct Condition {
    std::string state = "ready";
    std::string message = {};
    std::optional<maintenance::MountSpace> space = {};
};

// As its folder is found.
Condition Inspect(store::Store& records, const store::Mount& mount) {
    const auto marker = maintenance::MountFolder::ReadMarker(mount.path);
    if (!marker) {
        return {"absent", "the folder is missing or not marked as this mount's: its disk is not mounted"};
    }
    if (*marker != maintenance::MarkerFor(records, mount.id)) {
        return {"foreign", "the folder is marked as that of another mount or installation"};
    }
    const maintenance::MountSpace space = maintenance::OpenMount(records, mount).value().Space();
    if (::access(mount.path.c_str(), R_OK | W_OK | X_OK) != 0) {
        return errno == EROFS ? Condition{"read-only", "its file system is mounted read-only", space}
                              : Condition{"no-access", "the server has no write access to the folder", space};
    }
    if (space.free_bytes < space.ReserveBytes() || space.free_files < space.ReserveFiles()) {
        return {"full", "its disk is full", space};
    }
    return {"ready", "", space};
}

Condition ConditionOf(store::Store& records, const store::Mount& mount, const MountContext& known) {
    if (!mount.IsOf(known.installation.HostId())) {
        const auto host = store::Hosts(records).Find(mount.host_id);
        return {"other-host", host ? "it is of host " + host->name : "it is of a host that was removed"};
    }
    if (maintenance::IsOnlyOnOtherHosts(known.installation, records, mount)) {
        return {"elsewhere", "not mounted on this host: what is on it comes from the others"};
    }
    Condition condition;
    try {
        condition = Inspect(records, mount);
    } catch (const std::system_error& error) {
        return {"failing", error.what()};
    } catch (const std::bad_optional_access&) {  // unmounted in this moment
        return {"absent", "its disk is not mounted"};
    }
    for (const maintenance::MountStatus& status : known.states) {
        const bool tells_more = status.state == MountState::kInUse || status.state == MountState::kFailing ||
                                status.state == MountState::kSpaceHeld || status.state == MountState::kKeptFull;
        if (status.mount == mount.id && condition.state == "ready" && tells_more) {
            condition.state = maintenance::NameOf(status.state);
            condition.message = status.state == MountState::kInUse       ? "another recorder works on it"
                                : status.state == MountState::kSpaceHeld ? "deleting frees no space"
                                : status.state == MountState::kKeptFull
                                    ? "kept recordings alone reach its limit: everything else is deleted at once"
                                    : status.reason;
        }
    }
    return condition;
}

// By camera, with a name where the camera was not removed. Returns the sum.
double AddRates(const store::Mount& mount, const MountContext& known, Json::Value& list) {
    double sum = 0;
    list = Json::arrayValue;
    for (const store::RecentFootage& footage : known.recent) {
        if (footage.mount_id != mount.id) {
            continue;
        }
        const double rate = admin::BytesPerDay(footage.size_bytes, footage.first_s, kRateDays * kDayS, known.now_s);
        const auto name = known.camera_names.find(footage.camera_id);
        Json::Value& json = list.append(Json::objectValue);
        json["id"] = footage.camera_id;
        json["name"] = name == known.camera_names.end() ? "" : name->second;
        json["perDay"] = Json::Int64{std::llround(rate)};
        sum += rate;
    }
    return sum;
}

Json::Value History(store::Events& events, const store::Mount& mount, std::int64_t now_s) {
    const std::int64_t first_s = (now_s / kDayS - (kHistoryDays - 1)) * kDayS;
    Json::Value list = Json::arrayValue;
    std::int64_t day_s = first_s;
    for (const std::int64_t bytes : events.BytesByDay(mount.id, first_s, kHistoryDays)) {
        Json::Value& json = list.append(Json::objectValue);
        json["day"] = archive::DayOf(day_s);
        json["bytes"] = Json::Int64{bytes};
        day_s += kDayS;
    }
    return list;
}

Json::Value OrNull(const std::optional<std::int64_t>& number) {
    return number ? Json::Value(Json::Int64{*number}) : Json::Value();
}

Json::Value Describe(store::Store& records, const store::Mount& mount, const MountContext& known) {
    store::Events events(records);
    const Condition condition = ConditionOf(records, mount, known);
    const bool has_size = condition.space && condition.space->total_bytes > 0;
    admin::MountFigures figures{.used_bytes = events.Content(mount.id).size_bytes,
                                .is_there = has_size,
                                .max_bytes = mount.max_bytes,
                                .max_age_s = mount.max_age_s};
    Json::Value json = admin::MountRecord(mount);
    json["state"] = condition.state;
    json["message"] = condition.message;
    json["total"] = OrNull(has_size ? std::optional(condition.space->total_bytes) : std::nullopt);
    json["free"] = OrNull(has_size ? std::optional(condition.space->free_bytes) : std::nullopt);
    json["used"] = Json::Int64{figures.used_bytes};
    json["oldest"] = OrNull(events.OldestOn(mount.id));
    if (has_size) {
        figures.free_bytes = condition.space->free_bytes;
        figures.reserve_bytes = condition.space->ReserveBytes();
    }
    figures.bytes_per_day = AddRates(mount, known, json["camera"]);
    json["perDay"] = Json::Int64{std::llround(figures.bytes_per_day)};
    const std::optional<double> days = admin::DaysUntilDeleted(figures);
    json["lastsDays"] = days ? Json::Value(*days) : Json::Value();
    json["history"] = History(events, mount, known.now_s);
    return json;
}

std::string AnswerRecord(const Call& call, const store::Mount& mount) {
    Json::Value data;
    data["mount"] = Describe(call.Records(), mount, ReadMountContext(call));
    return SuccessAnswer(data);
}

// What List returns of the mount of a record, which somebody may have removed by now.
auto Completer(const Call& call) {
    return [&call](const Json::Value& record) {
        const auto mount = store::Mounts(call.Records()).Find(record["id"].asInt());
        return mount ? Describe(call.Records(), *mount, ReadMountContext(call)) : record;
    };
}

admin::MountChange ChangeOf(const Call& call) {
    admin::MountChange change;
    if (const Json::Value& name = call.Parameter("name"); !name.isNull()) {
        change.name = name.asString();
    }
    if (const Json::Value& enabled = call.Parameter("enabled"); !enabled.isNull()) {
        change.enabled = enabled.asBool();
    }
    change.max_bytes = LimitIn(call, "limitBytes", kMaxLimitBytes, 1);
    change.max_age_s = AgeLimitIn(call, "limitDays");
    change.is_default = call.Parameter("default").asBool();
    change.confirmed = call.Parameter("confirm").asBool();
    return change;
}

std::string List(const Call& call) {
    const MountContext known = ReadMountContext(call);
    Json::Value data;
    data["mount"] = Json::arrayValue;
    for (const store::Mount& mount : store::Mounts(call.Records()).List()) {
        data["mount"].append(Describe(call.Records(), mount, known));
    }
    return SuccessAnswer(data);
}

std::string Add(const Call& call) {
    admin::MountChange change = ChangeOf(call);
    change.path = call.Parameter("path").asString();
    change.own_host = admin::OwnHost(call.Records(), call.context.Installation());
    admin::RequireMountPlace(call.Records(), call.context.Installation(), *change.path);
    try {
        return AnswerRecord(call, admin::AddMount(call.Records(), call.Actor(), change));
    } catch (const admin::UnusableFolder& error) {
        const bool is_taken = error.Why() == admin::UnusableFolder::Reason::kTaken;
        throw Failure(400, is_taken ? "the folder belongs to another mount or installation" : error.what());
    } catch (const std::system_error& error) {
        throw Failure(400, "the folder cannot be used: " + error.code().message());
    }
}

std::string Set(const Call& call) {
    const std::int64_t seen = SeenRevision(call);
    const admin::MountChange change = ChangeOf(call);
    return OrConfirm([&] {
        return AnswerRecord(call, OnCurrentRecord(Completer(call), [&] {
                                return admin::SetMount(call.Records(), call.Actor(), call.Parameter("id").asInt(), seen,
                                                       change);
                            }));
    });
}

std::string Remove(const Call& call) {
    const std::int64_t seen = SeenRevision(call);
    OnCurrentRecord(Completer(call), [&] {
        admin::RemoveMount(call.Records(), call.Actor(), call.Parameter("id").asInt(), seen, false);
    });
    return SuccessAnswer(Json::objectValue);
}

using enum Method::Accepts;
using enum Method::Audience;

constexpr Method kMethods[] = {{"List", List, kPostOnly, kManagers},
                               {"Add", Add, kPostOnly, kManagers},
                               {"Set", Set, kPostOnly, kManagers},
                               {"Remove", Remove, kPostOnly, kManagers}};

}  // namespace

const OwnApi kMountApi{"VEXO.Mount", kMethods};

}  // namespace lookhaven::api
