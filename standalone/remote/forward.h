// SPDX-License-Identifier: Apache-2.0
//
// Forwards a request to another host of the same store, and takes its answer as it arrives.
//
// Invariants    (1) Of the answer's headers only those that say what its body is, for how long it may be kept, and when
//                   to ask again are taken over; each is printable ASCII of bounded length. None may set a cookie, or
//                   steer the web server or the browser.
#pragma once

#include <chrono>
#include <cstdint>
#include <memory>
#include <span>
#include <string>
#include <utility>
#include <vector>

#include "standalone/remote/fetch.h"

namespace lookhaven::remote {

struct ForwardedRequest {
    std::string query;                       // without '?'
    std::vector<std::string> headers;        // "Name: value" each
    std::string json;                        // the body
    std::chrono::seconds max_head_wait{28};  // less than this host gives a request process for its answer
    std::chrono::seconds max_silent{};       // without a byte from that host; 0: for as long as the connection stands
    int receive_bytes = 0;                   // of the connection's buffer; 0: the system's default
};

// The header of a failure that the host answers itself: without it one may be that of its web server.
constexpr const char* kHostAnswers = "X-Lookhaven-Host-Answers";

struct AnswerHead {
    int status = 0;
    std::string content_type;  // empty: none
    std::vector<std::pair<std::string, std::string>> headers;
    std::string location;          // the path of a redirect on that host; empty: none
    std::int64_t size_bytes = -1;  // of the body; -1: not known
    bool is_from_host = false;     // it has kHostAnswers
};

// Takes an answer as it arrives. A function that returns false ends it.
class AnswerSink {
  public:
    virtual ~AnswerSink() = default;

    // Once, also for an answer without a body.
    virtual bool Begin(const AnswerHead& head) = 0;
    virtual bool Write(std::span<const char> bytes) = 0;
    // Asked at least once a second, also while nothing arrives.
    virtual bool WantsMore() = 0;
};

// A request on its way, and its answer: what comes is given to the sink in the thread that asks for it.
class Forwarding {
  public:
    virtual ~Forwarding() = default;

    // Gives the sink what has come; where that is nothing, waits for something, at most so long, which the next step
    // gives. False when the answer has ended, or the sink has ended it: then only ask IsComplete. Throws as Forward.
    virtual bool Step(std::chrono::milliseconds limit) = 0;
    virtual bool IsComplete() const = 0;
};

// Steps until the answer has ended, or the sink has ended it: whether it is complete. Throws as Forward.
inline bool Finish(Forwarding& forwarding) {
    while (forwarding.Step(std::chrono::seconds(1))) {
    }
    return forwarding.IsComplete();
}

// Nothing is sent before the first Step; call it at least once a second. Borrows the sink. Throws
// InvalidCertificate; and std::runtime_error when the library cannot be loaded.
std::unique_ptr<Forwarding> BeginForward(const Host& host, const ForwardedRequest& request, AnswerSink& sink);

// Returns when the answer has ended, or the sink has ended it: whether it is complete. Throws NoAnswer when none
// began, after three seconds where there is no such host and after max_head_wait where it says nothing;
// WrongCertificate; InvalidCertificate; and std::runtime_error when the library cannot be loaded.
bool Forward(const Host& host, const ForwardedRequest& request, AnswerSink& sink);

}  // namespace lookhaven::remote

// What the shared library gives to forward_loader.cpp, which alone calls it.
extern "C" __attribute__((visibility("default"))) lookhaven::remote::Forwarding*
LookhavenBeginForward(const lookhaven::remote::Host& host, const lookhaven::remote::ForwardedRequest& request,
                      lookhaven::remote::AnswerSink& sink);
