// SPDX-License-Identifier: Apache-2.0
#include "standalone/remote/token_code.h"

#include <array>
#include <stdexcept>

#include <sodium.h>

#include "standalone/base/text.h"

namespace lookhaven::remote {

static_assert(kTokenCodeDigits == 2 * crypto_auth_hmacsha256_BYTES);

bool IsTokenKey(std::string_view key) {
    return base::IsHex(key, 2 * crypto_auth_hmacsha256_KEYBYTES);
}

std::string TokenCode(std::string_view key, std::string_view message) {
    if (!IsTokenKey(key)) {
        throw std::invalid_argument("what two hosts both know is 64 hexadecimal digits");
    }
    std::array<unsigned char, crypto_auth_hmacsha256_KEYBYTES> bytes{};
    sodium_hex2bin(bytes.data(), bytes.size(), key.data(), key.size(), nullptr, nullptr, nullptr);
    std::array<unsigned char, crypto_auth_hmacsha256_BYTES> code{};
    crypto_auth_hmacsha256(code.data(), reinterpret_cast<const unsigned char*>(message.data()), message.size(),
                           bytes.data());
    return base::ToHex(code);
}

bool IsTokenCode(std::string_view expected, std::string_view code) {
    return expected.size() == code.size() && sodium_memcmp(expected.data(), code.data(), code.size()) == 0;
}

}  // namespace lookhaven::remote
