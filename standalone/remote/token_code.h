// SPDX-License-Identifier: Apache-2.0
//
// What tokens between hosts are made of: the HMAC-SHA256 of a message, by a key that both hosts have.
#pragma once

#include <string>
#include <string_view>

namespace lookhaven::remote {

constexpr std::size_t kTokenCodeDigits = 64;

// A key is written as 64 hexadecimal digits.
bool IsTokenKey(std::string_view key);

// Hexadecimal digits. Throws std::invalid_argument unless IsTokenKey. Each kind of token begins its messages with words
// of its own, so that none passes for another.
std::string TokenCode(std::string_view key, std::string_view message);

// In constant time.
bool IsTokenCode(std::string_view expected, std::string_view code);

}  // namespace lookhaven::remote
