// SPDX-License-Identifier: Apache-2.0
//
// How a host proves to one that it is paired with that it knows their secret, without sending it.
//
// Format        A token is the HMAC-SHA-256 of a fixed label and the timestamp's text, under the secret of both hosts,
//               in 64 hex digits. The timestamp is UTC seconds in decimal, and goes beside the token.
#pragma once

#include <cstdint>
#include <string>
#include <string_view>

namespace lookhaven::remote {

// How far the two hosts' clocks, and a token's age, may be apart.
constexpr std::int64_t kPairTokenWindowSeconds = 300;

// secret: 64 hex digits, else std::invalid_argument is thrown.
std::string MakePairToken(std::string_view secret, std::string_view timestamp);

// Whether the token was made with the secret for the timestamp, and the timestamp is within the window around now.
// False for anything malformed, an empty secret too. Takes the same time whatever byte of the token is wrong.
bool PairTokenMatches(std::string_view token, std::string_view timestamp, std::string_view secret, std::int64_t now_s);

}  // namespace lookhaven::remote
