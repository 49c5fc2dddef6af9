// SPDX-License-Identifier: Apache-2.0
#include "standalone/doctor/host_answers.h"

#include <cstring>
#include <string>

#include <poll.h>
#include <sys/socket.h>
#include <sys/un.h>

#include "standalone/base/file_descriptor.h"

namespace lookhaven::doctor {

namespace {

constexpr int kSocketTimeoutMs = 3000;

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

}  // namespace lookhaven::doctor
