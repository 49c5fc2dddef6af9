// SPDX-License-Identifier: Apache-2.0
//
// A host with its streams and an owner who is logged in.
#pragma once

#include <array>
#include <cerrno>
#include <string>

#include <gtest/gtest.h>
#include <sys/socket.h>
#include <sys/time.h>

#include "standalone/base/file_descriptor.h"
#include "test/support/host/host_under_test.h"

namespace lookhaven::host {

inline bool HasPicture(const base::FileDescriptor& connection) {
    std::array<char, 4096> block{};
    const timeval limit{5, 0};
    setsockopt(connection.Get(), SOL_SOCKET, SO_RCVTIMEO, &limit, sizeof limit);
    std::string received;
    while (received.find("picture") == received.npos) {
        const ssize_t got = recv(connection.Get(), block.data(), block.size(), 0);
        if (got <= 0) {
            return false;
        }
        received.append(block.data(), static_cast<std::size_t>(got));
    }
    return true;
}

// The other end has closed: everything is read and nothing follows.
inline bool IsOver(const base::FileDescriptor& connection) {
    std::array<char, 65536> block{};
    for (;;) {
        const ssize_t got = recv(connection.Get(), block.data(), block.size(), MSG_DONTWAIT);
        if (got <= 0) {
            return got == 0 || errno == ECONNRESET;
        }
    }
}

inline base::FileDescriptor OpenStream(const HostUnderTest& host, const std::string& cookie) {
    base::FileDescriptor stream = host.Open("Stream", cookie);
    EXPECT_TRUE(HasPicture(stream));
    return stream;
}

class RunningHost : public testing::Test {
  protected:
    const HostUnderTest host_;
    const std::string admin_ = host_.LogIn().secret;
};

}  // namespace lookhaven::host
