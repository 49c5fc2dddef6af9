// SPDX-License-Identifier: Apache-2.0
#include "standalone/remote/pairing_code.h"

#include <cstdint>

#include "standalone/base/text.h"

namespace lookhaven::remote {

namespace {

constexpr std::string_view kBase32Digits = "0123456789ABCDEFGHJKMNPQRSTVWXYZ";
constexpr std::size_t kDigits = 32;
constexpr std::size_t kGroupDigits = 4;
constexpr std::size_t kPrefixDigits = 20;
constexpr std::size_t kSecretDigits = 2 * kPairingSecretBytes;

// The same bits by the digits of another alphabet.
std::string Recode(std::string_view text, std::string_view from, int from_bits, std::string_view to, int to_bits) {
    std::string recoded;
    unsigned bits = 0;
    int count = 0;
    for (const char digit : text) {
        bits = bits << from_bits | static_cast<unsigned>(from.find(digit));
        for (count += from_bits; count >= to_bits; count -= to_bits) {
            recoded += to[bits >> (count - to_bits) & (to.size() - 1)];
        }
    }
    return recoded;
}

// CRC-16 with the polynomial 0x1021, begun with ones. Zero of hexadecimal digits that their own CRC follows.
std::uint16_t Crc(std::string_view hex) {
    unsigned crc = 0xFFFF;
    for (const char digit : hex) {
        crc ^= static_cast<unsigned>(base::kHexDigits.find(digit)) << 12;
        for (int bit = 0; bit < 4; ++bit) {
            crc = (crc << 1 ^ ((crc & 0x8000) != 0 ? 0x1021U : 0U)) & 0xFFFF;
        }
    }
    return static_cast<std::uint16_t>(crc);
}

std::string CrcDigits(std::string_view hex) {
    const std::uint16_t crc = Crc(hex);
    const unsigned char bytes[] = {static_cast<unsigned char>(crc >> 8), static_cast<unsigned char>(crc & 0xFF)};
    return base::ToHex(bytes);
}

// As the alphabet has it.
char DigitOf(char typed) {
    const char digit = typed >= 'a' && typed <= 'z' ? static_cast<char>(typed - 'a' + 'A') : typed;
    return digit == 'O' ? '0' : digit == 'I' || digit == 'L' ? '1' : digit;
}

}  // namespace

std::string FingerprintPrefix(const CertificateFacts& certificate) {
    std::string prefix;
    for (const char digit : certificate.fingerprint) {
        if (digit != ':' && prefix.size() < kPrefixDigits) {
            prefix += digit >= 'A' && digit <= 'F' ? static_cast<char>(digit - 'A' + 'a') : digit;
        }
    }
    return prefix;
}

std::string ToText(const PairingCode& code) {
    const std::string content = code.fingerprint_prefix + code.secret;
    std::string text = Recode(content + CrcDigits(content), base::kHexDigits, 4, kBase32Digits, 5);
    for (std::size_t at = kDigits - kGroupDigits; at > 0; at -= kGroupDigits) {
        text.insert(at, 1, '-');
    }
    return text;
}

PairingCode ParsePairingCode(std::string_view text) {
    std::string digits;
    for (const char typed : text) {
        if (typed == '-' || typed == ' ' || typed == '\t' || typed == '\r' || typed == '\n') {
            continue;
        }
        const char digit = DigitOf(typed);
        if (kBase32Digits.find(digit) == kBase32Digits.npos) {
            throw InvalidPairingCode("the pairing code has a typing error: it has digits and letters only, and no U");
        }
        digits += digit;
    }
    if (digits.size() != kDigits) {
        throw InvalidPairingCode("the pairing code is not complete: it has eight groups of four digits and letters");
    }
    const std::string hex = Recode(digits, kBase32Digits, 5, base::kHexDigits, 4);
    if (Crc(hex) != 0) {
        throw InvalidPairingCode("the pairing code has a typing error: compare it with the one that is shown");
    }
    return {hex.substr(0, kPrefixDigits), hex.substr(kPrefixDigits, kSecretDigits)};
}

}  // namespace lookhaven::remote
