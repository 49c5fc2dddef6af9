// SPDX-License-Identifier: Apache-2.0
//
// VEXO.System: how the installation is, for monitors. The web server offers the methods as /healthz and /metrics.
#include <json/json.h>

#include "standalone/api/health.h"
#include "standalone/api/metrics.h"
#include "standalone/api/own_apis.h"
#include "standalone/base/log.h"
#include "standalone/store/secret.h"
#include "standalone/store/settings.h"

namespace lookhaven::api {

namespace {

// Null when it cannot be opened, which is what a monitor wants to be told.
store::Store* TryToOpen(const Call& call) {
    try {
        return &call.Records();
    } catch (const store::StoreError& error) {
        base::LogError(std::string("a monitor asks, and the record store cannot be opened: ") + error.what());
        return nullptr;
    }
}

// A web server on this machine that speaks for somebody else says so.
bool IsFromThisMachine(const http::Request& request) {
    const std::string_view address = request.Header("REMOTE_ADDR");
    return (address.starts_with("127.") || address == "::1") && request.Header("HTTP_X_FORWARDED_FOR").empty() &&
           request.Header("HTTP_FORWARDED").empty() && request.Header("HTTP_VIA").empty();
}

bool HasToken(const Call& call, store::Store* records) {
    constexpr std::string_view kScheme = "Bearer ";
    const std::string_view authorization = call.request.Header("HTTP_AUTHORIZATION");
    if (records == nullptr || !authorization.starts_with(kScheme)) {
        return false;
    }
    const auto digest = store::Settings(*records).Find(store::kMonitorTokenSetting);
    return digest && *digest == store::Digest(authorization.substr(kScheme.size()));
}

// Throws Failure 401 for anybody else. The store, as TryToOpen gives it.
store::Store* AdmitMonitor(const Call& call) {
    store::Store* const records = TryToOpen(call);
    if (!IsFromThisMachine(call.request) && !HasToken(call, records)) {
        throw Failure(401, "a monitor asks from this machine, or with the token of lookhaven set monitor-token");
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
        json["part"] = problem.part;
        if (problem.id != 0) {
            json["id"] = problem.id;
        }
        json["message"] = problem.message;
    }
    Json::StreamWriterBuilder writer;
    writer["indentation"] = "";
    call.slot.status = problems.empty() ? 200 : 503;
    return http::JsonAnswer(call.slot.status, Json::writeString(writer, answer) + '\n');
}

std::string Metrics(const Call& call) {
    const std::string text = MetricsOf(call, AdmitMonitor(call));
    return "Status: 200 OK\r\nContent-Type: text/plain; version=0.0.4; charset=utf-8\r\nCache-Control: no-store\r\n"
           "Content-Length: " +
           std::to_string(text.size()) + "\r\n\r\n" + text;
}

constexpr Method kMethods[] = {{"Health", Health}, {"Metrics", Metrics}};

}  // namespace

const OwnApi kSystemApi{"VEXO.System", kMethods, false};

}  // namespace lookhaven::api
