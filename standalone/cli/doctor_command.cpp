// SPDX-License-Identifier: Apache-2.0
//
// lookhaven doctor: looks at every part of a running installation and says what to do.
#include <algorithm>

#include <sys/stat.h>
#include <unistd.h>

#include "standalone/cli/command_group.h"
#include "standalone/cli/commands.h"
#include "standalone/doctor/checks.h"

namespace lookhaven::cli {

namespace {

// What another user may do says nothing of what the server may.
void RequireOwner(const base::Installation& installation) {
    struct stat status {};
    if (::stat(installation.Home().c_str(), &status) == 0 && status.st_uid != ::geteuid()) {
        throw Failure(kNoPermission, "the state folder ", installation.Home().string(),
                      " belongs to another user: run this as the user who runs the server, or as root");
    }
}

void Examine(const Console& console) {
    const base::Installation installation = console.Installation();
    RequireOwner(installation);
    Json::Value data = Json::arrayValue;
    std::string text;
    std::size_t count = 0;
    for (const doctor::Check& check : doctor::Checks()) {
        const doctor::Findings findings = doctor::Examine(check, installation);
        const auto faults = std::ranges::count(findings, doctor::Severity::kFault, &doctor::Finding::severity);
        text += Concat(findings.empty() ? "ok       " : faults == 0 ? "note     " : "problem  ", check.name, "\n");
        for (const doctor::Finding& finding : findings) {
            text += "         " + finding.problem + "\n         do: " + finding.remedy + "\n";
        }
        data.append(Object("check", check.name, "ok", faults == 0, "findings", doctor::ToJson(findings)));
        count += static_cast<std::size_t>(faults);
    }
    console.Answer(data, text);
    if (count > 0) {
        throw Failure(kFindings, count == 1 ? "there is one problem" : Concat("there are ", count, " problems"));
    }
}

}  // namespace

void AddDoctor(CLI::App& program, const Console& console) {
    CommandGroup<>(program, console).Add("doctor", "Checks the installation and says what to do", Examine);
}

}  // namespace lookhaven::cli
