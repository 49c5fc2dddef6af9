// SPDX-License-Identifier: Apache-2.0
//
// VEXO.Auth: log in, log out, who am I.
#include "standalone/api/admit.h"
#include "standalone/api/login_log.h"
#include "standalone/api/own_apis.h"
#include "standalone/api/password_check.h"
#include "standalone/api/player.h"

#include "standalone/base/clock.h"
#include "standalone/store/sessions.h"
#include "standalone/store/users.h"

namespace lookhaven::api {

namespace {

std::string CookieLine(const http::Request& request, const std::string& value) {
    return std::string("Set-Cookie: ") + SessionCookie(request) + '=' + value + "; Path=/; HttpOnly; SameSite=Strict" +
           (request.Header("HTTPS") == "on" ? "; Secure\r\n" : "\r\n");
}

Json::Value Identity(store::Store& records, const std::string& account, int user_id, bool is_manager) {
    Json::Value data;
    data["account"] = account;
    data["user_id"] = user_id;
    data["is_manager"] = is_manager;
    data["players_per_session"] = PlayersPerSession(records);
    return data;
}

std::string LogIn(const Call& call) {
    const Parameters query = ReadQuery(call.request);
    if (query.contains("account") || query.contains("password")) {
        throw Failure(400, "account and password belong in the body: URLs end up in logs and browser histories");
    }
    const std::string account = call.Parameter("account").asString();
    const std::string_view address = call.request.Header("REMOTE_ADDR");
    store::Store& records = call.Records();
    try {
        const store::VerifiedUser user = CheckPassword(call, account, call.Parameter("password").asString());
        const store::NewSession session = store::Sessions(records).Create(user, base::WallSeconds(), address);
        LogAccepted(call.context.Installation(), user.name, address);
        return SuccessAnswer(Identity(records, user.name, user.id, user.IsManager()),
                             CookieLine(call.request, session.secret));
    } catch (const Failure& failure) {
        LogRefused(call.context.Installation(), account, address, failure.what());
        throw;
    } catch (const store::NotFound&) {  // removed, or its password changed, in this moment
        LogRefused(call.context.Installation(), account, address, "the account has changed in this moment");
        throw Failure(401, "wrong account or password");
    }
}

const binding::Login& RequireLogin(const Call& call) {
    if (!call.login) {
        throw Failure(401, "no session");
    }
    return *call.login;
}

std::string Status(const Call& call) {
    const binding::Login& login = RequireLogin(call);
    return SuccessAnswer(Identity(call.Records(), login.account, static_cast<int>(login.user_id), login.is_manager));
}

std::string LogOut(const Call& call) {
    const binding::Login& login = RequireLogin(call);
    store::Sessions(call.Records()).End(login.session_handle);
    call.slots.EndSession(login.session_handle);
    // The browser may hold small pictures of footage.
    return SuccessAnswer(Json::nullValue, CookieLine(call.request, "; Max-Age=0") + "Clear-Site-Data: \"cache\"\r\n");
}

constexpr Method kMethods[] = {
    {"Login", LogIn, Method::Effect::kChanges}, {"Logout", LogOut, Method::Effect::kChanges}, {"Status", Status}};

}  // namespace

const OwnApi kAuthApi{"VEXO.Auth", kMethods, false};

}  // namespace lookhaven::api
