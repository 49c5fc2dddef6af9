// SPDX-License-Identifier: Apache-2.0
//
// One HTTP request as the web server hands it on.
#pragma once

#include <cstddef>
#include <map>
#include <string>
#include <string_view>

namespace lookhaven::http {

// A longer body is read by the request's own process, and only of a caller with a session.
constexpr std::size_t kMaxBodyWithoutSession = 4 * 1024;

struct Request {
    // By their CGI names: REQUEST_METHOD, QUERY_STRING, HTTP_COOKIE …
    std::map<std::string, std::string, std::less<>> headers;
    std::string body;
    std::size_t unread_body_bytes = 0;  // of the body, still on the connection; see body.h

    // Overwrites it all: it may hold a password or a session's secret, and processes are forked that others may take
    // over.
    void Wipe();
    // The header's value, borrowed from the request; empty when it is missing.
    std::string_view Header(std::string_view name) const;
};

// Overwrites the text's memory and empties it.
void Wipe(std::string& text);

}  // namespace lookhaven::http
