// SPDX-License-Identifier: Apache-2.0
//
// The web API host and the recorder: whether they run and do their work.
#include <cerrno>

#include <unistd.h>

#include "standalone/control/common_config.h"
#include "standalone/doctor/checks.h"
#include "standalone/doctor/host_answers.h"
#include "standalone/store/recorder_lease.h"

namespace lookhaven::doctor {

namespace {

// Whether this user may look at what the processes leave in their folder; if not, CheckFolder reports it.
bool IsReachable(const base::Installation& installation) {
    return ::access(installation.RunFolder().c_str(), R_OK | W_OK | X_OK) == 0 || errno == ENOENT;
}

}  // namespace

// An installation of the packages is run by services.
std::string HowToStart(const base::Installation& installation, const std::filesystem::path& log) {
    return installation.Home() == "/var/lib/lookhaven" ? "as root: systemctl restart lookhaven.target"
                                                       : "start the server with script/server, or read " + log.string();
}

Findings CheckHost(const base::Installation& installation) {
    if (HostAnswers(installation) || !IsReachable(installation)) {
        return {};
    }
    return {{"the web API host does not answer at " + installation.WebApiSocket().string(),
             HowToStart(installation, installation.LogFolder())}};
}

Findings CheckRecorder(const base::Installation& installation) {
    const control::RecorderState state = control::FindRecorder(installation);
    if (state == control::RecorderState::kAlive || !IsReachable(installation)) {
        return {};
    }
    if (state == control::RecorderState::kHangs) {
        return {{"the recorder hangs: nothing is recorded or shown live, and what it last told of the cameras is stale",
                 "resume it if it was stopped (pkill -CONT -f lookhaven-recorder), or else restart the server"}};
    }
    return {{control::MapCommonConfig(installation) == nullptr ? "the recorder has not run since the machine started"
                                                               : "the recorder does not run",
             HowToStart(installation, installation.LogFolder())}};
}

// Another host's recorder may record the cameras of a store that both share.
Findings CheckActiveRecorder(const base::Installation& installation) {
    control::CommonConfig* config = control::MapCommonConfig(installation);
    if (config == nullptr || !control::IsRecorderAlive(*config)) {
        return {};
    }
    try {
        store::Store store = store::Store::Open(installation.StoreUrl());
        const std::string holder = store::RecorderLease(store, installation.HostId()).Current().holder;
        if (!holder.empty() && holder != store::RecorderName(installation)) {
            return {{"the cameras of this store are recorded by the recorder of " + holder,
                     "stop one of the two recorders, or give each a store of its own"}};
        }
    } catch (const std::exception&) {
        return {};  // CheckStore reports it
    }
    return {};
}

}  // namespace lookhaven::doctor
