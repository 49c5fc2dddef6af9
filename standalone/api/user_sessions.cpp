// SPDX-License-Identifier: Apache-2.0
#include "standalone/api/user_sessions.h"

#include <optional>
#include <vector>

#include "standalone/admin/users.h"
#include "standalone/binding/rights.h"
#include "standalone/store/secret.h"

namespace lookhaven::api {

namespace {

// The account whose sessions are asked for.
int AccountAskedFor(const Call& call) {
    const int own = call.Actor().user_id;
    const Json::Value& id = call.Parameter("id");
    if (id.isNull() || id.asInt() == own) {
        return own;
    }
    if (!binding::IsManager()) {
        throw Failure(403, "the sessions of other accounts are for managers");
    }
    return id.asInt();
}

std::vector<store::Session> SessionsOf(const Call& call) {
    return admin::SessionsOf(call.Records(), call.Actor(), AccountAskedFor(call));
}

// What names a session here. Not its handle, by which other processes of this machine know it.
std::string KeyOf(const store::Session& session) {
    constexpr std::size_t kKeyDigits = 32;
    return store::Digest("session " + session.handle).substr(0, kKeyDigits);
}

// The handle of the account's session of that key; one that no session has where there is none.
std::string HandleOf(const Call& call, const std::string& key) {
    for (const store::Session& session : SessionsOf(call)) {
        if (KeyOf(session) == key) {
            return session.handle;
        }
    }
    return "";
}

}  // namespace

std::string Sessions(const Call& call) {
    Json::Value data;
    data["session"] = Json::arrayValue;
    for (const store::Session& session : SessionsOf(call)) {
        Json::Value& json = data["session"].append(Json::objectValue);
        json["key"] = KeyOf(session);
        json["address"] = session.address;
        json["started"] = Json::Int64{session.created_s};
        json["lastUse"] = Json::Int64{session.last_seen_s};
        json["current"] = session.handle == call.login.value().session_handle;
    }
    return SuccessAnswer(data);
}

std::string EndSessions(const Call& call) {
    const Json::Value& key = call.Parameter("key");
    Json::Value data;
    data["ended"] = admin::EndSessions(call.Records(), call.Actor(), AccountAskedFor(call),
                                       key.isNull() ? std::nullopt : std::optional(HandleOf(call, key.asString())),
                                       call.login.value().session_handle);
    return SuccessAnswer(data);
}

}  // namespace lookhaven::api
