// SPDX-License-Identifier: Apache-2.0
//
// Tells whether what was sent to a viewer is still on its way.
//
// Why so        Socket buffers and the web server hold hundreds of kilobytes. On a line of 50 kB/s a picture that waits
//               behind them arrives ten seconds old. So a live stream lets a slow connection drain, and only then takes
//               its next picture, the newest. The kernel knows how long the queues are: that to the web server, and
//               that of the web server's TCP connection to the viewer, of which anybody may ask (sock_diag). While the
//               latter has room, the web server holds nothing back.
// Thread safety One thread.
#pragma once

#include <cstdint>
#include <functional>
#include <optional>
#include <string>

#include "platform/export.h"
#include "standalone/base/clock.h"
#include "standalone/base/file_descriptor.h"

namespace lookhaven::binding {

// The web server's connection to its client, as the web server tells it. Addresses in their usual notation.
struct TcpConnection {
    std::string local_address;
    int local_port = 0;
    std::string remote_address;
    int remote_port = 0;
};

class LH_PLATFORM_API SendQueue {
  public:
    // socket: the connection to the web server, borrowed. A TCP connection that does not exist counts as one without a
    // queue.
    SendQueue(int socket, TcpConnection connection, std::function<std::int64_t()> now_us = base::MonotonicMicros);

    // Whether what is sent now arrives soon: little waits, or no more than the viewer has lately taken within 100 ms.
    bool IsDrained();
    // It has not been drained for ten seconds: the slowest viewer gets a picture now and then. Once true, the ten
    // seconds begin anew: ask only where there is a picture to send.
    bool TakeOverduePicture();

  private:
    struct Tcp {
        std::int64_t waiting_bytes = 0;
        std::int64_t taken_bytes = 0;  // by the viewer, since the connection began
        std::int64_t round_trip_us = 0;
    };

    bool IsDrainedNow(std::int64_t now_us);
    std::int64_t WaitingBytes() const;
    std::optional<Tcp> AskTcp();
    void Measure(const Tcp& tcp, std::int64_t now_us);

    int socket_;
    TcpConnection connection_;
    const std::function<std::int64_t()> now_us_;
    base::FileDescriptor netlink_;
    bool has_opened_netlink_ = false;
    std::int64_t measured_us_ = 0;     // when the present interval began …
    std::int64_t measured_bytes_ = 0;  // … and what the viewer had taken by then
    std::int64_t last_bytes_ = 0;      // taken within 100 ms, in the last interval …
    std::int64_t bytes_before_ = 0;    // … and in the one before
    std::int64_t round_trip_us_ = 0;   // the shortest: what is under way on a long line does not wait
    std::optional<std::int64_t> long_since_us_;
    int drained_in_a_row_ = 0;
    std::int64_t asked_us_ = 0;
};

}  // namespace lookhaven::binding
