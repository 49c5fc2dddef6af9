// SPDX-License-Identifier: Apache-2.0
#include "standalone/cli/running.h"

#include <chrono>
#include <cstring>
#include <string>
#include <thread>

#include <poll.h>
#include <sys/socket.h>
#include <sys/un.h>

#include "standalone/base/file_descriptor.h"
#include "standalone/cli/console.h"
#include "standalone/control/common_config.h"
#include "standalone/store/recorder_lease.h"

namespace lookhaven::cli {

namespace {

constexpr int kSocketTimeoutMs = 3000;
// A recorder renews its lease every five seconds, later where its store is slow.
constexpr std::chrono::milliseconds kLeaseWait{12'000};
constexpr std::chrono::milliseconds kLeaseLook{500};

}  // namespace

bool HostAnswers(const base::Installation& installation) {
    const std::string path = installation.WebApiSocket().string();
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

void RequireStopped(const base::Installation& installation) {
    if (control::FindRecorder(installation) != control::RecorderState::kNone || HostAnswers(installation)) {
        throw Failure(kUnavailable, "Lookhaven is running for ", installation.Home().string(),
                      ": stop it first (installed services: as root, systemctl stop lookhaven.target)");
    }
}

void RequireNoOtherRecorder(const base::Installation& installation, store::Store& store) {
    store::RecorderLease lease(store);
    const store::LeaseState before = lease.Current();
    if (before.holder.empty() || before.holder == store::RecorderName(installation)) {
        return;
    }
    for (auto waited = kLeaseLook; waited <= kLeaseWait; waited += kLeaseLook) {
        std::this_thread::sleep_for(kLeaseLook);
        if (lease.Current().count != before.count) {
            throw Failure(kUnavailable, "the recorder of ", before.holder, " records into this store: stop it first");
        }
    }
}

}  // namespace lookhaven::cli
