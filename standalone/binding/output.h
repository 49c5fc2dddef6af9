// SPDX-License-Identifier: Apache-2.0
//
// Sends a request's bytes to its client: everything that standard output or a multipart answer writes.
//
// Why so        A player ignores the results of its writes. So the output itself ends the player when its client is
//               gone or has stalled, and never sends anything behind a part that could not be sent whole.
// Invariants    (1) Once broken it stays broken: later writes send nothing and ferror(stdout) stays set.
//               (2) No call blocks for longer than the limits allow.
// Thread safety One thread.
#pragma once

#include <chrono>
#include <cstdint>
#include <cstdio>
#include <functional>
#include <span>
#include <string>

#include <sys/uio.h>

#include "platform/export.h"

namespace lookhaven::binding {

struct OutputLimits {
    std::chrono::milliseconds stalled{30'000};     // without the client taking a byte
    std::chrono::milliseconds interrupted{1'000};  // to finish what a signal interrupted, once the process is to leave
};

class LH_PLATFORM_API Output {
  public:
    // Replaces stdout by a stream onto the socket until destruction. The socket is borrowed. is_to_leave tells
    // whether the process has been asked to end, so that a write interrupted by a signal gets the shorter limit; the
    // signal that pauses a player is no such request.
    explicit Output(
        int socket, OutputLimits limits = {}, std::function<bool()> is_to_leave = [] { return true; });
    ~Output();
    Output(const Output&) = delete;
    Output& operator=(const Output&) = delete;

    // Flushes stdout, then sends the pieces in order and whole; the array is used up. False when the output is broken;
    // the call that breaks it raises SIGTERM in this process.
    bool Send(std::span<iovec> pieces);

    // Bytes that the socket has accepted; flush stdout before asking.
    std::uint64_t BytesSent() const { return bytes_sent_; }
    bool IsBroken() const { return broken_; }
    // Separates the parts of this process's multipart answer.
    const std::string& Boundary() const { return boundary_; }

  private:
    static ssize_t WriteCookie(void* self, const char* data, std::size_t size);
    bool SendAll(std::span<iovec> pieces);
    bool WaitUntilWritable(std::chrono::steady_clock::time_point progress);
    void Break();

    int socket_;
    OutputLimits limits_;
    std::function<bool()> is_to_leave_;
    std::FILE* stream_;
    std::FILE* replaced_;
    std::string boundary_;
    std::uint64_t bytes_sent_ = 0;
    bool broken_ = false;
    std::chrono::steady_clock::time_point interrupted_until_;
};

}  // namespace lookhaven::binding
