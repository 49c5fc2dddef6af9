// SPDX-License-Identifier: Apache-2.0
//
// lookhaven verify: compares the store's events with the files on the mounts.
#include <iostream>

#include <unistd.h>

#include "standalone/cli/command_group.h"
#include "standalone/cli/commands.h"
#include "standalone/maintenance/verify.h"

namespace lookhaven::cli {

namespace {

void ShowProgress(std::size_t done, std::size_t all) {
    std::cerr << '\r' << done << " of " << all << " events" << (done == all ? "\n" : "") << std::flush;
}

struct Request {
    bool repair = false;
};

void Verify(const Console& console, const Request& request) {
    store::Store store = console.OpenStore();
    const bool watched = ::isatty(STDERR_FILENO) != 0 && !console.json;
    const maintenance::VerifyReport report = maintenance::Verify(
        store, request.repair, watched ? ShowProgress : std::function<void(std::size_t, std::size_t)>());
    Json::Value faults = Json::arrayValue;
    std::string text;
    std::size_t left = 0;
    for (const maintenance::Fault& fault : report.faults) {
        faults.append(Object("problem", fault.problem, "done", fault.done));
        text += fault.problem + "\n" + (fault.done.empty() ? "" : "  done: " + fault.done + "\n");
        left += fault.done.empty() ? 1 : 0;
    }
    console.Answer(Object("events", report.events, "frames", report.frames, "faults", faults), text, report.events,
                   " events with ", report.frames, " frames were checked.");
    if (left > 0) {
        throw Failure(kFindings, left == 1 ? "there is one fault" : Concat("there are ", left, " faults"),
                      request.repair ? " that could not be repaired" : ": try lookhaven verify --repair");
    }
}

}  // namespace

void AddVerify(CLI::App& program, const Console& console) {
    CommandGroup<Request> group(program, console);
    group.Add("verify", "Checks that recordings and store agree", Verify)
        .Flag("--repair", group.request().repair, "Repair what can be repaired; unknown files are left alone");
}

}  // namespace lookhaven::cli
