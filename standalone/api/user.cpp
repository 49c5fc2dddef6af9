// SPDX-License-Identifier: Apache-2.0
//
// VEXO.User: accounts and what they are denied, their sessions; and everybody's own password, sessions and preferences.
// Whatever tells of accounts takes POST, too: then no address of it ends up in a log or a browser's history.
#include <algorithm>
#include <optional>
#include <vector>

#include "standalone/admin/change.h"
#include "standalone/admin/user_record.h"
#include "standalone/admin/users.h"
#include "standalone/api/named_list.h"
#include "standalone/api/own_apis.h"
#include "standalone/api/password_check.h"
#include "standalone/api/preferences.h"
#include "standalone/api/revision.h"
#include "standalone/api/user_sessions.h"
#include "standalone/base/clock.h"
#include "standalone/store/cameras.h"
#include "standalone/store/devices.h"
#include "standalone/store/emaps.h"
#include "standalone/store/groups.h"
#include "standalone/store/servers.h"
#include "standalone/store/sessions.h"

namespace lookhaven::api {

namespace {

int IdOf(const Call& call) {
    return call.Parameter("id").asInt();
}

// The record with the account's use, which its revision does not cover.
Json::Value WithUse(Json::Value record, const std::map<int, store::Sessions::Use>& uses) {
    const auto use = uses.find(record["id"].asInt());
    record["sessions"] = use == uses.end() ? 0 : use->second.sessions;
    record["lastUse"] = use == uses.end() ? Json::Value() : Json::Value(Json::Int64{use->second.last_s});
    return record;
}

std::map<int, store::Sessions::Use> Uses(const Call& call) {
    return store::Sessions(call.Records()).Uses(base::WallSeconds());
}

std::string AnswerRecord(const Call& call, const Json::Value& record) {
    Json::Value data;
    data["user"] = WithUse(record, Uses(call));
    return SuccessAnswer(data);
}

auto Completer(const Call& call) {
    return [&call](const Json::Value& record) { return WithUse(record, Uses(call)); };
}

// This host's, then those of paired hosts, with the host's name.
Json::Value CamerasToDeny(store::Store& records) {
    Json::Value list = NamedList(store::Cameras(records).List());
    store::RecordingServers servers(records);
    const std::vector<store::RecordingServer> known = servers.List();
    for (const store::RemoteCamera& camera : servers.ListCameras()) {
        const auto server = std::ranges::find(known, camera.server_id, &store::RecordingServer::id);
        AppendNamed(list, camera)["server"] = server == known.end() ? "" : server->name;
    }
    return list;
}

std::string List(const Call& call) {
    store::Store& records = call.Records();
    store::Devices devices(records);
    const std::map<int, store::Sessions::Use> uses = Uses(call);
    Json::Value data;
    data["user"] = Json::arrayValue;
    for (const store::User& user : store::Users(records).List()) {
        data["user"].append(WithUse(admin::UserRecord(records, user), uses));
    }
    data["camera"] = CamerasToDeny(records);
    data["group"] = NamedList(store::Groups(records).List(), [](Json::Value& json, const store::CameraGroup& group) {
        json["camera"] = Json::arrayValue;
        for (const int camera : group.camera_ids) {
            json["camera"].append(camera);
        }
    });
    data["door"] = NamedList(devices.List(store::EmapItemType::kDoor));
    data["ioModule"] = NamedList(devices.List(store::EmapItemType::kIoModule));
    data["emap"] = NamedList(store::Emaps(records).List());
    return SuccessAnswer(data);
}

// The changes except the password.
admin::UserChange RightsOf(const Call& call) {
    admin::UserChange change;
    if (const Json::Value& privilege = call.Parameter("privilege"); !privilege.isNull()) {
        change.privilege = admin::PrivilegeFrom(privilege.asString());
    }
    if (const Json::Value& may_mark = call.Parameter("mayMark"); !may_mark.isNull()) {
        change.may_mark = may_mark.asBool();
    }
    if (const Json::Value& deny = call.Parameter("deny"); !deny.isNull()) {
        change.denials = [wanted = admin::DenialsFrom(deny)](store::Denials& denials) { denials = wanted; };
    }
    return change;
}

std::string Add(const Call& call) {
    RequireNoPasswordInQuery(call);
    admin::UserChange change = RightsOf(call);
    const std::string password = RequireNewPassword(call, "password");
    Reauthenticate(call, "reauth");
    change.password = Hash(call, password);
    return AnswerRecord(call, admin::AddUser(call.Records(), call.Actor(), call.Parameter("name").asString(), change));
}

std::string Set(const Call& call) {
    RequireNoPasswordInQuery(call);
    const std::int64_t seen = SeenRevision(call);
    admin::UserChange change = RightsOf(call);
    std::optional<std::string> password;
    if (!call.Parameter("password").isNull()) {
        password = RequireNewPassword(call, "password");
    }
    if (password || change.privilege) {
        Reauthenticate(call, "reauth");
    }
    if (password) {
        change.password = Hash(call, *password);
    }
    return AnswerRecord(call, OnCurrentRecord(Completer(call), [&] {
                            return admin::SetUser(call.Records(), call.Actor(), IdOf(call), seen, change);
                        }));
}

std::string Remove(const Call& call) {
    RequireNoPasswordInQuery(call);
    const std::int64_t seen = SeenRevision(call);
    Reauthenticate(call, "reauth");
    OnCurrentRecord(Completer(call), [&] { admin::RemoveUser(call.Records(), call.Actor(), IdOf(call), seen); });
    return SuccessAnswer(Json::objectValue);
}

std::string Preview(const Call& call) {
    Json::Value data;
    data["camera"] = NamedList(admin::CamerasAsSeenBy(call.Records(), IdOf(call)),
                               [](Json::Value& json, const admin::VisibleCamera& camera) {
                                   json["live"] = camera.live;
                                   json["audio"] = camera.audio;
                                   json["playback"] = camera.playback;
                                   json["export"] = camera.exported;
                               });
    return SuccessAnswer(data);
}

std::string ChangePassword(const Call& call) {
    RequireNoPasswordInQuery(call);
    const std::string password = RequireNewPassword(call, "newPassword");
    const store::VerifiedUser user = Reauthenticate(call, "password");
    try {
        admin::ChangePassword(call.Records(), call.Actor().address, user, Hash(call, password),
                              call.login.value().session_handle);
    } catch (const store::NotFound&) {
        throw Failure(409, "the account was changed meanwhile");
    }
    return SuccessAnswer(Json::objectValue);
}

using enum Method::Accepts;
using enum Method::Audience;

constexpr Method kMethods[] = {
    {"List", List, kPostOnly, kManagers},       {"Add", Add, kPostOnly, kManagers},
    {"Set", Set, kPostOnly, kManagers},         {"Remove", Remove, kPostOnly, kManagers},
    {"Preview", Preview, kPostOnly, kManagers}, {"ChangePassword", ChangePassword, kPostOnly},
    {"Sessions", Sessions, kPostOnly},          {"EndSessions", EndSessions, kPostOnly},
    {"Preferences", Preferences, kPostOnly},    {"SetPreferences", SetPreferences, kPostOnly}};

}  // namespace

const OwnApi kUserApi{"VEXO.User", kMethods};

}  // namespace lookhaven::api
