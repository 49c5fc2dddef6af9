// SPDX-License-Identifier: Apache-2.0
//
// VEXO.Group: camera groups as a manager sets them up.
#include "standalone/api/own_apis.h"

#include "standalone/admin/change.h"
#include "standalone/admin/groups.h"
#include "standalone/api/fields.h"
#include "standalone/api/revision.h"

namespace lookhaven::api {

namespace {

std::string AnswerRecord(const Call& call, const store::CameraGroup& group) {
    Json::Value data;
    data["group"] = admin::GroupRecord(call.Records(), group);
    return SuccessAnswer(data);
}

// What the call does not name stays.
void TakeGroupFields(const Call& call, store::CameraGroup& group) {
    TakeField(call, "name", group.name);
    const Json::Value& cameras = call.Parameter("camera");
    if (cameras.isNull()) {
        return;
    }
    if (!cameras.isArray()) {
        throw Failure(400, "camera must be a list");
    }
    group.camera_ids.clear();
    for (const Json::Value& camera : cameras) {
        group.camera_ids.insert(camera.asInt());
    }
}

std::string List(const Call& call) {
    Json::Value data;
    data["group"] = Json::arrayValue;
    for (const store::CameraGroup& group : store::Groups(call.Records()).List()) {
        data["group"].append(admin::GroupRecord(call.Records(), group));
    }
    return SuccessAnswer(data);
}

std::string Add(const Call& call) {
    store::CameraGroup group;
    TakeGroupFields(call, group);
    return AnswerRecord(call, admin::AddGroup(call.Records(), call.Actor(), group));
}

std::string Set(const Call& call) {
    const std::int64_t seen = SeenRevision(call);
    return AnswerRecord(call, admin::SetGroup(call.Records(), call.Actor(), IdIn(call, "id"), seen,
                                              [&call](store::CameraGroup& group) { TakeGroupFields(call, group); }));
}

std::string Remove(const Call& call) {
    const std::int64_t seen = SeenRevision(call);
    admin::RemoveGroup(call.Records(), call.Actor(), IdIn(call, "id"), seen);
    return SuccessAnswer(Json::objectValue);
}

using enum Method::Accepts;
using enum Method::Audience;

constexpr Method kMethods[] = {{"List", List, kPostOnly, kManagers},
                               {"Add", Add, kPostOnly, kManagers},
                               {"Set", Set, kPostOnly, kManagers},
                               {"Remove", Remove, kPostOnly, kManagers}};

}  // namespace

const OwnApi kGroupApi{"VEXO.Group", kMethods};

}  // namespace lookhaven::api
