// SPDX-License-Identifier: Apache-2.0
//
// Encodings of text and bytes: UTF-8, percent escapes, base64, hexadecimal digits; and ASCII letters in lower case.
#pragma once

#include <optional>
#include <span>
#include <string>
#include <string_view>

namespace lookhaven::base {

// Takes the first character off a text that is not empty. Nothing where it does not begin with UTF-8: shortest forms
// only, no surrogates, nothing above U+10FFFF. NUL is a character too.
std::optional<char32_t> TakeCharacter(std::string_view& text);

// ASCII letters, digits and the characters of unescaped stay; every other byte becomes an escape like "%2F".
std::string PercentEncode(std::string_view text, std::string_view unescaped);

enum class BrokenEscape { kRefuse, kKeep };

// Decodes application/x-www-form-urlencoded text: "%2F" is "/", "+" is a space. A broken escape ("%2", "%zz") stays as
// it is with kKeep, else there is no result. The result may hold any bytes.
std::optional<std::string> DecodeForm(std::string_view text, BrokenEscape broken_escape);

// Base64 with padding and without line breaks; FromBase64 takes nothing else.
std::string ToBase64(std::string_view bytes);
std::optional<std::string> FromBase64(std::string_view text);

// Whatever the locale; all other bytes stay.
std::string LowerAscii(std::string_view text);

constexpr std::string_view kHexDigits = "0123456789abcdef";

// Two digits each.
std::string ToHex(std::span<const unsigned char> bytes);

// Whether it is that many hexadecimal digits, in lower case.
bool IsHex(std::string_view text, std::size_t digits);

}  // namespace lookhaven::base
