// SPDX-License-Identifier: Apache-2.0
//
// VEXO.Camera: cameras as a manager sets them up: look at an address, add, change, order, remove.
#include "standalone/api/own_apis.h"

#include <array>
#include <utility>

#include "standalone/admin/cameras.h"
#include "standalone/admin/change.h"
#include "standalone/api/camera_fields.h"
#include "standalone/api/camera_page.h"
#include "standalone/api/confirm.h"
#include "standalone/api/fields.h"
#include "standalone/api/named_list.h"
#include "standalone/api/password_check.h"
#include "standalone/api/probe.h"
#include "standalone/api/revision.h"
#include "standalone/store/groups.h"
#include "standalone/store/mounts.h"

namespace lookhaven::api {

namespace {

// The paths at which cameras of many makes offer their streams.
constexpr std::array<std::pair<const char*, const char*>, 12> kUsualPaths{{
    {"first stream", "/stream1"},
    {"second stream", "/stream2"},
    {"first channel, first stream", "/Streaming/Channels/101"},
    {"first channel, second stream", "/Streaming/Channels/102"},
    {"channel 1, main stream", "/cam/realmonitor?channel=1&subtype=0"},
    {"channel 1, sub stream", "/cam/realmonitor?channel=1&subtype=1"},
    {"live, channel 0", "/live/ch0"},
    {"live, channel 1", "/live/ch1"},
    {"profile 1", "/media/video1"},
    {"profile 2", "/media/video2"},
    {"H.264", "/h264"},
    {"live", "/live"},
}};

std::string List(const Call& call) {
    bool counts_footage = true;
    TakeField(call, "footage", counts_footage);
    store::Store& records = call.Records();
    const CameraPage page(call, counts_footage ? std::optional(0) : std::nullopt);
    Json::Value data;
    data["camera"] = Json::arrayValue;
    for (const store::Camera& camera : page.Cameras()) {
        page.Complete(data["camera"].append(admin::ToJson(admin::ReadCamera(records, camera.id))));
    }
    data["order"] = admin::OrderRecord(page.Cameras());
    data["group"] = NamedList(store::Groups(records).List());
    data["mount"] = NamedList(store::Mounts(records).List(),
                              [](Json::Value& json, const store::Mount& mount) { json["default"] = mount.is_default; });
    data["path"] = Json::arrayValue;
    for (const auto& [name, path] : kUsualPaths) {
        Json::Value& json = data["path"].append(Json::objectValue);
        json["name"] = name;
        json["path"] = path;
    }
    return SuccessAnswer(data);
}

Json::Value Completed(const Call& call, Json::Value record) {
    CameraPage(call, record["id"].asInt()).Complete(record);
    return record;
}

auto Completer(const Call& call) {
    return [&call](const Json::Value& record) { return Completed(call, record); };
}

std::string CameraAnswer(const Call& call, const admin::CameraSetup& setup) {
    Json::Value data;
    data["camera"] = Completed(call, admin::ToJson(setup));
    return SuccessAnswer(data);
}

int RequireId(const Call& call) {
    const Json::Value& id = call.Parameter("id");
    if (!id.isInt64()) {
        throw Failure(400, "id must be a number");
    }
    if (!id.isInt()) {
        throw Failure(404, kNoSuchCamera);
    }
    return id.asInt();
}

std::string Add(const Call& call) {
    RequireNoPasswordInQuery(call);
    admin::CameraSetup setup;
    setup.camera.enabled = true;
    TakeCameraFields(call, setup);
    setup = admin::AddCamera(call.Records(), call.Actor(), camera::NetworkKinds(), setup);
    return CameraAnswer(call, setup);
}

std::string Set(const Call& call) {
    RequireNoPasswordInQuery(call);
    const std::int64_t seen = SeenRevision(call);
    bool is_confirmed = false;
    TakeField(call, "confirm", is_confirmed);
    return OrConfirm([&] {
        return OnCurrentRecord(Completer(call), [&] {
            return CameraAnswer(call,
                                admin::SetCamera(
                                    call.Records(), call.Actor(), camera::NetworkKinds(), RequireId(call), seen,
                                    [&](admin::CameraSetup& setup) { TakeCameraFields(call, setup); }, is_confirmed));
        });
    });
}

std::string Remove(const Call& call) {
    const Json::Value& footage = call.Parameter("footage");
    if (footage != "keep" && footage != "remove") {
        throw Failure(400, "footage must be keep or remove");
    }
    const std::int64_t seen = SeenRevision(call);
    return OnCurrentRecord(Completer(call), [&] {
        admin::RemoveCamera(call.Records(), call.Actor(), RequireId(call), seen,
                            footage == "keep" ? admin::Footage::kKeep : admin::Footage::kRemove);
        return SuccessAnswer(Json::objectValue);
    });
}

std::string Order(const Call& call) {
    const Json::Value& list = call.Parameter("id");
    if (!list.isArray()) {
        throw Failure(400, "id must be a list of all cameras");
    }
    std::vector<int> ids;
    for (const Json::Value& id : list) {
        ids.push_back(id.asInt());
    }
    Json::Value data;
    data["order"] = admin::OrderCameras(call.Records(), call.Actor(), SeenRevision(call), ids);
    return SuccessAnswer(data);
}

using enum Method::Accepts;
using enum Method::Audience;

constexpr Method kMethods[] = {{"List", List, kPostOnly, kManagers},     {"Probe", ProbeCamera, kPostOnly, kManagers},
                               {"Add", Add, kPostOnly, kManagers},       {"Set", Set, kPostOnly, kManagers},
                               {"Remove", Remove, kPostOnly, kManagers}, {"Order", Order, kPostOnly, kManagers}};

}  // namespace

const OwnApi kCameraApi{"VEXO.Camera", kMethods};

}  // namespace lookhaven::api
