// SPDX-License-Identifier: Apache-2.0
//
// Asks another host's web API, and that host alone: only its own certificate is accepted.
//
// Why so        The library behind this maps dozens of others, and each mapping makes every fork of the host more
//               expensive. So it is loaded by the process that needs it, when it does.
#pragma once

#include <chrono>
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

    bool operator==(const Host&) const = default;
};

struct Request {
    std::string query;      // without '?'
    std::string cookie;     // "name=value; name=value"
    std::string form = {};  // escaped; what must not stand in an address. Empty: a GET
};

// The host does not answer, shows another certificate, refuses, or answers with something else than what was asked for.
struct NoAnswer : std::runtime_error {
    explicit NoAnswer(const std::string& why, long status_of_answer = 0)
        : std::runtime_error(why),
          status(status_of_answer) {}
    const long status;  // of HTTP; 0 where no answer came
};

// Who answers shows another certificate, or one that has expired; the request was not sent.
struct WrongCertificate : NoAnswer {
    using NoAnswer::NoAnswer;
};

// Takes an answer as it comes. What returns false ends it.
class Sink {
  public:
    virtual ~Sink() = default;

    // Before the first byte. content_type: of those that were expected, with its parameters; printable ASCII. size: of
    // the whole, -1 when it is not known.
    virtual bool Begin(std::string_view content_type, std::int64_t size) = 0;
    virtual bool Write(std::span<const char> bytes) = 0;
    // Asked at least once a second, also while nothing comes.
    virtual bool WantsMore() = 0;
};

// Returns when the live view has ended or the sink has ended it. Throws NoAnswer when none began; InvalidCertificate;
// and std::runtime_error when the library cannot be loaded. Blocks for a minute at most without a byte from the host.
void FetchLiveView(const Host& host, const Request& request, Sink& sink);

// The JSON text that the host answers with, 1 MiB at most, within ten seconds. Throws as above, NoAnswer also for an
// answer that is cut off.
std::string FetchJson(const Host& host, const Request& request);

// The certificates that the web server there shows, its own first, in PEM. Nobody has said whether they are the right
// ones: that is for the caller to judge, and nothing but the handshake of TLS goes there. Throws NoAnswer where there
// is no such server; std::runtime_error when the library cannot be loaded.
std::string FetchCertificates(const std::string& address, int port);

}  // namespace lookhaven::remote
