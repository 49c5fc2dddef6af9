// SPDX-License-Identifier: Apache-2.0
#include "standalone/base/text.h"

#include <algorithm>
#include <charconv>
#include <cstddef>

#include <sodium.h>

namespace lookhaven::base {

namespace {

bool IsLetterOrDigit(char c) {
    return (c >= 'a' && c <= 'z') || (c >= 'A' && c <= 'Z') || (c >= '0' && c <= '9');
}

// The byte that an escape's two digits stand for.
std::optional<char> FromHexPair(std::string_view digits) {
    unsigned int byte = 0;
    const char* end = digits.data() + digits.size();
    const bool is_pair = digits.size() == 2 && std::from_chars(digits.data(), end, byte, 16).ptr == end;
    return is_pair ? std::optional(static_cast<char>(byte)) : std::nullopt;
}

}  // namespace

std::optional<char32_t> TakeCharacter(std::string_view& text) {
    const auto lead = static_cast<unsigned char>(text.front());
    const std::size_t length = lead < 0x80         ? 1
                               : (lead >> 5) == 6  ? 2
                               : (lead >> 4) == 14 ? 3
                               : (lead >> 3) == 30 ? 4
                                                   : 0;
    if (length == 0 || text.size() < length) {
        return std::nullopt;
    }
    char32_t value = length == 1 ? lead : lead & (0x7fU >> length);
    for (std::size_t i = 1; i < length; ++i) {
        const auto byte = static_cast<unsigned char>(text[i]);
        if ((byte >> 6) != 2) {
            return std::nullopt;
        }
        value = (value << 6) | (byte & 0x3fU);
    }
    text.remove_prefix(length);
    constexpr char32_t kMinValue[] = {0, 0, 0x80, 0x800, 0x10000};
    const bool is_surrogate = value >= 0xd800 && value <= 0xdfff;
    return value < kMinValue[length] || value > 0x10ffff || is_surrogate ? std::nullopt : std::optional(value);
}

std::string PercentEncode(std::string_view text, std::string_view unescaped) {
    constexpr char kDigits[] = "0123456789ABCDEF";
    std::string encoded;
    for (const char c : text) {
        const auto byte = static_cast<unsigned char>(c);
        if (IsLetterOrDigit(c) || unescaped.find(c) != unescaped.npos) {
            encoded += c;
        } else {
            encoded += {'%', kDigits[byte >> 4], kDigits[byte & 15]};
        }
    }
    return encoded;
}

std::optional<std::string> DecodeForm(std::string_view text, BrokenEscape broken_escape) {
    std::string decoded;
    decoded.reserve(text.size());
    for (std::size_t i = 0; i < text.size(); ++i) {
        if (text[i] != '%') {
            decoded += text[i] == '+' ? ' ' : text[i];
        } else if (const std::optional<char> byte = FromHexPair(text.substr(i + 1, 2))) {
            decoded += *byte;
            i += 2;
        } else if (broken_escape == BrokenEscape::kKeep) {
            decoded += '%';
        } else {
            return std::nullopt;
        }
    }
    return decoded;
}

std::string ToBase64(std::string_view bytes) {
    std::string text(sodium_base64_ENCODED_LEN(bytes.size(), sodium_base64_VARIANT_ORIGINAL), '\0');
    sodium_bin2base64(text.data(), text.size(), reinterpret_cast<const unsigned char*>(bytes.data()), bytes.size(),
                      sodium_base64_VARIANT_ORIGINAL);
    text.pop_back();
    return text;
}

std::optional<std::string> FromBase64(std::string_view text) {
    std::string bytes(text.size() / 4 * 3 + 3, '\0');
    std::size_t size = 0;
    if (sodium_base642bin(reinterpret_cast<unsigned char*>(bytes.data()), bytes.size(), text.data(), text.size(),
                          nullptr, &size, nullptr, sodium_base64_VARIANT_ORIGINAL) != 0) {
        return std::nullopt;
    }
    bytes.resize(size);
    return bytes;
}

std::string LowerAscii(std::string_view text) {
    std::string lower(text);
    std::ranges::transform(lower, lower.begin(),
                           [](char c) { return c >= 'A' && c <= 'Z' ? static_cast<char>(c - 'A' + 'a') : c; });
    return lower;
}

std::string ToHex(std::span<const unsigned char> bytes) {
    std::string text(2 * bytes.size() + 1, '\0');
    sodium_bin2hex(text.data(), text.size(), bytes.data(), bytes.size());
    text.pop_back();
    return text;
}

bool IsHex(std::string_view text, std::size_t digits) {
    return text.size() == digits && std::all_of(text.begin(), text.end(), [](char c) {
               return (c >= '0' && c <= '9') || (c >= 'a' && c <= 'f');
           });
}

}  // namespace lookhaven::base
