// SPDX-License-Identifier: Apache-2.0
//
// VEXO.Auth: log in, log out, who am I.
#include <algorithm>

#include <arpa/inet.h>

#include "standalone/api/admit.h"
#include "standalone/api/login_log.h"
#include "standalone/api/own_apis.h"
#include "standalone/api/player.h"

#include "standalone/base/clock.h"
#include "standalone/store/login_throttle.h"
#include "standalone/store/sessions.h"
#include "standalone/store/users.h"

namespace lookhaven::api {

namespace {

constexpr std::size_t kMaxHashing = 4;  // at once, in 64 MiB each

// Whoever checks or hashes a password on request holds this meanwhile.
class HashingPlace {
  public:
    // Throws Failure 503 when there is none.
    explicit HashingPlace(const Call& call) : slot_(call.slot) {
        if (!call.slots.BeginHashing(slot_, kMaxHashing)) {
            throw Failure(503, "too many log-ins at once; try again in a moment", http::kRetrySoonSeconds);
        }
    }
    ~HashingPlace() { control::SlotTable::EndWork(slot_); }
    HashingPlace(const HashingPlace&) = delete;
    HashingPlace& operator=(const HashingPlace&) = delete;

  private:
    control::Slot& slot_;
};

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

void RefuseUnlessNow(int wait_s) {
    if (wait_s > 0) {
        throw Failure(429, "too many log-ins; try again in " + std::to_string(wait_s) + " seconds", wait_s);
    }
}

// Throws Failure for who may not log in, or not now. An attempt for which there is no room does not count as one, and
// one that is barred takes no room.
store::VerifiedUser CheckPassword(const Call& call, const std::string& account) {
    const std::string network = NetworkOf(call.request.Header("REMOTE_ADDR"));
    store::LoginThrottle throttle(call.Records());
    RefuseUnlessNow(throttle.Wait(account, network, base::WallSeconds()));
    const HashingPlace place(call);
    RefuseUnlessNow(throttle.Enter(account, network, base::WallSeconds()));
    const auto user = store::Users(call.Records()).CheckPassword(account, call.Parameter("password").asString());
    if (!user) {
        throw Failure(401, "wrong account or password");
    }
    throttle.Clear(account, network);
    return *user;
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
        const store::VerifiedUser user = CheckPassword(call, account);
        const store::NewSession session = store::Sessions(records).Create(user, base::WallSeconds());
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
