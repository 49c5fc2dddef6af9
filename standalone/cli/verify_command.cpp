// SPDX-License-Identifier: Apache-2.0
//
// lookhaven verify: compares the store's events with what lies on the mounts.
#include <iostream>
#include <memory>

#include <unistd.h>

#include "standalone/cli/commands.h"
#include "standalone/maintenance/verify.h"

namespace lookhaven::cli {

namespace {

void ShowProgress(std::size_t done, std::size_t all) {
    std::cerr << '\r' << done << " of " << all << " events" << (done == all ? "\n" : "") << std::flush;
}

void Verify(const Console& console, bool repair) {
    store::Store store = console.OpenStore();
    const bool watched = ::isatty(STDERR_FILENO) != 0 && !console.json;
    const maintenance::VerifyReport report =
        maintenance::Verify(store, repair, watched ? ShowProgress : std::function<void(std::size_t, std::size_t)>());
    Json::Value data;
    data["events"] = Json::Int64(report.events);
    data["frames"] = Json::Int64(report.frames);
    data["faults"] = Json::arrayValue;
    std::string text;
    std::size_t left = 0;
    for (const maintenance::Fault& fault : report.faults) {
        Json::Value entry;
        entry["problem"] = fault.problem;
        entry["done"] = fault.done;
        data["faults"].append(entry);
        text += fault.problem + "\n" + (fault.done.empty() ? "" : "  done: " + fault.done + "\n");
        left += fault.done.empty() ? 1 : 0;
    }
    console.Answer(text + std::to_string(report.events) + " events with " + std::to_string(report.frames) +
                       " frames were looked at.",
                   data);
    if (left > 0) {
        throw Failure(kFindings, (left == 1 ? "there is one fault" : "there are " + std::to_string(left) + " faults") +
                                     (repair ? std::string(" that could not be repaired")
                                             : std::string(": lookhaven verify --repair mends what can be")));
    }
}

}  // namespace

void AddVerify(CLI::App& program, Console& console) {
    CLI::App* verify = program.add_subcommand("verify", "Checks that recordings and store agree");
    auto repair = std::make_shared<bool>(false);
    verify->add_flag("--repair", *repair, "Also mend what can be; no unknown file is touched");
    verify->callback([&console, repair] { Verify(console, *repair); });
}

}  // namespace lookhaven::cli
