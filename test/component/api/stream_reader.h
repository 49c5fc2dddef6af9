// SPDX-License-Identifier: Apache-2.0
//
// Reads an answer that does not end by itself.
#pragma once

#include <array>
#include <cerrno>
#include <string>
#include <utility>

#include <sys/socket.h>
#include <sys/time.h>

#include "standalone/base/file_descriptor.h"

namespace lookhaven::api {

class StreamReader {
  public:
    explicit StreamReader(base::FileDescriptor connection) : connection_(std::move(connection)) {}

    // Takes what has come, or comes within 20 ms.
    void Read() {
        std::array<char, 65536> block{};
        const timeval limit{0, 20'000};
        setsockopt(connection_.Get(), SOL_SOCKET, SO_RCVTIMEO, &limit, sizeof limit);
        const ssize_t got = recv(connection_.Get(), block.data(), block.size(), 0);
        if (got > 0) {
            text.append(block.data(), static_cast<std::size_t>(got));
        } else {
            has_ended_ = got == 0 || (errno != EAGAIN && errno != EINTR);
        }
    }
    bool HasEnded() const { return has_ended_; }
    void Close() { connection_.Reset(); }

    std::string text;  // all that has come; the reader may empty it

  private:
    base::FileDescriptor connection_;
    bool has_ended_ = false;
};

}  // namespace lookhaven::api
