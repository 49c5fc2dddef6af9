// SPDX-License-Identifier: Apache-2.0
//
// VEXO.System: how the installation is, for monitors, who find it at /healthz and /metrics; and for managers its parts
// with what to do where one is not well, its last errors, what was changed in it, and what holds for all of it.
#include <algorithm>
#include <array>
#include <limits>
#include <memory>
#include <utility>
#include <vector>

#include <json/json.h>

#include "standalone/admin/change.h"
#include "standalone/admin/settings.h"
#include "standalone/api/certificate.h"
#include "standalone/api/health.h"
#include "standalone/api/log_levels.h"
#include "standalone/api/metrics.h"
#include "standalone/api/own_apis.h"
#include "standalone/api/revision.h"
#include "standalone/api/system_status.h"
#include "standalone/base/json_text.h"
#include "standalone/base/log.h"
#include "standalone/base/text.h"
#include "standalone/doctor/error_log.h"
#include "standalone/store/audit_log.h"
#include "standalone/store/secret.h"
#include "standalone/store/settings.h"

namespace lookhaven::api {

namespace {

constexpr std::int64_t kMaxAuditEntries = 200;
constexpr std::int64_t kMaxErrors = 200;
constexpr int kMonitorUserId = -1;  // all monitors together
constexpr int kStatusUserId = -2;   // all who look at the state
constexpr const char* kNoMonitor =
    "monitors must run on this machine or send the token of lookhaven setting set monitor_token";

// Null when it cannot be opened, which is what a monitor wants to be told.
store::Store* TryToOpen(const Call& call) {
    try {
        return &call.Records();
    } catch (const store::StoreError& error) {
        base::LogError(std::string("the record store cannot be opened for a monitoring request: ") + error.what());
        return nullptr;
    }
}

// Over plain HTTP, which only this machine can reach. A proxy on it that speaks for somebody else mostly says so.
bool IsFromThisMachine(const http::Request& request) {
    const std::string_view address = request.Header("REMOTE_ADDR");
    const bool is_proxied =
        std::ranges::any_of(std::array{"HTTP_X_FORWARDED_FOR", "HTTP_X_FORWARDED_HOST", "HTTP_X_FORWARDED_PROTO",
                                       "HTTP_X_REAL_IP", "HTTP_FORWARDED", "HTTP_VIA"},
                            [&](const char* name) { return !request.Header(name).empty(); });
    return (address.starts_with("127.") || address == "::1") && request.Header("HTTPS") != "on" && !is_proxied;
}

bool IsToken(store::Store& records, std::string_view token) {
    const auto digest = store::Settings(records).Find(store::kMonitorTokenSetting);
    return digest && *digest == store::Digest(token);
}

// Returns the store as TryToOpen gives it. Throws Failure 401 for a caller that is no monitor, 503 when too many are
// asking, or for a monitor elsewhere whose token cannot be compared, as the store cannot be opened. What can be refused
// without opening the store is refused before.
store::Store* AdmitMonitor(const Call& call) {
    constexpr std::string_view kScheme = "Bearer ";
    constexpr std::size_t kMaxMonitors = 4;
    const bool is_from_here = IsFromThisMachine(call.request);
    std::string_view token = call.request.Header("HTTP_AUTHORIZATION");
    token.remove_prefix(token.starts_with(kScheme) ? kScheme.size() : token.size());
    if (!is_from_here && !base::IsHex(token, store::kMonitorTokenDigits)) {
        throw Failure(401, kNoMonitor);
    }
    if (call.slots.BeginRequest(call.slot, kMonitorUserId, kMaxMonitors, std::numeric_limits<std::size_t>::max()) !=
        control::QuotaResult::kGranted) {
        throw Failure(503, "too many monitoring requests are running", http::kRetrySoonSeconds);
    }
    store::Store* const records = TryToOpen(call);
    if (!is_from_here && records == nullptr) {
        throw Failure(503, "the record store cannot be opened", http::kRetrySoonSeconds);
    }
    if (!is_from_here && !IsToken(*records, token)) {
        throw Failure(401, kNoMonitor);
    }
    return records;
}

std::string Health(const Call& call) {
    const std::vector<Problem> problems = FindProblems(call.context.Installation(), AdmitMonitor(call));
    Json::Value answer;
    answer["success"] = true;
    answer["data"]["healthy"] = problems.empty();
    Json::Value& list = answer["data"]["problem"] = Json::arrayValue;
    for (const Problem& problem : problems) {
        Json::Value& json = list.append(Json::objectValue);
        json["subject"] = problem.subject;
        if (problem.id != 0) {
            json["id"] = problem.id;
        }
        json["message"] = problem.message;
    }
    call.slot.status = problems.empty() ? 200 : 503;
    return http::JsonAnswer(call.slot.status, base::OneLineJson(answer) + '\n');
}

std::string Metrics(const Call& call) {
    const std::string text = MetricsOf(call, AdmitMonitor(call));
    return "Status: 200 OK\r\nContent-Type: text/plain; version=0.0.4; charset=utf-8\r\nCache-Control: no-store\r\n"
           "Content-Length: " +
           std::to_string(text.size()) + "\r\n\r\n" + text;
}

std::string Audit(const Call& call) {
    const std::int64_t before = call.NumberOr("before", 0);
    const std::int64_t limit = call.NumberOr("limit", kMaxAuditEntries);
    if (limit < 1 || limit > kMaxAuditEntries || !std::in_range<int>(before)) {
        throw Failure(400, "limit must be 1 to 200, and before the id of an entry");
    }
    std::vector<store::AuditEntry> entries =
        store::AuditLog(call.Records()).List(static_cast<int>(before), static_cast<int>(limit) + 1);
    Json::Value data;
    data["more"] = std::cmp_greater(entries.size(), limit);
    entries.resize(std::min<std::size_t>(entries.size(), static_cast<std::size_t>(limit)));
    Json::Value& list = data["entry"] = Json::arrayValue;
    for (const store::AuditEntry& entry : entries) {
        Json::Value& json = list.append(Json::objectValue);
        json["id"] = entry.id;
        json["time"] = Json::Int64{entry.time_s};
        json["who"] = entry.who;
        json["address"] = entry.address;
        json["action"] = entry.action;
        json["object"] = entry.object;
        json["before"] = base::ParseOneLineJson(entry.before);
        json["after"] = base::ParseOneLineJson(entry.after);
    }
    return SuccessAnswer(data);
}

std::string Status(const Call& call) {
    constexpr std::size_t kMaxConcurrent = 2;  // each has a process for each check
    admin::RequireManager(call.Records(), call.Actor());
    if (call.slots.BeginRequest(call.slot, kStatusUserId, kMaxConcurrent, std::numeric_limits<std::size_t>::max()) !=
        control::QuotaResult::kGranted) {
        throw Failure(503, "the system status is being read for others; try again in a moment",
                      http::kRetrySoonSeconds);
    }
    return SuccessAnswer(SystemStatus(call));
}

std::string LogTail(const Call& call) {
    admin::RequireManager(call.Records(), call.Actor());
    const std::int64_t limit = call.NumberOr("limit", kMaxErrors);
    if (limit < 1 || limit > kMaxErrors) {
        throw Failure(400, "limit must be 1 to 200");
    }
    const doctor::LastErrors last =
        doctor::ReadLastErrors(call.context.Installation().LogFolder(), static_cast<std::size_t>(limit));
    Json::Value data;
    Json::Value& list = data["entry"] = Json::arrayValue;
    for (const doctor::LoggedError& error : last.newest_first) {
        Json::Value& json = list.append(Json::objectValue);
        json["time"] = Json::Int64{error.time_ms / 1000};
        json["process"] = error.process;
        json["text"] = error.text;
    }
    data["files"] = last.has_files;
    data["journal"] = base::LogsToJournal();
    return SuccessAnswer(data);
}

std::string Settings(const Call& call) {
    admin::RequireManager(call.Records(), call.Actor());
    Json::Value data;
    Json::Value& list = data["setting"] = Json::arrayValue;
    for (const admin::Setting& setting : admin::Settings()) {
        list.append(admin::SettingRecord(call.Records(), setting));
    }
    return SuccessAnswer(data);
}

std::string SetSetting(const Call& call) {
    Json::Value data;
    data["setting"] = admin::SetSetting(call.Records(), call.Actor(), call.Parameter("name").asString(),
                                        SeenRevision(call), call.Parameter("value"));
    return SuccessAnswer(data);
}

using enum Method::Accepts;
using enum Method::Audience;

constexpr Method kMethods[] = {{"Health", Health},
                               {"Metrics", Metrics},
                               {"Status", Status, kPostOnly, kManagers},
                               {"Audit", Audit, kPostOnly, kManagers},
                               {"Settings", Settings, kPostOnly, kManagers},
                               {"SetSetting", SetSetting, kPostOnly, kManagers},
                               {"SetCertificate", SetCertificate, kPostOnly, kManagers},
                               {"LogTail", LogTail, kPostOnly, kManagers},
                               {"LogLevels", LogLevels, kPostOnly, kManagers},
                               {"SetLogLevels", SetLogLevels, kPostOnly, kManagers}};

}  // namespace

const OwnApi kSystemApi{"VEXO.System", kMethods, false};

}  // namespace lookhaven::api
