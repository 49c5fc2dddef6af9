// SPDX-License-Identifier: Apache-2.0
#include "standalone/api/admit.h"

#include "standalone/base/clock.h"
#include "standalone/base/log.h"
#include "standalone/binding/rights.h"
#include "standalone/store/sessions.h"

namespace lookhaven::api {

namespace {

// Authenticates its callers itself; every other API of a module needs a session.
constexpr const char* kSelfAdmittingApi = "VEXO.Lookhaven.Player.LiveviewSrc";

// A GET has effects too: it starts streams, costs work, and plays sound.
bool IsCrossSite(const http::Request& request) {
    if (const std::string_view site = request.Header("HTTP_SEC_FETCH_SITE"); !site.empty()) {
        return site != "same-origin" && site != "none";
    }
    const std::string_view origin = request.Header("HTTP_ORIGIN");
    if (origin.empty()) {
        return false;
    }
    const std::size_t scheme_end = origin.find("://");
    return scheme_end == origin.npos || origin.substr(scheme_end + 3) != request.Header("HTTP_HOST");
}

}  // namespace

const char* SessionCookie(const http::Request& request) {
    return request.Header("HTTPS") == "on" ? "__Host-id" : "id";
}

std::optional<binding::Login> FindLogin(const Call& call) {
    if (IsCrossSite(call.request)) {
        // The page of a paired host shows this host's cameras with a token of its own; the session is not its to use.
        if (call.request.Header("REQUEST_METHOD") == "GET" && call.Parameter("api") == kSelfAdmittingApi) {
            return std::nullopt;
        }
        throw Failure(403, "another site's page may not ask for this");
    }
    const auto cookie = call.cookies.find(SessionCookie(call.request));
    if (cookie == call.cookies.end() || cookie->second.empty()) {
        return std::nullopt;
    }
    const std::int64_t now_s = base::WallMillis() / 1000;
    store::Sessions sessions(call.Records());
    const auto session = sessions.FindBySecret(cookie->second, now_s);
    if (!session) {
        return std::nullopt;
    }
    try {
        sessions.Touch(*session, now_s);
    } catch (const store::StoreError& error) {  // a store that can only be read is no reason to refuse what only reads
        base::LogWarning(std::string("cannot note that a session is in use: ") + error.what());
    }
    return binding::Login{static_cast<unsigned int>(session->user.id), session->user.name, session->handle,
                          session->user.IsManager()};
}

void Admit(const Call& call, std::size_t max_requests) {
    const Json::Value& priv_data = call.Parameter("privData");
    call.context.RestrictByPrivData(binding::CamerasDeniedBy(priv_data), binding::SoundDeniedBy(priv_data));
    if (!call.login) {
        if (call.api != kSelfAdmittingApi) {
            throw Failure(401, "no session");
        }
        return;
    }
    call.context.SetCaller(call.login->user_id);
    call.context.SetSession(call.login->session_handle);
    control::SlotTable::SetSession(call.slot, call.login->session_handle);
    if (call.slots.OlderRequests(call.slot) >= max_requests) {
        throw Failure(503, "too many requests of this session are running");
    }
}

}  // namespace lookhaven::api
