// SPDX-License-Identifier: Apache-2.0
//
// What proves to a host that a request comes from another host of the same store, and for which client.
//
// Format        "<UTC seconds> <address of the client> <64 hexadecimal digits>", the last of which are the HMAC-SHA256
//               of the host that it is meant for and of what stands before them, by the key that is in the store alone.
#pragma once

#include <cstdint>
#include <optional>
#include <string>
#include <string_view>

namespace lookhaven::remote {

// How far the clocks of two hosts may be apart.
constexpr std::int64_t kForwardTokenWindowSeconds = 300;

// key: 64 hexadecimal digits, else std::invalid_argument is thrown. client: without spaces.
std::string MakeForwardToken(std::string_view key, int to_host, std::string_view client, std::int64_t now_s);

// The header of a request that carries such a token, as a line and as SCGI names it.
constexpr std::string_view kForwardHeader = "X-Lookhaven-Forwarded";
constexpr const char* kForwardHeaderInScgi = "HTTP_X_LOOKHAVEN_FORWARDED";
std::string ForwardTokenLine(std::string_view key, int to_host, std::string_view client, std::int64_t now_s);

// The client's address; nothing for a token that was not made by the key for that host, or not within the window around
// now, and for anything malformed.
std::optional<std::string> ClientInForwardToken(std::string_view token, std::string_view key, int own_host,
                                                std::int64_t now_s);

// What proves that a host of the store asks in its own name, as a header: of the same format, with the host's id in
// place of the client, but neither kind passes for the other.
constexpr std::string_view kHostHeader = "X-Lookhaven-Host";
constexpr const char* kHostHeaderInScgi = "HTTP_X_LOOKHAVEN_HOST";
std::string HostTokenLine(std::string_view key, int to_host, int from_host, std::int64_t now_s);

// The id of the host that asks. Nothing as in ClientInForwardToken.
std::optional<int> HostInToken(std::string_view token, std::string_view key, int own_host, std::int64_t now_s);

}  // namespace lookhaven::remote
