// SPDX-License-Identifier: Apache-2.0
#include "standalone/media/source_url.h"

#include <cctype>

#include "standalone/base/text.h"

namespace lookhaven::media {

namespace {

constexpr std::size_t kMaxUserInfoChars = 127;  // libav's RTSP client keeps 128 bytes

constexpr std::string_view kUnescaped = "-._~!*";

}  // namespace

std::string WithCredentials(const std::string& url, const Credentials& credentials) {
    const std::size_t host = url.find("://");
    if (host == url.npos || (credentials.user.empty() && credentials.password.empty())) {
        return url;
    }
    const std::string user_info =
        base::PercentEncode(credentials.user, kUnescaped) + ':' + base::PercentEncode(credentials.password, kUnescaped);
    if (user_info.size() > kMaxUserInfoChars) {
        throw SourceError("the camera's user name and password are too long together");
    }
    return url.substr(0, host + 3) + user_info + '@' + url.substr(host + 3);
}

std::string RedactSecrets(std::string_view text) {
    std::string redacted;
    for (;;) {
        const std::size_t mark = text.find("://");
        if (mark == text.npos) {
            return redacted.append(text);
        }
        redacted.append(text.substr(0, mark + 3));
        text.remove_prefix(mark + 3);
        const std::string_view url = text.substr(0, text.find_first_of(" \t\r\n'\""));
        text.remove_prefix(url.size());
        // The last '@' counts: an unencoded password may hold others, and slashes too.
        const std::size_t at = url.rfind('@');
        const std::size_t host = at == url.npos ? 0 : at + 1;
        const std::size_t query = std::min(url.find('?', host), url.size());
        redacted += at == url.npos ? "" : "…@";
        redacted += url.substr(host, query - host);
        redacted += query < url.size() ? "?…" : "";
    }
}

}  // namespace lookhaven::media
