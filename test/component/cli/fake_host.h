// SPDX-License-Identifier: Apache-2.0
//
// Stands for the web API host and the web server.
#pragma once

#include <cstring>
#include <filesystem>
#include <string>
#include <thread>
#include <utility>

#include <gtest/gtest.h>
#include <netinet/in.h>
#include <sys/socket.h>
#include <sys/un.h>
#include <unistd.h>

#include "standalone/base/file_descriptor.h"

namespace lookhaven::cli {

inline base::FileDescriptor ListenAt(const std::filesystem::path& path) {
    base::FileDescriptor listener(::socket(AF_UNIX, SOCK_STREAM | SOCK_CLOEXEC, 0));
    sockaddr_un address{};
    address.sun_family = AF_UNIX;
    std::strncpy(address.sun_path, path.c_str(), sizeof address.sun_path - 1);
    ::unlink(path.c_str());
    EXPECT_EQ(::bind(listener.Get(), reinterpret_cast<const sockaddr*>(&address), sizeof address), 0);
    std::filesystem::permissions(path, std::filesystem::perms(0666));
    return listener;
}

// Bound, but refuses connections until it listens.
inline base::FileDescriptor BindPort(int& port) {
    base::FileDescriptor listener(::socket(AF_INET, SOCK_STREAM | SOCK_CLOEXEC, 0));
    sockaddr_in address{};
    address.sin_family = AF_INET;
    address.sin_addr.s_addr = ::htonl(INADDR_LOOPBACK);
    socklen_t size = sizeof address;
    EXPECT_EQ(::bind(listener.Get(), reinterpret_cast<const sockaddr*>(&address), size), 0);
    ::getsockname(listener.Get(), reinterpret_cast<sockaddr*>(&address), &size);
    port = ::ntohs(address.sin_port);
    return listener;
}

// Gives that answer to every request.
class FakeHost {
  public:
    FakeHost(base::FileDescriptor listener, const char* answer) : listener_(std::move(listener)) {
        ::listen(listener_.Get(), 8);
        thread_ = std::thread([this, answer] {
            for (;;) {
                const base::FileDescriptor connection(::accept(listener_.Get(), nullptr, nullptr));
                if (!connection) {
                    return;
                }
                std::string request(512, '\0');
                ::recv(connection.Get(), request.data(), request.size(), 0);
                ::send(connection.Get(), answer, std::strlen(answer), MSG_NOSIGNAL);
            }
        });
    }
    ~FakeHost() {
        ::shutdown(listener_.Get(), SHUT_RDWR);
        thread_.join();
    }

  private:
    base::FileDescriptor listener_;
    std::thread thread_;
};

}  // namespace lookhaven::cli
