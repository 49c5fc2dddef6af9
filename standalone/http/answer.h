// SPDX-License-Identifier: Apache-2.0
//
// JSON answers with their header lines, and the failures that the host itself reports.
#pragma once

#include <stdexcept>
#include <string>
#include <utility>

namespace lookhaven::http {

// For a failure whose cause is gone at any moment.
constexpr int kRetrySoonSeconds = 1;

// A failure that the client is told: HTTP status, which is the answer's code too, and a message without secrets.
class Failure : public std::runtime_error {
  public:
    // retry_after_s: when the client may succeed; 0 where waiting does not help. data: JSON that the client is told.
    Failure(int status, const std::string& message, int retry_after_s = 0, std::string data = "null")
        : std::runtime_error(message),
          status_(status),
          retry_after_s_(retry_after_s),
          data_(std::move(data)) {}
    int Status() const { return status_; }
    int RetryAfterSeconds() const { return retry_after_s_; }
    const std::string& Data() const { return data_; }

  private:
    int status_;
    int retry_after_s_;
    std::string data_;
};

// "Status: 404 Not Found" and the end of the line.
std::string StatusLine(int status);

// The head of an answer with a body of JSON. extra: further header lines, each ending in CR LF.
std::string JsonHead(int status, std::size_t body_bytes, const std::string& extra = "");

// The whole answer. extra: further header lines, each ending in CR LF.
std::string JsonAnswer(int status, const std::string& body, const std::string& extra = "");

// {"success": false, "error": {"code": status, "data": data, "message": …}}; extra as above.
std::string FailureAnswer(const Failure& failure, const std::string& extra = "");

}  // namespace lookhaven::http
