// SPDX-License-Identifier: Apache-2.0
#include "standalone/api/password_check.h"

#include <algorithm>

#include <arpa/inet.h>

#include "standalone/admin/first_account.h"
#include "standalone/api/login_log.h"
#include "standalone/base/clock.h"
#include "standalone/store/login_throttle.h"

namespace lookhaven::api {

namespace {

// A logged-in user who gives the right password can request any number of hashes, and must not block log-ins.
constexpr control::HashingLimits kHashingLimits{.in_all = 4, .of_users = 2, .of_user = 1};

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

// secret: of which too many were tried. packaging/fail2ban knows the sentence.
void RefuseUnlessNow(int wait_s, const std::string& secret) {
    if (wait_s > 0) {
        const std::string when = "try again in " + std::to_string(wait_s) + " seconds";
        const std::string article = secret.find_first_of("ae") == 0 ? "an " : "a ";
        throw Failure(429, "too many attempts with " + article + secret + "; " + when, wait_s);
    }
}

}  // namespace

HashingPermit::HashingPermit(const Call& call) : slot_(call.slot) {
    if (!call.slots.BeginHashing(slot_, kHashingLimits)) {
        throw Failure(503, "too many passwords are being checked; try again in a moment", http::kRetrySoonSeconds);
    }
}

HashingPermit::~HashingPermit() {
    control::SlotTable::EndHashing(slot_);
}

store::VerifiedUser CheckPassword(const Call& call, const std::string& account, const std::string& password) {
    const std::string network = NetworkOf(call.request.Header("REMOTE_ADDR"));
    store::LoginThrottle throttle(call.Records());
    RefuseUnlessNow(throttle.Wait(account, network, base::WallSeconds()), "password");
    const HashingPermit permit(call);
    RefuseUnlessNow(throttle.Enter(account, network, base::WallSeconds()), "password");
    const auto user = store::Users(call.Records()).CheckPassword(account, password);
    if (!user) {
        throw Failure(401, "wrong account or password");
    }
    throttle.Clear(account, network);
    return *user;
}

store::VerifiedUser Reauthenticate(const Call& call, const std::string& parameter) {
    const Json::Value& password = call.Parameter(parameter);
    if (password.isNull()) {
        throw Failure(403, "this needs your own password once more");
    }
    const std::string& account = call.login.value().account;
    try {
        return CheckPassword(call, account, password.asString());
    } catch (const Failure& failure) {
        LogRefused(call.context.Installation(), account, call.request.Header("REMOTE_ADDR"), failure.what());
        if (failure.Status() == 401) {
            throw Failure(403, "your own password is wrong");
        }
        throw;
    }
}

void CheckSetupToken(const Call& call, const std::string& token) {
    try {
        admin::RequireSetupToken(call.Records(), token, base::TimeSinceBoot());
    } catch (const admin::InvalidToken&) {
        // Only a wrong token counts: others in the owner's network must not block the right one.
        CountAttempt(call, "setup token");
        throw;
    }
}

void CountAttempt(const Call& call, const char* secret) {
    const std::string network = NetworkOf(call.request.Header("REMOTE_ADDR"));
    store::LoginThrottle throttle(call.Records());
    RefuseUnlessNow(throttle.Wait(secret, network, base::WallSeconds()), secret);
    RefuseUnlessNow(throttle.Enter(secret, network, base::WallSeconds()), secret);
}

std::string RequireNewPassword(const Call& call, const std::string& parameter) {
    std::string password = call.Parameter(parameter).asString();
    store::RequirePassword(password);
    return password;
}

store::HashedPassword Hash(const Call& call, const std::string& password) {
    const HashingPermit permit(call);
    return store::HashedPassword(password);
}

void RequireNotInQuery(const Call& call, std::initializer_list<const char*> names) {
    const Parameters query = ReadQuery(call.request);
    for (const char* name : names) {
        if (query.contains(name)) {
            throw Failure(400, std::string(name) + " belongs in the body: URLs end up in logs and browser histories");
        }
    }
}

void RequireNoPasswordInQuery(const Call& call) {
    RequireNotInQuery(call, {"password", "newPassword", "reauth"});
}

}  // namespace lookhaven::api
