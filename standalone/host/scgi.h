// SPDX-License-Identifier: Apache-2.0
//
// Parses one SCGI request as its bytes arrive.
//
// Format        <decimal length>:<name> NUL <value> NUL … ,<body>. The first name is CONTENT_LENGTH, and SCGI is "1".
//               A large body is not waited for: the request's process checks the sender's rights before it reads it.
// Invariants    (1) Never keeps more than the head, a small body and one chunk, whatever a client sends.
//               (2) Complete and malformed are final.
#pragma once

#include <cstddef>
#include <string>
#include <string_view>

#include "standalone/http/request.h"

namespace lookhaven::host {

class ScgiParser {
  public:
    enum class State { kIncomplete, kComplete, kMalformed };

    ScgiParser() = default;
    ScgiParser(ScgiParser&&) = default;
    ScgiParser& operator=(ScgiParser&&) = default;
    // Overwrites what it has kept.
    ~ScgiParser();

    static constexpr std::size_t kMaxHeadBytes = 8 * 1024;
    static constexpr std::size_t kMaxBodyBytes = 20 * 1024 * 1024;  // a picture's; the request's process allows less
    static constexpr std::size_t kMaxAwaitedBodyBytes = http::kMaxBodyWithoutSession;

    // A request is complete once its body is, or its head where the body is large: the rest stays unread. Bytes behind
    // an awaited body make a request malformed.
    State Feed(std::string_view bytes);
    // What is wrong, for the client; empty unless malformed.
    std::string_view Problem() const { return problem_; }
    // The request, once complete; moved out.
    http::Request TakeRequest() { return std::move(request_); }

  private:
    enum class Place { kLength, kHead, kBody };

    std::size_t TakeLength(char byte);
    std::size_t TakeHead(std::string_view bytes);
    std::size_t TakeBody(std::string_view bytes);
    void ParseHead();
    void ParseContentLength();
    void Fail(std::string_view problem);

    State state_ = State::kIncomplete;
    Place place_ = Place::kLength;
    std::size_t head_bytes_ = 0;
    std::size_t body_bytes_ = 0;
    std::string head_;
    http::Request request_;
    std::string_view problem_;
};

// The request as a parser takes it, without the part of its body that is unread. Holds its secrets: overwrite it.
std::string ToScgi(const http::Request& request);

}  // namespace lookhaven::host
