// SPDX-License-Identifier: Apache-2.0
#include "standalone/webapi/answer.h"

#include <array>
#include <utility>

namespace lookhaven::webapi {

namespace {

const char* Reason(int status) {
    constexpr std::array<std::pair<int, const char*>, 13> kReasons{{{200, "OK"},
                                                                    {400, "Bad Request"},
                                                                    {401, "Unauthorized"},
                                                                    {403, "Forbidden"},
                                                                    {404, "Not Found"},
                                                                    {405, "Method Not Allowed"},
                                                                    {408, "Request Timeout"},
                                                                    {409, "Conflict"},
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

std::string JsonAnswer(int status, const Json::Value& body, const std::string& extra) {
    Json::StreamWriterBuilder builder;
    builder["indentation"] = "";
    builder["emitUTF8"] = true;
    const std::string text = Json::writeString(builder, body);
    return "Status: " + std::to_string(status) + ' ' + Reason(status) +
           "\r\nContent-Type: application/json\r\nCache-Control: no-store\r\nContent-Length: " +
           std::to_string(text.size()) + "\r\n" + extra + "\r\n" + text;
}

std::string SuccessAnswer(const Json::Value& data, const std::string& extra) {
    Json::Value body;
    body["success"] = true;
    body["data"] = data;
    return JsonAnswer(200, body, extra);
}

std::string FailureAnswer(const Failure& failure) {
    Json::Value body;
    body["success"] = false;
    body["error"]["code"] = failure.Status();
    body["error"]["data"] = Json::nullValue;
    body["error"]["message"] = failure.what();
    return JsonAnswer(failure.Status(), body);
}

}  // namespace lookhaven::webapi
