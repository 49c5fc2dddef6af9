// SPDX-License-Identifier: Apache-2.0
#include "standalone/webapi/auth.h"

#include "standalone/base/clock.h"
#include "standalone/store/login_throttle.h"
#include "standalone/store/sessions.h"
#include "standalone/store/users.h"
#include "standalone/webapi/answer.h"
#include "standalone/webapi/playback.h"

namespace lookhaven::webapi {

namespace {

constexpr const char* kSessionCookie = "id";

std::int64_t NowSeconds() {
    return base::WallMillis() / 1000;
}

std::string CookieLine(const ScgiRequest& request, const std::string& value) {
    return std::string("Set-Cookie: ") + kSessionCookie + '=' + value + "; Path=/; HttpOnly; SameSite=Strict" +
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

std::string LogIn(store::Store& records, const ScgiRequest& request, const Parameters& parameters) {
    RequirePost(request);
    const std::string account = Find(parameters, "account").asString();
    const std::string_view address = request.Header("REMOTE_ADDR");
    store::LoginThrottle throttle(records);
    if (const int wait_s = throttle.Enter(account, address, NowSeconds()); wait_s > 0) {
        throw Failure(429, "too many log-ins; try again in " + std::to_string(wait_s) + " seconds");
    }
    const auto user = store::Users(records).CheckPassword(account, Find(parameters, "password").asString());
    if (!user) {
        throw Failure(401, "wrong account or password");
    }
    throttle.Clear(account, address);
    const store::NewSession session = store::Sessions(records).Create(*user, NowSeconds());
    return SuccessAnswer(Identity(records, user->name, user->id, user->IsManager()),
                         CookieLine(request, session.secret));
}

}  // namespace

std::optional<binding::Login> FindLogin(binding::RequestContext& context,
                                        const std::map<std::string, std::string>& cookies) {
    const auto cookie = cookies.find(kSessionCookie);
    if (cookie == cookies.end() || cookie->second.empty()) {
        return std::nullopt;
    }
    store::Sessions sessions(context.Records());
    const auto session = sessions.FindBySecret(cookie->second, NowSeconds());
    if (!session) {
        return std::nullopt;
    }
    sessions.Touch(*session, NowSeconds());
    return binding::Login{static_cast<unsigned int>(session->user.id), session->user.name, session->handle,
                          session->user.IsManager()};
}

std::string ServeAuth(binding::RequestContext& context, SlotTable& slots, const ScgiRequest& request, int version,
                      const std::string& method, const Parameters& parameters) {
    if (version != 1 || (method != "Login" && method != "Logout" && method != "Status")) {
        throw Failure(404, "no such api, version or method");
    }
    if (method == "Login") {
        return LogIn(context.Records(), request, parameters);
    }
    if (method == "Logout") {
        RequirePost(request);
    }
    const auto login = FindLogin(context, ReadCookies(request));
    if (!login) {
        throw Failure(401, "no session");
    }
    if (method == "Status") {
        return SuccessAnswer(
            Identity(context.Records(), login->account, static_cast<int>(login->user_id), login->is_manager));
    }
    store::Sessions(context.Records()).End(login->session_handle);
    slots.EndSession(login->session_handle);
    return SuccessAnswer(Json::nullValue, CookieLine(request, "; Max-Age=0"));
}

}  // namespace lookhaven::webapi
