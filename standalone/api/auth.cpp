// SPDX-License-Identifier: Apache-2.0
//
// VEXO.Auth: log in, log out, who am I; and the first account of all.
#include <filesystem>
#include <system_error>

#include "standalone/admin/first_account.h"
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

std::string LoggedIn(const Call& call, const store::User& user, const store::NewSession& session) {
    control::SlotTable::SetAccount(call.slot, user.name);
    LogAccepted(call.context.Installation(), user.name, call.request.Header("REMOTE_ADDR"));
    return SuccessAnswer(Identity(call.Records(), user.name, user.id, user.IsManager()),
                         CookieLine(call.request, session.secret));
}

std::string LogIn(const Call& call) {
    RequireNotInQuery(call, {"account", "password"});
    const std::string account = call.Parameter("account").asString();
    const std::string_view address = call.request.Header("REMOTE_ADDR");
    store::Store& records = call.Records();
    try {
        const store::VerifiedUser user = CheckPassword(call, account, call.Parameter("password").asString());
        return LoggedIn(call, user, store::Sessions(records).Create(user, base::WallSeconds(), address));
    } catch (const Failure& failure) {
        LogRefused(call.context.Installation(), account, address, failure.what());
        throw;
    } catch (const store::NotFound&) {  // removed, or its password changed, in this moment
        LogRefused(call.context.Installation(), account, address, "the account was changed meanwhile");
        throw Failure(401, "wrong account or password");
    }
}

std::string MakeFirstAccount(const Call& call) {
    RequireNotInQuery(call, {"account", "password", "token"});
    const std::string name = call.Parameter("account").asString();
    const std::string password = RequireNewPassword(call, "password");
    const std::string token = call.Parameter("token").asString();
    const std::string address(call.request.Header("REMOTE_ADDR"));
    store::Store& records = call.Records();
    const base::Installation& installation = call.context.Installation();
    try {
        CheckSetupToken(call, token);
        const store::User user =
            admin::AddFirstAccount(records, token, name, Hash(call, password), address, base::TimeSinceBoot());
        std::error_code ignored;  // what the file holds is of no use any more
        std::filesystem::remove(admin::SetupAddressFile(installation), ignored);
        return LoggedIn(call, user, store::Sessions(records).Create(user.id, base::WallSeconds(), address));
    } catch (const Failure& failure) {
        LogRefused(installation, name, address, failure.what());
        throw;
    } catch (const admin::InvalidToken& error) {
        LogRefused(installation, name, address, error.what());
        throw Failure(403, "This address has expired or was replaced by a newer one. On the server, the command"
                           " lookhaven setup-address prints another.");
    } catch (const store::AlreadyExists&) {
        throw Failure(409, "There is an account already. Please log in.");
    }
}

const binding::Login& RequireLogin(const Call& call) {
    if (!call.login) {
        throw Failure(401, "no session");
    }
    return *call.login;
}

std::string Status(const Call& call) {
    if (!call.login && store::Users(call.Records()).IsEmpty()) {
        throw Failure(401, "there is no account yet: lookhaven setup-address, on the server, prints where to make it",
                      0, R"({"noAccount":true})");
    }
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

constexpr Method kMethods[] = {{"Login", LogIn, Method::Accepts::kPostOnly},
                               {"Logout", LogOut, Method::Accepts::kPostOnly},
                               {"Status", Status},
                               {"MakeFirstAccount", MakeFirstAccount, Method::Accepts::kPostOnly}};

}  // namespace

const OwnApi kAuthApi{"VEXO.Auth", kMethods, false};

}  // namespace lookhaven::api
