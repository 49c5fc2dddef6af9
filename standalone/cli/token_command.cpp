// SPDX-License-Identifier: Apache-2.0
//
// lookhaven token: what analytics boxes and POS terminals report with, in place of an account.
#include <algorithm>
#include <functional>

#include "standalone/admin/access_tokens.h"
#include "standalone/base/clock.h"
#include "standalone/cli/command_group.h"
#include "standalone/cli/commands.h"
#include "standalone/cli/table.h"
#include "standalone/cli/units.h"
#include "standalone/store/access_tokens.h"
#include "standalone/store/value_names.h"

namespace lookhaven::cli {

namespace {

using store::AccessToken;
using store::AccessTokens;

struct Request {
    std::string name;
    std::vector<int> cameras;
    std::vector<store::MarkKind> kinds;
    std::string expires;
};

Json::Value ToData(const AccessToken& token) {
    Json::Value kinds(Json::arrayValue);
    for (const auto& [name, kind] : store::MarkKindNames()) {
        if (token.MayReport(kind)) {
            kinds.append(name);
        }
    }
    return Object("id", token.id, "name", token.name, "cameras", Array(token.camera_ids, std::identity()), "kinds",
                  kinds, "created", token.created_s, "by", token.creator, "last_use", token.last_use_s, "expires",
                  token.expires_s);
}

std::string LastUseText(const Json::Value& time_s) {
    return time_s.asInt64() == 0 ? "never" : FormatMoment(time_s.asInt64());
}

std::string ExpiryText(const Json::Value& time_s) {
    const std::int64_t expires_s = time_s.asInt64();
    return expires_s == 0 ? "never" : FormatMoment(expires_s) + (expires_s <= base::WallSeconds() ? " (expired)" : "");
}

constexpr Column kColumns[] = {{"id", "id"},
                               {"name", "name"},
                               {"cameras", "cameras"},
                               {"kinds", "kinds"},
                               {"by", "by"},
                               {"last use", "last_use", LastUseText},
                               {"expires", "expires", ExpiryText}};

void Add(const Console& console, const Request& request) {
    const auto has = [&request](store::MarkKind kind) {
        return request.kinds.empty() || std::ranges::find(request.kinds, kind) != request.kinds.end();
    };
    const std::int64_t lifetime_s = request.expires.empty() ? 0 : ParseDuration(request.expires);
    if (lifetime_s == 0 && !request.expires.empty()) {
        throw Failure(kUsage, "a token that never expires is added without --expires");
    }
    AccessToken wanted;
    wanted.name = request.name;
    wanted.camera_ids = {request.cameras.begin(), request.cameras.end()};
    wanted.may_alert = has(store::MarkKind::kAlert);
    wanted.may_pos = has(store::MarkKind::kPos);
    store::Store store = console.OpenStore();
    const auto [token, secret] = admin::AddAccessToken(store, {}, wanted, lifetime_s, base::WallSeconds());
    Json::Value data = ToData(token);
    data["secret"] = secret;
    console.Answer(data, "Added access token ", token.name, ". Its secret is shown only here:\n", secret);
}

void List(const Console& console) {
    store::Store store = console.OpenStore();
    const Json::Value data = Array(AccessTokens(store).List(), ToData);
    console.Answer(data, Table(kColumns, data));
}

void Remove(const Console& console, const Request& request) {
    store::Store store = console.OpenStore();
    const std::vector<AccessToken> tokens = AccessTokens(store).List();
    const auto found = std::ranges::find(tokens, request.name, &AccessToken::name);
    if (found == tokens.end()) {
        throw Failure(kNoInput, "there is no access token ", request.name);
    }
    admin::RemoveAccessToken(store, {}, found->id);
    console.Answer(Object("id", found->id, "name", found->name), "Removed access token ", found->name,
                   "; what it has reported stays.");
}

}  // namespace

void AddToken(CLI::App& program, const Console& console) {
    CommandGroup<Request> group(program, console, "token",
                                "Access tokens, with which analytics boxes and POS terminals report");
    Request& request = group.request();
    const std::string name = "The token's name, such as that of the device";
    group.Add("add", "Adds a token and prints its secret, this once", Add)
        .Option("name", request.name, name, Required)
        .Option("--camera", request.cameras, "A camera at which it may report; may be repeated", Required, Repeatable)
        .Option("--kind", request.kinds, "What it may report (default: both); may be repeated",
                OneOf(store::MarkKindNames()), Repeatable)
        .Option("--expires", request.expires, "After how long it expires, such as 90d (default: never)");
    group.Add("list", "Lists the tokens, without their secrets", List);
    group.Add("remove", "Removes a token; what it has reported stays", Remove)
        .Option("name", request.name, name, Required);
}

}  // namespace lookhaven::cli
