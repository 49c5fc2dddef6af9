// SPDX-License-Identifier: Apache-2.0
#include "standalone/http/answer.h"

#include <array>
#include <utility>

#include <json/json.h>

namespace lookhaven::http {

namespace {

const char* Reason(int status) {
    constexpr std::array<std::pair<int, const char*>, 17> kReasons{{{200, "OK"},
                                                                    {302, "Found"},
                                                                    {304, "Not Modified"},
                                                                    {400, "Bad Request"},
                                                                    {401, "Unauthorized"},
                                                                    {403, "Forbidden"},
                                                                    {404, "Not Found"},
                                                                    {405, "Method Not Allowed"},
                                                                    {406, "Not Acceptable"},
                                                                    {408, "Request Timeout"},
                                                                    {409, "Conflict"},
                                                                    {413, "Content Too Large"},
                                                                    {429, "Too Many Requests"},
                                                                    {500, "Internal Server Error"},
                                                                    {502, "Bad Gateway"},
                                                                    {503, "Service Unavailable"},
                                                                    {504, "Gateway Timeout"}}};
    for (const auto& [number, reason] : kReasons) {
        if (number == status) {
            return reason;
        }
    }
    return "Error";
}

}  // namespace

std::string StatusLine(int status) {
    return "Status: " + std::to_string(status) + ' ' + Reason(status) + "\r\n";
}

std::string JsonHead(int status, std::size_t body_bytes, const std::string& extra) {
    return StatusLine(status) + "Content-Type: application/json\r\nCache-Control: no-store\r\nContent-Length: " +
           std::to_string(body_bytes) + "\r\n" + extra + "\r\n";
}

std::string JsonAnswer(int status, const std::string& body, const std::string& extra) {
    return JsonHead(status, body.size(), extra) + body;
}

std::string FailureAnswer(const Failure& failure, const std::string& extra) {
    const int retry_after_s = failure.RetryAfterSeconds();
    return JsonAnswer(failure.Status(),
                      R"({"error":{"code":)" + std::to_string(failure.Status()) + R"(,"data":)" + failure.Data() +
                          R"(,"message":)" + Json::valueToQuotedString(failure.what()) + R"(},"success":false})",
                      (retry_after_s > 0 ? "Retry-After: " + std::to_string(retry_after_s) + "\r\n" : "") + extra);
}

}  // namespace lookhaven::http
