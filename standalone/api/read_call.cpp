// SPDX-License-Identifier: Apache-2.0
#include "standalone/api/read_call.h"

#include <unistd.h>

#include "standalone/api/admit.h"
#include "standalone/api/bearer.h"
#include "standalone/api/emap_setup.h"
#include "standalone/api/forward.h"
#include "standalone/api/own_apis.h"
#include "standalone/base/log.h"
#include "standalone/emap/map_picture.h"
#include "standalone/http/body.h"

namespace lookhaven::api {

namespace {

constexpr std::size_t kMaxBody = std::size_t{1} << 20;

}  // namespace

Call ReadCall(const base::Installation& installation, const http::RequestCounters& counters, http::Request& request,
              control::SlotTable& slots, control::Slot& slot) {
    const bool is_forwarded = TakeForwarded(request, installation);
    Call call{.request = request,
              .api = {},
              .method = {},
              .parameters = ReadQuery(request),
              .cookies = ReadCookies(request),
              .login = {},
              .token = {},
              .is_forwarded = is_forwarded,
              .context = binding::RequestContext::Current(),
              .slots = slots,
              .slot = slot,
              .counters = counters};
    // The session comes first: nobody without one may cost more than a short request.
    call.token = FindAccessToken(call);
    if (call.token) {
        const std::string reporter = call.token->AsReporter().name;
        base::SetLogAccount(reporter);
        control::SlotTable::SetAccount(slot, reporter);
    } else {
        call.login = FindLogin(call);
    }
    if (call.login) {
        base::SetLogAccount(call.login->account);
        control::SlotTable::SetAccount(slot, call.login->account);
    }
    const std::size_t body_bytes = request.body.size() + request.unread_body_bytes;
    if (!call.login && !call.token && body_bytes > http::kMaxBodyWithoutSession) {
        throw SessionNeeded(call.Parameter("api") == kAuthApi.name);
    }
    const bool is_picture = !call.token && IsPictureUpload(call);
    if (is_picture && call.login && !call.login->is_manager) {
        throw Failure(403, kManagersOnly);
    }
    if (body_bytes > (is_picture ? emap::kMaxUploadBytes : kMaxBody)) {
        throw Failure(413, is_picture ? "the picture is larger than 20 MiB" : "the request body is larger than 1 MiB");
    }
    http::ReadBody(request, STDOUT_FILENO);
    if (!is_picture) {
        AddBody(request, call.parameters);
    }
    call.api = call.Parameter("api").asString();
    call.version = call.Parameter("version").asInt();
    call.method = call.Parameter("method").asString();
    if (const Json::Value& camera = call.Parameter("camera"); (call.login || call.token) && camera.isInt()) {
        base::SetLogCamera(camera.asInt());
    }
    return call;
}

http::Failure SessionNeeded(bool is_log_in) {
    return {is_log_in ? 413 : 401, "log in first: without a session a body holds 4 KiB at most"};
}

}  // namespace lookhaven::api
