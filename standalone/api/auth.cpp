// SPDX-License-Identifier: Apache-2.0
//
// VEXO.Auth: log in, log out, who am I.
#include <algorithm>

#include <arpa/inet.h>

#include "standalone/api/admit.h"
#include "standalone/api/own_apis.h"
#include "standalone/api/player.h"

#include "standalone/base/clock.h"
#include "standalone/store/login_throttle.h"
#include "standalone/store/sessions.h"
#include "standalone/store/users.h"

namespace lookhaven::api {

namespace {

std::int64_t NowSeconds() {
    return base::WallMillis() / 1000;
}

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

// Whom a limit counts as one: an IPv4 address, or the /64 network of an IPv6 address, all of which one client may use.
// All machines of a link share its link-local network.
std::string NetworkOf(std::string_view address) {
    in6_addr bytes{};
    if (::inet_pton(AF_INET6, std::string(address).c_str(), &bytes) != 1 || IN6_IS_ADDR_V4MAPPED(&bytes) ||
        IN6_IS_ADDR_LINKLOCAL(&bytes)) {
        return std::string(address);
    }
    std::fill(std::begin(bytes.s6_addr) + 8, std::end(bytes.s6_addr), std::uint8_t{0});
    char text[INET6_ADDRSTRLEN];
    return std::string(::inet_ntop(AF_INET6, &bytes, text, sizeof text)) + "/64";
}

std::string LogIn(const Call& call) {
    store::Store& records = call.Records();
    const Parameters query = ReadQuery(call.request);
    if (query.contains("account") || query.contains("password")) {
        throw Failure(400, "account and password belong in the body: URLs end up in logs and browser histories");
    }
    const std::string account = call.Parameter("account").asString();
    const std::string address = NetworkOf(call.request.Header("REMOTE_ADDR"));
    store::LoginThrottle throttle(records);
    if (const int wait_s = throttle.Enter(account, address, NowSeconds()); wait_s > 0) {
        throw Failure(429, "too many log-ins; try again in " + std::to_string(wait_s) + " seconds");
    }
    const auto user = store::Users(records).CheckPassword(account, call.Parameter("password").asString());
    if (!user) {
        throw Failure(401, "wrong account or password");
    }
    throttle.Clear(account, address);
    try {
        const store::NewSession session = store::Sessions(records).Create(*user, NowSeconds());
        return SuccessAnswer(Identity(records, user->name, user->id, user->IsManager()),
                             CookieLine(call.request, session.secret));
    } catch (const store::NotFound&) {  // removed, or its password changed, in this moment
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
    return SuccessAnswer(Json::nullValue, CookieLine(call.request, "; Max-Age=0"));
}

constexpr Method kMethods[] = {
    {"Login", LogIn, Method::Effect::kChanges}, {"Logout", LogOut, Method::Effect::kChanges}, {"Status", Status}};

}  // namespace

const OwnApi kAuthApi{"VEXO.Auth", kMethods, false};

}  // namespace lookhaven::api
