// SPDX-License-Identifier: Apache-2.0
//
// VEXO.Token: the access tokens of analytics boxes and POS terminals, as a manager gives them out and takes them back.
#include "standalone/api/own_apis.h"

#include "standalone/admin/access_tokens.h"
#include "standalone/api/fields.h"
#include "standalone/api/named_list.h"
#include "standalone/api/password_check.h"
#include "standalone/base/clock.h"
#include "standalone/store/access_tokens.h"
#include "standalone/store/cameras.h"
#include "standalone/store/value_names.h"

namespace lookhaven::api {

namespace {

using store::AccessToken;

Json::Value Describe(const AccessToken& token) {
    Json::Value json = admin::TokenRecord(token);
    json["lastUse"] = token.last_use_s == 0 ? Json::Value() : Json::Value(Json::Int64{token.last_use_s});
    return json;
}

// Both kinds where the call names none.
void TakeKinds(const Json::Value& kinds, AccessToken& token) {
    if (!kinds.isNull() && !kinds.isArray()) {
        RefuseField("kind", "a list of alert, pos or both");
    }
    token.may_alert = token.may_pos = kinds.isNull();
    for (const Json::Value& each : kinds) {
        store::MarkKind kind{};
        TakeNamed(each, "kind", store::MarkKindNames(), kind);
        token.may_alert |= kind == store::MarkKind::kAlert;
        token.may_pos |= kind == store::MarkKind::kPos;
    }
}

AccessToken TokenOf(const Call& call) {
    AccessToken token;
    TakeField(call, "name", token.name);
    const Json::Value& cameras = call.Parameter("camera");
    if (!cameras.isArray()) {
        RefuseField("camera", "a list of cameras' ids");
    }
    for (const Json::Value& camera : cameras) {
        if (!camera.isInt()) {
            RefuseField("camera", "a list of cameras' ids");
        }
        token.camera_ids.insert(camera.asInt());
    }
    TakeKinds(call.Parameter("kind"), token);
    return token;
}

std::string List(const Call& call) {
    Json::Value data;
    data["token"] = Json::arrayValue;
    for (const AccessToken& token : store::AccessTokens(call.Records()).List()) {
        data["token"].append(Describe(token));
    }
    data["camera"] = NamedList(store::Cameras(call.Records()).List());
    return SuccessAnswer(data);
}

std::string Add(const Call& call) {
    RequireNoPasswordInQuery(call);
    const AccessToken token = TokenOf(call);
    const std::int64_t lifetime_s = call.NumberOr("lifetime", 0);
    Reauthenticate(call, "reauth");
    const admin::NewAccessToken added =
        admin::AddAccessToken(call.Records(), call.Actor(), token, lifetime_s, base::WallSeconds());
    Json::Value data;
    data["token"] = Describe(added.token);
    data["secret"] = added.secret;
    return SuccessAnswer(data);
}

std::string Remove(const Call& call) {
    admin::RemoveAccessToken(call.Records(), call.Actor(), IdIn(call, "id"));
    return SuccessAnswer(Json::objectValue);
}

using enum Method::Accepts;
using enum Method::Audience;

constexpr Method kMethods[] = {
    {"List", List, kPostOnly, kManagers}, {"Add", Add, kPostOnly, kManagers}, {"Remove", Remove, kPostOnly, kManagers}};

}  // namespace

const OwnApi kTokenApi{"VEXO.Token", kMethods};

}  // namespace lookhaven::api
