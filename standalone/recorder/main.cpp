// SPDX-License-Identifier: Apache-2.0
//
// lookhaven-recorder: receives the cameras' streams, records them and passes them to viewers.
#include <chrono>
#include <csignal>
#include <exception>
#include <string>

#include <sysexits.h>
#include <unistd.h>

#include <CLI/CLI.hpp>

#include "standalone/base/installation.h"
#include "standalone/base/log.h"
#include "standalone/base/process.h"
#include "standalone/base/service_manager.h"
#include "standalone/base/state_folder.h"
#include "standalone/pattern/pattern_source.h"
#include "standalone/recorder/instance_lock.h"
#include "standalone/recorder/stream_supervisor.h"
#include "standalone/ring/inventory.h"

namespace {

using namespace lookhaven;

// A signal that comes just before the supervisor's wait costs the whole second of it; both must fit into two seconds.
constexpr std::chrono::milliseconds kFinishLimit{800};

volatile std::sig_atomic_t g_stop = 0;

void StopOnSignals() {
    struct sigaction action {};
    action.sa_handler = [](int) { g_stop = 1; };
    sigaction(SIGTERM, &action, nullptr);
    sigaction(SIGINT, &action, nullptr);
    std::signal(SIGPIPE, SIG_IGN);  // a camera's connection may break while it is written to
}

void RunUntilStopped(const base::Installation& installation, std::chrono::milliseconds no_data_limit,
                     std::chrono::milliseconds host_offline_limit) {
    const recorder::InstanceLock lock(installation);
    StopOnSignals();
    base::RaiseDescriptorLimit();  // each camera costs several
    recorder::StreamSupervisor supervisor(installation, pattern::AllSourceKinds(), no_data_limit, host_offline_limit);
    base::LogInfo("started for " + installation.Home().string());
    base::NotifyReady();
    while (g_stop == 0) {
        supervisor.Step();
        base::NotifyAlive();
    }
    base::NotifyStopping();
    const bool has_finished = supervisor.Finish(kFinishLimit);
    ring::RetireAll(installation);  // also of earlier recorders, that were killed
    if (!has_finished) {
        base::LogWarning("stopped while the store or a disk was still blocked");
        ::_exit(EX_OK);
    }
    base::LogInfo("stopped");
}

std::chrono::milliseconds Milliseconds(double seconds) {
    return std::chrono::milliseconds(static_cast<std::int64_t>(seconds * 1000));
}

}  // namespace

int main(int argc, char** argv) {
    base::SetLogProgram("recorder");
    CLI::App app("Receives the cameras' streams, records them and passes them to viewers.", "lookhaven-recorder");
    std::string home;
    double no_data_limit_s = 10;
    double host_offline_limit_s = std::chrono::duration<double>(recorder::kHostOfflineLimit).count();
    app.add_option("--home", home, "State folder (default: " + base::DefaultHome().string() + ")");
    app.add_option("--no-data-limit", no_data_limit_s,
                   "Seconds without a picture after which the recorder reconnects to a camera")
        ->check(CLI::Range(0.1, 600.0))
        ->capture_default_str();
    // The same on all hosts of a store. For tests, which have no half a minute.
    app.add_option("--host-offline-limit", host_offline_limit_s)->check(CLI::Range(1.0, 600.0))->group("");
    try {
        app.parse(argc, argv);
    } catch (const CLI::ParseError& error) {
        return app.exit(error) == 0 ? EX_OK : EX_USAGE;
    }
    try {
        const base::Installation installation =
            home.empty() ? base::Installation::FromEnvironment() : base::Installation(home);
        RunUntilStopped(installation, Milliseconds(no_data_limit_s), Milliseconds(host_offline_limit_s));
        return EX_OK;
    } catch (const std::exception& failure) {
        base::LogError(failure.what());
        return EX_UNAVAILABLE;
    }
}
