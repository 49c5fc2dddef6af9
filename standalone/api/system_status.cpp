// SPDX-License-Identifier: Apache-2.0
#include "standalone/api/system_status.h"

#include <chrono>
#include <optional>
#include <string>
#include <vector>

#include <unistd.h>

#include "standalone/admin/certificate.h"
#include "standalone/admin/change.h"
#include "standalone/base/json_text.h"
#include "standalone/base/process.h"
#include "standalone/base/version.h"
#include "standalone/control/common_config.h"
#include "standalone/doctor/checks.h"
#include "standalone/doctor/isolated_jobs.h"
#include "standalone/store/store.h"

namespace lookhaven::api {

namespace {

// Longer than another host may take, and less than a request may.
constexpr std::chrono::seconds kLimit{12};

const char* NameOf(control::RecorderState state) {
    return state == control::RecorderState::kAlive   ? "running"
           : state == control::RecorderState::kHangs ? "hanging"
                                                     : "stopped";
}

Json::Value ProcessRecord(const char* name, const char* state, const std::optional<base::ProcessIdentity>& process) {
    const std::int64_t since_s = process ? base::StartedAt(*process) : 0;
    Json::Value json;
    json["name"] = name;
    json["state"] = state;
    json["since"] = since_s > 0 ? Json::Value(Json::Int64{since_s}) : Json::Value();
    json["replaced"] = process && base::IsProgramReplaced(process->pid);
    return json;
}

Json::Value Processes(const base::Installation& installation) {
    const pid_t host = ::getppid();
    Json::Value list = Json::arrayValue;
    list.append(
        ProcessRecord("recorder", NameOf(control::FindRecorder(installation)), control::RecorderProcess(installation)));
    list.append(ProcessRecord("webapi", "running", base::ProcessIdentity{host, base::ProcessStartTicks(host)}));
    return list;
}

std::string ReportOf(const doctor::Check& check, const base::Installation& installation) {
    const doctor::Findings findings = doctor::Examine(check, installation);
    Json::Value json;
    json["ok"] = !doctor::HasFault(findings);
    json["finding"] = doctor::ToJson(findings);
    return base::OneLineJson(json);
}

Json::Value CheckRecord(const char* name, const doctor::JobResult& result) {
    using enum doctor::JobResult::State;
    Json::Value json;
    if (result.state == kDone) {
        json = base::ParseOneLineJson(result.text);
        json["unchecked"] = Json::Value();
    } else {
        json["ok"] = Json::Value();
        json["finding"] = Json::arrayValue;
        json["unchecked"] = std::string("not checked here: it ") +
                            (result.state == kLate ? "takes more than " + std::to_string(kLimit.count()) + " seconds"
                                                   : "ended before it was done") +
                            "; run lookhaven doctor on the server";
    }
    json["name"] = name;
    return json;
}

}  // namespace

Json::Value SystemStatus(const Call& call) {
    const base::Installation& installation = call.context.Installation();
    Json::Value data;
    data["version"] = base::kVersion;
    data["store"]["engine"] = installation.StoreUrl().starts_with("sqlite:") ? "sqlite" : "postgresql";
    data["store"]["schema"] = store::Store::SchemaVersion();
    data["process"] = Processes(installation);
    std::vector<doctor::Job> jobs;
    for (const doctor::Check& check : doctor::Checks()) {
        jobs.emplace_back([&] { return ReportOf(check, installation); });
    }
    // The checks say what is wrong with one that cannot be read.
    jobs.emplace_back([&] { return base::OneLineJson(admin::CurrentCertificate(installation)); });
    call.context.CloseRecords();  // it must not be shared with other processes
    std::vector<doctor::JobResult> results = doctor::RunIsolated(jobs, kLimit);
    data["certificate"] = base::ParseOneLineJson(results.back().text);
    data["check"] = Json::arrayValue;
    for (std::size_t i = 0; i < doctor::Checks().size(); ++i) {
        data["check"].append(CheckRecord(doctor::Checks()[i].name, results[i]));
    }
    return data;
}

}  // namespace lookhaven::api
