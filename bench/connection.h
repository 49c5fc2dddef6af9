// SPDX-License-Identifier: Apache-2.0
//
// How the benchmarks reach a server: SCGI on a unix socket, or HTTP on a port of this machine.
#pragma once

#include <array>
#include <cstdint>
#include <string>
#include <utility>

#include <arpa/inet.h>
#include <netinet/in.h>
#include <sys/socket.h>
#include <sys/un.h>

#include "standalone/base/file.h"
#include "standalone/base/file_descriptor.h"

namespace bench {

struct Target {
    std::string unix_path;  // when empty, the port counts
    int tcp_port = 0;
    std::string query;
    std::string cookie;
};

// Throws std::system_error when nobody listens.
inline lookhaven::base::FileDescriptor Connect(const Target& target) {
    const bool local = !target.unix_path.empty();
    lookhaven::base::FileDescriptor socket(::socket(local ? AF_UNIX : AF_INET, SOCK_STREAM | SOCK_CLOEXEC, 0));
    sockaddr_un path{};
    path.sun_family = AF_UNIX;
    target.unix_path.copy(path.sun_path, sizeof path.sun_path - 1);
    sockaddr_in port{};
    port.sin_family = AF_INET;
    port.sin_port = htons(static_cast<std::uint16_t>(target.tcp_port));
    port.sin_addr.s_addr = htonl(INADDR_LOOPBACK);
    const int result = local ? ::connect(socket.Get(), reinterpret_cast<const sockaddr*>(&path), sizeof path)
                             : ::connect(socket.Get(), reinterpret_cast<const sockaddr*>(&port), sizeof port);
    if (result != 0) {
        lookhaven::base::ThrowErrno("cannot connect");
    }
    return socket;
}

// One GET: an SCGI request, or HTTP/1.0, whose answer has no chunks and ends with the connection.
inline std::string Request(const Target& target) {
    if (target.unix_path.empty()) {
        return "GET /webapi?" + target.query + " HTTP/1.0\r\nHost: localhost\r\nCookie: id=" + target.cookie +
               "\r\n\r\n";
    }
    std::string head;
    const std::array<std::pair<const char*, std::string>, 6> fields{{{"CONTENT_LENGTH", "0"},
                                                                     {"SCGI", "1"},
                                                                     {"REQUEST_METHOD", "GET"},
                                                                     {"QUERY_STRING", target.query},
                                                                     {"REMOTE_ADDR", "127.0.0.1"},
                                                                     {"HTTP_COOKIE", "id=" + target.cookie}}};
    for (const auto& [name, value] : fields) {
        head.append(name).push_back('\0');
        head.append(value).push_back('\0');
    }
    return std::to_string(head.size()) + ":" + head + ",";
}

// Throws std::system_error when the server does not take it.
inline void Send(const lookhaven::base::FileDescriptor& socket, const std::string& request) {
    if (::send(socket.Get(), request.data(), request.size(), MSG_NOSIGNAL) != static_cast<ssize_t>(request.size())) {
        lookhaven::base::ThrowErrno("cannot send the request");
    }
}

// Takes one "--name value" pair of the command line into the target; false when the name is not one of its own.
inline bool TakeOption(Target& target, const std::string& name, const std::string& value) {
    if (name == "--unix") {
        target.unix_path = value;
    } else if (name == "--port") {
        target.tcp_port = std::stoi(value);
    } else if (name == "--query") {
        target.query = value;
    } else if (name == "--cookie") {
        target.cookie = value;
    } else {
        return false;
    }
    return true;
}

}  // namespace bench
