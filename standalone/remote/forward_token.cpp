// SPDX-License-Identifier: Apache-2.0
#include "standalone/remote/forward_token.h"

#include <charconv>

#include "standalone/remote/token_code.h"

namespace lookhaven::remote {

namespace {

constexpr std::string_view kForwardLabel = "lookhaven forward 1\n";
constexpr std::string_view kHostLabel = "lookhaven host 1\n";
constexpr std::size_t kMaxTokenBytes = 200;
constexpr std::int64_t kMaxSeconds = 999'999'999'999;

std::string CodeOf(std::string_view label, std::string_view key, int to_host, std::string_view said) {
    return TokenCode(key, std::string(label).append(std::to_string(to_host)).append(1, '\n').append(said));
}

bool IsWithinWindow(std::string_view timestamp, std::int64_t now_s) {
    std::int64_t seconds = 0;
    const char* const end = timestamp.data() + timestamp.size();
    const auto [rest, error] = std::from_chars(timestamp.data(), end, seconds);
    return error == std::errc() && rest == end && seconds >= 0 && seconds <= kMaxSeconds &&
           seconds >= now_s - kForwardTokenWindowSeconds && seconds <= now_s + kForwardTokenWindowSeconds;
}

std::string Make(std::string_view label, std::string_view key, int to_host, std::string_view client,
                 std::int64_t now_s) {
    std::string said = std::to_string(now_s).append(1, ' ').append(client).append(1, ' ');
    return said.append(CodeOf(label, key, to_host, said));
}

std::optional<std::string> ClientIn(std::string_view label, std::string_view token, std::string_view key, int own_host,
                                    std::int64_t now_s) {
    if (token.size() > kMaxTokenBytes || token.size() <= kTokenCodeDigits || !IsTokenKey(key)) {
        return std::nullopt;
    }
    const std::string_view said = token.substr(0, token.size() - kTokenCodeDigits);
    if (!IsTokenCode(CodeOf(label, key, own_host, said), token.substr(said.size()))) {
        return std::nullopt;
    }
    const std::size_t space = said.find(' ');
    if (space == said.npos || space + 2 > said.size()) {
        return std::nullopt;  // by a version that writes something else
    }
    const std::string_view client = said.substr(space + 1, said.size() - space - 2);
    return IsWithinWindow(said.substr(0, space), now_s) ? std::optional(std::string(client)) : std::nullopt;
}

}  // namespace

std::string MakeForwardToken(std::string_view key, int to_host, std::string_view client, std::int64_t now_s) {
    return Make(kForwardLabel, key, to_host, client, now_s);
}

std::string ForwardTokenLine(std::string_view key, int to_host, std::string_view client, std::int64_t now_s) {
    return std::string(kForwardHeader) + ": " + MakeForwardToken(key, to_host, client, now_s);
}

std::optional<std::string> ClientInForwardToken(std::string_view token, std::string_view key, int own_host,
                                                std::int64_t now_s) {
    return ClientIn(kForwardLabel, token, key, own_host, now_s);
}

std::string HostTokenLine(std::string_view key, int to_host, int from_host, std::int64_t now_s) {
    return std::string(kHostHeader) + ": " + Make(kHostLabel, key, to_host, std::to_string(from_host), now_s);
}

std::optional<int> HostInToken(std::string_view token, std::string_view key, int own_host, std::int64_t now_s) {
    const std::optional<std::string> said = ClientIn(kHostLabel, token, key, own_host, now_s);
    int host = 0;
    const bool is_number = said && std::from_chars(said->data(), said->data() + said->size(), host).ec == std::errc();
    return is_number && host > 0 ? std::optional(host) : std::nullopt;
}

}  // namespace lookhaven::remote
