// SPDX-License-Identifier: Apache-2.0
//
// The checks of an installation: a function for each, in the file of its kind.
//
// Invariants    (1) A check judges as the user who runs it, who must be the one that runs the server.
//               (2) It changes nothing. Where another check tells the cause, it finds nothing. What it throws, a
//               std::exception, is reported as a fault: that it cannot be checked.
//               (3) A remedy that begins with a command's name is that command line, ready to be run; "as root: " may
//               stand before it, and words in capitals are for the owner to fill in. Any other describes what a person
//               must do.
#pragma once

#include <filesystem>
#include <span>
#include <string>
#include <vector>

#include <json/json.h>

#include "standalone/base/installation.h"

namespace lookhaven::doctor {

enum class Severity {
    kFault,
    kNote,  // somebody may want it so
};

// "fault", "note"
const char* NameOf(Severity severity);

struct Finding {
    std::string problem;
    std::string remedy;
    Severity severity = Severity::kFault;
};
using Findings = std::vector<Finding>;

struct Check {
    const char* name;
    Findings (*run)(const base::Installation&);
};
// All of them.
std::span<const Check> Checks();

// What the check finds; what it throws is a fault. Blocks as long as a disk, the store, or another host does.
Findings Examine(const Check& check, const base::Installation& installation);

bool HasFault(const Findings& findings);

// [{"problem", "remedy", "severity"}]
Json::Value ToJson(const Findings& findings);

// folder_checks.cpp
Findings CheckFolder(const base::Installation& installation);
// Whether it finds nothing that keeps this user from writing to the state folder, and to the store where it lies there.
bool IsStateWritable(const base::Installation& installation);

// store_checks.cpp
Findings CheckStore(const base::Installation& installation);

// mount_checks.cpp
Findings CheckMounts(const base::Installation& installation);
Findings CheckMaintenance(const base::Installation& installation);

// camera_checks.cpp
Findings CheckCameras(const base::Installation& installation);
Findings CheckRecordings(const base::Installation& installation);
Findings CheckSegments(const base::Installation& installation);

// process_checks.cpp
Findings CheckHost(const base::Installation& installation);
Findings CheckRecorder(const base::Installation& installation);
Findings CheckActiveRecorder(const base::Installation& installation);

// web_checks.cpp
Findings CheckWebServer(const base::Installation& installation);
Findings CheckCertificate(const base::Installation& installation);
Findings CheckPairedHosts(const base::Installation& installation);

// host_checks.cpp
Findings CheckHosts(const base::Installation& installation);

// What starts the server again, as a remedy; log: where to look where that does not help.
std::string HowToStart(const base::Installation& installation, const std::filesystem::path& log);

// The name of the user who runs this program, for a remedy.
std::string OwnName();

// The path as a shell takes it.
std::string Quoted(const std::string& path);

// What keeps this user from writing to a folder of that title: another owner, missing rights, a file system that is
// read-only. Empty when nothing does.
Findings CheckAccess(const std::string& title, const std::string& path);

}  // namespace lookhaven::doctor
