// SPDX-License-Identifier: Apache-2.0
#include "standalone/store/text.h"

#include <algorithm>
#include <cstdint>

#include <sodium.h>
#include <strings.h>

namespace lookhaven::store {

namespace {

constexpr std::string_view kReservedName = "Lookhaven";
constexpr std::size_t kMaxNameBytes = 64;
constexpr std::size_t kMaxSourceBytes = 2048;

bool IsAsciiLetterOrDigit(char c) {
    return (c >= 'a' && c <= 'z') || (c >= 'A' && c <= 'Z') || (c >= '0' && c <= '9');
}

// Takes one character off the front; a negative value for bytes that are none. Refuses overlong forms and surrogates.
std::int32_t NextCharacter(std::string_view& text) {
    const auto lead = static_cast<unsigned char>(text.front());
    const int length = lead < 0x80 ? 1 : (lead >> 5) == 6 ? 2 : (lead >> 4) == 14 ? 3 : (lead >> 3) == 30 ? 4 : 0;
    if (length == 0 || text.size() < static_cast<std::size_t>(length)) {
        return -1;
    }
    std::int32_t value = length == 1 ? lead : lead & (0x7f >> length);
    for (int i = 1; i < length; ++i) {
        const auto byte = static_cast<unsigned char>(text[static_cast<std::size_t>(i)]);
        if ((byte >> 6) != 2) {
            return -1;
        }
        value = (value << 6) | (byte & 0x3f);
    }
    text.remove_prefix(static_cast<std::size_t>(length));
    constexpr std::int32_t kLeast[] = {0, 0, 0x80, 0x800, 0x10000};
    const bool surrogate = value >= 0xd800 && value <= 0xdfff;
    return value < kLeast[length] || value > 0x10ffff || surrogate ? -1 : value;
}

}  // namespace

bool IsPlainText(std::string_view text, std::size_t max_bytes) {
    if (text.size() > max_bytes) {
        return false;
    }
    while (!text.empty()) {
        const std::int32_t c = NextCharacter(text);
        if (c < 0x20 || (c >= 0x7f && c < 0xa0)) {
            return false;
        }
    }
    return true;
}

bool IsReservedName(std::string_view name) {
    return name.size() == kReservedName.size() &&
           ::strncasecmp(name.data(), kReservedName.data(), kReservedName.size()) == 0;
}

bool IsAccountName(std::string_view name) {
    return !name.empty() && name.size() <= kMaxNameBytes && IsAsciiLetterOrDigit(name.front()) &&
           std::all_of(
               name.begin(), name.end(),
               [](char c) { return IsAsciiLetterOrDigit(c) || c == '.' || c == '_' || c == '-' || c == '@'; }) &&
           !IsReservedName(name);
}

bool IsSource(std::string_view source) {
    const std::size_t colon = source.find_first_not_of("abcdefghijklmnopqrstuvwxyz0123456789+-.");
    if (!IsPlainText(source, kMaxSourceBytes) || colon == 0 || colon == source.npos || source[colon] != ':') {
        return false;
    }
    const std::string_view rest = source.substr(colon + 1);
    if (!rest.starts_with("//")) {
        return !rest.empty();
    }
    const std::string_view host = rest.substr(2, rest.find_first_of("/?#", 2) - 2);
    // Without a host it is a file's path, which may hold spaces.
    return rest.size() > 2 && host.find('@') == host.npos &&
           (host.empty() || source.find_first_of(" \\") == source.npos);
}

bool IsHex(std::string_view text, std::size_t digits) {
    return text.size() == digits && std::all_of(text.begin(), text.end(), [](char c) {
               return (c >= '0' && c <= '9') || (c >= 'a' && c <= 'f');
           });
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

}  // namespace lookhaven::store
