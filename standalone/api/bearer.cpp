// SPDX-License-Identifier: Apache-2.0
#include "standalone/api/bearer.h"

#include "standalone/api/login_log.h"
#include "standalone/api/own_apis.h"
#include "standalone/api/password_check.h"
#include "standalone/base/clock.h"
#include "standalone/base/log.h"
#include "standalone/base/text.h"

namespace lookhaven::api {

namespace {

constexpr const char* kWrong = "wrong access token";  // packaging/fail2ban knows the sentence
// What was given out is no guess: fail2ban bans nobody for it.
constexpr const char* kRemoved = "removed access token";
constexpr const char* kExpired = "expired access token";

// Logs five of a network within a minute, for they cost no more than a request: beyond that CountAttempt throws.
[[noreturn]] void Refuse(const Call& call, const char* sentence, const std::string& who = "access token") {
    try {
        CountAttempt(call, sentence);
    } catch (const store::StoreError& error) {  // a store that can only be read refuses as well
        base::LogWarning(std::string("cannot count a wrong access token: ") + error.what());
    }
    LogRefused(call.context.Installation(), who, call.request.Header("REMOTE_ADDR"), sentence);
    throw Failure(401, sentence);
}

std::optional<std::string_view> BearerOf(const http::Request& request) {
    constexpr std::string_view kScheme = "bearer ";
    const std::string_view header = request.Header("HTTP_AUTHORIZATION");
    if (base::LowerAscii(header.substr(0, kScheme.size())) != kScheme) {
        return std::nullopt;
    }
    const std::string_view bearer = header.substr(kScheme.size());
    return bearer.starts_with(store::AccessTokens::kPrefix) ? std::optional(bearer) : std::nullopt;
}

}  // namespace

std::optional<store::AccessToken> FindAccessToken(const Call& call) {
    const std::optional<std::string_view> bearer = BearerOf(call.request);
    if (!bearer) {
        return std::nullopt;
    }
    store::AccessTokens tokens(call.Records());
    std::optional<store::AccessToken> token = tokens.FindBySecret(*bearer);
    const std::int64_t now_s = base::WallSeconds();
    if (!token) {
        Refuse(call, tokens.WasGiven(*bearer) ? kRemoved : kWrong);
    }
    if (token->IsExpired(now_s)) {
        Refuse(call, kExpired, token->AsReporter().name);
    }
    try {
        tokens.Touch(*token, now_s);
    } catch (const store::StoreError& error) {  // what it asks for fails for itself
        base::LogWarning(std::string("cannot note that an access token is in use: ") + error.what());
    }
    return token;
}

void RequireReport(const Call& call) {
    if (call.api != kEventApi.name || call.version != 1 || call.method != "Mark") {
        throw Failure(403, "an access token may report events and nothing else");
    }
}

}  // namespace lookhaven::api
