// SPDX-License-Identifier: Apache-2.0
#include "standalone/api/attachment.h"

#include <algorithm>
#include <cctype>
#include <cstdio>
#include <system_error>

#include "standalone/base/clock.h"
#include "standalone/base/log.h"
#include "standalone/base/text.h"

namespace lookhaven::api {

namespace {

constexpr std::int64_t kMaxOffsetMinutes = 24 * 60;

// The plain form for every client, and the encoded one, which keeps the camera's name as it is.
std::string Disposition(std::string name) {
    const std::string encoded = base::PercentEncode(name, ".-");
    std::replace_if(
        name.begin(), name.end(),
        [](unsigned char c) { return std::isalnum(c) == 0 && c != '.' && c != '-' && c != ' '; }, '_');
    return "attachment; filename=\"" + name + "\"; filename*=UTF-8''" + encoded;
}

}  // namespace

int UtcOffset(const Call& call) {
    const std::int64_t offset_min = call.NumberOr("utc_offset_min", 0);
    if (offset_min < -kMaxOffsetMinutes || offset_min > kMaxOffsetMinutes) {
        throw Failure(400, "utc_offset_min is out of its bounds");
    }
    return static_cast<int>(offset_min);
}

void LogFootageSent(const Call& call, const std::string& what, const std::string& cameras,
                    const archive::TimeSpan& span) {
    const admin::Actor caller = call.Actor();
    base::LogInfo(Json::valueToQuotedString(caller.name.c_str()) + " from " + caller.address + " is sent " + what +
                  " of " + cameras + ", " + base::FormatUtc(span.begin_ms) + " to " + base::FormatUtc(span.end_ms));
}

void SendUntilClientLeaves(const std::function<void()>& send) {
    try {
        send();
    } catch (const std::system_error& error) {
        if (error.code() != std::errc::broken_pipe && error.code() != std::errc::connection_reset) {
            throw;
        }
    }
}

void SendAttachmentHead(const std::string& content_type, const std::string& name, std::int64_t size_bytes) {
    // With its size, so that a copy that fails midway is seen to be cut.
    const std::string head = "Status: 200 OK\r\nContent-Type: " + content_type +
                             "\r\nCache-Control: no-store\r\nContent-Disposition: " + Disposition(name) +
                             "\r\nContent-Length: " + std::to_string(size_bytes) + "\r\n\r\n";
    std::fwrite(head.data(), 1, head.size(), stdout);
    std::fflush(stdout);
}

}  // namespace lookhaven::api
