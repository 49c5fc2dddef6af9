// SPDX-License-Identifier: Apache-2.0
//
// Fetches live views from another host's web server, and from that server alone: only its own certificate is accepted.
//
// Why so        The library behind this maps dozens of others, and each mapping makes every fork of the host more
//               expensive. So it is loaded by the request process that needs it.
#pragma once

#include <cstdint>
#include <span>
#include <stdexcept>
#include <string>
#include <string_view>

namespace lookhaven::remote {

struct Host {
    std::string address;  // a name or a number
    int port = 0;
    std::string certificate;  // PEM, what its web server must show
};

struct LiveRequest {
    std::string query;   // without '?'
    std::string cookie;  // "name=value"
    std::string form;    // what must not stand in an address, escaped as a form
};

// No live view came from the other host.
struct NoLiveView : std::runtime_error {
    using std::runtime_error::runtime_error;
};

// Takes the live view as it comes. What returns false ends it.
class LiveSink {
  public:
    virtual ~LiveSink() = default;

    // Before the first byte: a type of pictures or of multipart pictures, printable ASCII. size: of the whole, -1 when it
    // is not known.
    virtual bool Begin(std::string_view content_type, std::int64_t size) = 0;
    virtual bool Write(std::span<const char> bytes) = 0;
    // Asked at least once a second, also while nothing comes.
    virtual bool GoesOn() = 0;
};

// Returns when the live view has ended or the sink has ended it. Throws NoLiveView when none began: the host does not
// answer, shows another certificate, refuses, or answers with what is no live view; and std::runtime_error when the
// library cannot be loaded. Blocks for a minute at most without a byte from the host.
void FetchLiveView(const Host& host, const LiveRequest& request, LiveSink& sink);

}  // namespace lookhaven::remote
