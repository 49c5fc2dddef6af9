// SPDX-License-Identifier: Apache-2.0
#include "standalone/doctor/checks.h"

#include <algorithm>
#include <exception>

#include "standalone/base/concat.h"

namespace lookhaven::doctor {

std::span<const Check> Checks() {
    static constexpr Check kChecks[] = {{"folder", CheckFolder},
                                        {"store", CheckStore},
                                        {"cameras", CheckCameras},
                                        {"mounts", CheckMounts},
                                        {"web API", CheckHost},
                                        {"web server", CheckWebServer},
                                        {"certificate", CheckCertificate},
                                        {"recorder", CheckRecorder},
                                        {"active recorder", CheckActiveRecorder},
                                        {"recordings", CheckRecordings},
                                        {"maintenance", CheckMaintenance},
                                        {"shared memory", CheckSegments},
                                        {"hosts", CheckHosts},
                                        {"paired hosts", CheckPairedHosts}};
    return kChecks;
}

Findings Examine(const Check& check, const base::Installation& installation) {
    try {
        return check.run(installation);
    } catch (const std::exception& error) {
        return {{base::Concat(check.name, " cannot be checked: ", error.what()), "correct that and check again"}};
    }
}

bool HasFault(const Findings& findings) {
    return std::ranges::count(findings, Severity::kFault, &Finding::severity) > 0;
}

Json::Value ToJson(const Findings& findings) {
    Json::Value list = Json::arrayValue;
    for (const Finding& finding : findings) {
        Json::Value& json = list.append(Json::objectValue);
        json["problem"] = finding.problem;
        json["remedy"] = finding.remedy;
        json["severity"] = NameOf(finding.severity);
    }
    return list;
}

const char* NameOf(Severity severity) {
    return severity == Severity::kNote ? "note" : "fault";
}

}  // namespace lookhaven::doctor
