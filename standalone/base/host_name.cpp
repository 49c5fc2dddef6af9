// SPDX-License-Identifier: Apache-2.0
#include "standalone/base/host_name.h"

#include <array>
#include <charconv>

#include <arpa/inet.h>
#include <unistd.h>

namespace lookhaven::base {

namespace {

constexpr std::size_t kMaxHostBytes = 253;
constexpr std::size_t kMaxLabelBytes = 63;
constexpr std::string_view kDigits = "0123456789";
constexpr std::string_view kLabel = "abcdefghijklmnopqrstuvwxyzABCDEFGHIJKLMNOPQRSTUVWXYZ0123456789-_";

bool IsIpAddress(int family, std::string_view text) {
    unsigned char address[sizeof(in6_addr)];
    return ::inet_pton(family, std::string(text).c_str(), address) == 1;
}

bool IsLabel(std::string_view text) {
    return !text.empty() && text.size() <= kMaxLabelBytes && text.find_first_not_of(kLabel) == text.npos &&
           text.front() != '-' && text.back() != '-';
}

bool IsPort(std::string_view text) {
    unsigned port = 0;
    const char* end = text.data() + text.size();
    return std::from_chars(text.data(), end, port).ptr == end && port >= 1 && port <= 65'535;
}

}  // namespace

bool IsHost(std::string_view text) {
    if (text.find(':') != text.npos) {
        return IsIpAddress(AF_INET6, text);
    }
    if (text.size() > kMaxHostBytes) {
        return false;
    }
    std::string_view last;
    for (std::string_view rest = text;;) {
        const std::size_t dot = rest.find('.');
        last = rest.substr(0, dot);
        if (!IsLabel(last)) {
            return false;
        }
        if (dot == rest.npos) {
            break;
        }
        rest.remove_prefix(dot + 1);
    }
    // The last label of a host name is never all digits.
    return last.find_first_not_of(kDigits) != last.npos || IsIpAddress(AF_INET, text);
}

bool IsHostAndPort(std::string_view text) {
    if (text.starts_with('[')) {
        const std::size_t end = text.find(']');
        return end != text.npos && IsIpAddress(AF_INET6, text.substr(1, end - 1)) &&
               (end + 1 == text.size() || (text[end + 1] == ':' && IsPort(text.substr(end + 2))));
    }
    const std::size_t colon = text.find(':');
    return IsHost(text.substr(0, colon)) && (colon == text.npos || IsPort(text.substr(colon + 1)));
}

std::string OwnHostName() {
    std::array<char, 256> name{};
    ::gethostname(name.data(), name.size() - 1);
    return name.data();
}

}  // namespace lookhaven::base
