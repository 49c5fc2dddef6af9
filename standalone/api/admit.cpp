// SPDX-License-Identifier: Apache-2.0
#include "standalone/api/admit.h"

#include <algorithm>
#include <chrono>
#include <limits>
#include <thread>

#include "standalone/api/own_apis.h"
#include "standalone/api/player.h"
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

constexpr int kAboveTokens = -1;  // this is the monitors', and accounts are positive
constexpr std::chrono::milliseconds kSearchPoll{10};
constexpr std::chrono::seconds kSearchWait{10};

void Occupy(control::SlotTable& slots, control::Slot& slot, int user, std::size_t max_of_user, std::size_t max_in_all) {
    switch (slots.BeginRequest(slot, user, max_of_user, max_in_all)) {
    case control::QuotaResult::kGranted:
        return;
    case control::QuotaResult::kTooManyOfUser:
        throw Failure(503, "too many requests of this account are running", http::kRetrySoonSeconds);
    case control::QuotaResult::kTooMany:
        throw Failure(503, "too many requests are running", http::kRetrySoonSeconds);
    }
}

void AwaitSearch(const Call& call, std::size_t max_of_user) {
    const auto until = std::chrono::steady_clock::now() + kSearchWait;
    while (!call.slots.BeginSearch(call.slot, max_of_user)) {
        if (std::chrono::steady_clock::now() > until) {
            throw Failure(503, "too many searches of this account are running", http::kRetrySoonSeconds);
        }
        call.context.CloseRecords();
        std::this_thread::sleep_for(kSearchPoll);
    }
}

}  // namespace

const char* SessionCookie(const http::Request& request) {
    return request.Header("HTTPS") == "on" ? "__Host-id" : "id";
}

CostClass CostClassOf(const Call& call) {
    const bool probes_camera = call.api == kCameraApi.name && call.method == "Probe";
    if (call.api == kSelfAdmittingApi || call.api == kPictureApi.name || call.api == kHostApi.name || probes_camera ||
        IsPlayer(call)) {
        return CostClass::kPictures;
    }
    const bool counts_footage =
        call.api == kCameraApi.name && call.method == "List" && call.Parameter("footage") != Json::Value(false);
    const bool reads_all = call.api == kSystemApi.name && call.method == "Status";
    const bool waits_for_host = call.api == kServerApi.name && call.method == "Add";
    if (counts_footage || reads_all || waits_for_host) {
        return CostClass::kSearch;
    }
    const bool reads_preferences = call.api == kUserApi.name && call.method == "Preferences";
    const bool streams_footage = call.api == kEventApi.name && call.method == "Stream";
    const bool is_light = reads_preferences || streams_footage || call.api == kAuthApi.name ||
                          call.api == kPlaybackApi.name || call.api == kRelayApi.name || call.api == kServerApi.name ||
                          call.api == kSystemApi.name || call.api == kCameraApi.name || call.api == kTokenApi.name;
    return is_light ? CostClass::kLittle : CostClass::kSearch;
}

std::optional<binding::Login> FindLogin(const Call& call) {
    if (IsCrossSite(call.request)) {
        // The page of a paired host shows this host's cameras with a token of its own; the session is not its to use.
        if (call.request.Header("REQUEST_METHOD") == "GET" && call.Parameter("api") == kSelfAdmittingApi) {
            return std::nullopt;
        }
        throw Failure(403, "pages of other sites may not send this request");
    }
    const auto cookie = call.cookies.find(SessionCookie(call.request));
    if (cookie == call.cookies.end() || !store::Sessions::MayBeSecret(cookie->second)) {
        return std::nullopt;
    }
    const std::int64_t now_s = base::WallSeconds();
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

void Admit(const Call& call, const RequestLimits& limits) {
    if (call.token) {
        Occupy(call.slots, call.slot, kAboveTokens - call.token->id, limits.per_user, limits.without_managers);
        AwaitSearch(call, limits.searches_per_user);
        return;
    }
    call.context.Restrict(binding::RestrictionsOf(call.Parameter("privData")));
    if (!call.login) {
        if (call.api != kSelfAdmittingApi) {
            throw Failure(401, "no session");
        }
        return;
    }
    call.context.SetCaller(call.login->user_id);
    call.context.SetSession(call.login->session_handle);
    control::SlotTable::SetSession(call.slot, call.login->session_handle);
    Occupy(call.slots, call.slot, static_cast<int>(call.login->user_id), limits.per_user,
           call.login->is_manager ? std::numeric_limits<std::size_t>::max() : limits.without_managers);
    const bool decodes_footage = call.api == kPictureApi.name && call.method == "At";
    if (decodes_footage || CostClassOf(call) == CostClass::kSearch) {
        AwaitSearch(call, limits.searches_per_user);
    }
}

void AdmitPairedHost(control::SlotTable& slots, control::Slot& slot, const RequestLimits& limits) {
    Occupy(slots, slot, store::kPairedHostUserId, limits.per_user, limits.without_managers);
}

void AdmitHost(control::SlotTable& slots, control::Slot& slot, int host, const RequestLimits& limits) {
    Occupy(slots, slot, -host, limits.per_user, limits.without_managers);  // no account has such an id
}

}  // namespace lookhaven::api
