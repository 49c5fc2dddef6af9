// SPDX-License-Identifier: Apache-2.0
#include "standalone/store/text.h"

#include <algorithm>
#include <optional>

#include <strings.h>

#include "standalone/base/text.h"

namespace lookhaven::store {

namespace {

constexpr std::string_view kReservedName = "Lookhaven";
constexpr std::size_t kMaxNameBytes = 64;
constexpr std::size_t kMaxSourceBytes = 2048;
constexpr std::size_t kMaxCertificateBytes = 32'768;

bool IsAsciiLetterOrDigit(char c) {
    return (c >= 'a' && c <= 'z') || (c >= 'A' && c <= 'Z') || (c >= '0' && c <= '9');
}

}  // namespace

bool IsPlainText(std::string_view text, std::size_t max_bytes) {
    if (text.size() > max_bytes) {
        return false;
    }
    while (!text.empty()) {
        const std::optional<char32_t> c = base::TakeCharacter(text);
        if (!c || *c < 0x20 || (*c >= 0x7f && *c < 0xa0)) {
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
        return !rest.empty() && rest.substr(0, rest.find_first_of("/?")).find('@') == rest.npos;
    }
    const std::string_view host = rest.substr(2, rest.find_first_of("/?#", 2) - 2);
    // Without a host it is a file's path, which may hold spaces.
    return rest.size() > 2 && host.find('@') == host.npos &&
           (host.empty() || source.find_first_of(" \\") == source.npos);
}

bool IsCertificate(std::string_view text) {
    return text.size() <= kMaxCertificateBytes && text.starts_with("-----BEGIN CERTIFICATE-----\n") &&
           text.ends_with("-----END CERTIFICATE-----\n");
}

}  // namespace lookhaven::store
