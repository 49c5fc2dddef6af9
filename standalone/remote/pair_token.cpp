// SPDX-License-Identifier: Apache-2.0
#include "standalone/remote/pair_token.h"

#include <array>
#include <charconv>
#include <cstdlib>
#include <stdexcept>

#include <sodium.h>

#include "standalone/base/text.h"

namespace lookhaven::remote {

namespace {

constexpr std::string_view kLabel = "lookhaven pair 1\n";
constexpr std::size_t kSecretDigits = 2 * crypto_auth_hmacsha256_KEYBYTES;
constexpr std::size_t kTokenDigits = 2 * crypto_auth_hmacsha256_BYTES;
constexpr std::size_t kMaxTimestampDigits = 12;

// False for a text that is not plain decimal: two texts of one number would make two tokens.
bool IsWithinWindow(std::string_view timestamp, std::int64_t now_s) {
    std::int64_t seconds = 0;
    const char* end = timestamp.data() + timestamp.size();
    return !timestamp.empty() && timestamp.size() <= kMaxTimestampDigits &&
           timestamp.find_first_not_of("0123456789") == std::string_view::npos &&
           std::from_chars(timestamp.data(), end, seconds).ptr == end &&
           std::llabs(seconds - now_s) <= kPairTokenWindowSeconds;
}

}  // namespace

std::string MakePairToken(std::string_view secret, std::string_view timestamp) {
    if (!base::IsHex(secret, kSecretDigits)) {
        throw std::invalid_argument("the secret of two hosts is 64 hexadecimal digits");
    }
    std::array<unsigned char, crypto_auth_hmacsha256_KEYBYTES> key{};
    sodium_hex2bin(key.data(), key.size(), secret.data(), secret.size(), nullptr, nullptr, nullptr);
    const std::string message = std::string(kLabel).append(timestamp);
    std::array<unsigned char, crypto_auth_hmacsha256_BYTES> code{};
    crypto_auth_hmacsha256(code.data(), reinterpret_cast<const unsigned char*>(message.data()), message.size(),
                           key.data());
    return base::ToHex(code);
}

bool PairTokenMatches(std::string_view token, std::string_view timestamp, std::string_view secret, std::int64_t now_s) {
    if (token.size() != kTokenDigits || !base::IsHex(secret, kSecretDigits) || !IsWithinWindow(timestamp, now_s)) {
        return false;
    }
    return sodium_memcmp(MakePairToken(secret, timestamp).data(), token.data(), kTokenDigits) == 0;
}

}  // namespace lookhaven::remote
