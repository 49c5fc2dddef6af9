// SPDX-License-Identifier: Apache-2.0
//
// The web API host and the recorder: whether they run and do their work.
#include <cstring>

#include <poll.h>
#include <sys/socket.h>
#include <sys/un.h>

#include "standalone/base/file_descriptor.h"
#include "standalone/cli/doctor/checks.h"
#include "standalone/control/common_config.h"
#include "standalone/store/recorder_lease.h"

namespace lookhaven::cli::doctor {

namespace {

constexpr int kSocketTimeoutMs = 3000;

// Any answer shows that the host accepts connections, forks and responds.
bool HostAnswers(const std::string& path) {
    sockaddr_un address{};
    address.sun_family = AF_UNIX;
    const base::FileDescriptor socket(::socket(AF_UNIX, SOCK_STREAM | SOCK_CLOEXEC, 0));
    if (!socket || path.size() >= sizeof address.sun_path) {
        return false;
    }
    std::memcpy(address.sun_path, path.data(), path.size());
    if (::connect(socket.Get(), reinterpret_cast<const sockaddr*>(&address), sizeof address) != 0) {
        return false;
    }
    std::string head;
    for (const char* part : {"CONTENT_LENGTH", "0", "SCGI", "1", "REQUEST_METHOD", "GET", "REQUEST_URI", "/webapi",
                             "QUERY_STRING", "api=VEXO.Auth&version=1&method=Status"}) {
        head.append(part).push_back('\0');
    }
    const std::string request = std::to_string(head.size()) + ":" + head + ",";
    if (::send(socket.Get(), request.data(), request.size(), MSG_NOSIGNAL) != static_cast<ssize_t>(request.size())) {
        return false;
    }
    pollfd wait{socket.Get(), POLLIN, 0};
    char byte = 0;
    return ::poll(&wait, 1, kSocketTimeoutMs) == 1 && ::recv(socket.Get(), &byte, 1, 0) == 1;
}

}  // namespace

// An installation of the packages is run by services.
std::string HowToStart(const base::Installation& installation, const std::filesystem::path& log) {
    return installation.Home() == "/var/lib/lookhaven" ? "as root: systemctl restart lookhaven.target"
                                                       : "start the server with script/server, or read " + log.string();
}

Findings CheckHost(const base::Installation& installation) {
    const std::string socket = installation.WebApiSocket().string();
    if (HostAnswers(socket)) {
        return {};
    }
    return {{"the web API host does not answer at " + socket, HowToStart(installation, installation.LogFolder())}};
}

Findings CheckRecorder(const base::Installation& installation) {
    const control::RecorderState state = control::FindRecorder(installation);
    if (state == control::RecorderState::kAlive) {
        return {};
    }
    if (state == control::RecorderState::kHangs) {
        return {
            {"the recorder hangs: nothing is recorded or shown live, and what it last told of the cameras is stale",
             "let it go on if somebody stopped it (pkill -CONT -f lookhaven-recorder), or else restart the server"}};
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
        const std::string holder = store::RecorderLease(store).Current().holder;
        if (!holder.empty() && holder != store::RecorderName(installation)) {
            return {{"the cameras of this store are recorded by the recorder of " + holder,
                     "stop one of the two recorders, or give each a store of its own"}};
        }
    } catch (const std::exception&) {
        return {};  // CheckStore reports it
    }
    return {};
}

}  // namespace lookhaven::cli::doctor
