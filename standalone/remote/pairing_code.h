// SPDX-License-Identifier: Apache-2.0
//
// The code by which two hosts are paired: shown on the one that has the cameras, and typed on the one that is to show
// them.
//
// Why so        The user who types it knows only the other host's address, and must neither send the secret to a man
//               in the middle nor take cameras from one: so the code names the certificate, too.
// Format        160 bits in eight groups of four digits, base 32 without I, L, O and U: the first 80 bits of the
//               certificate's SHA-256, a secret of 64 bits, and a CRC-16 of both. The CRC finds every change within
//               three neighbouring digits: a wrong one, and two that were swapped.
#pragma once

#include <stdexcept>
#include <string>
#include <string_view>

#include "standalone/remote/certificate.h"

namespace lookhaven::remote {

struct PairingCode {
    std::string fingerprint_prefix;  // of the certificate; as FingerprintPrefix gives it
    std::string secret;              // kPairingSecretBytes, in hexadecimal digits

    friend bool operator==(const PairingCode&, const PairingCode&) = default;
};

constexpr std::size_t kPairingSecretBytes = 8;

// The text is no code; what it says is for the one who typed it.
struct InvalidPairingCode : std::runtime_error {
    using std::runtime_error::runtime_error;
};

// The first 80 bits of the certificate's SHA-256, in hexadecimal digits.
std::string FingerprintPrefix(const CertificateFacts& certificate);

// "7K3M-…", 39 characters.
std::string ToText(const PairingCode& code);

// Takes any bytes; lower case, spaces and missing dashes are no error, and o, i and l stand for the digits that look
// like them. Throws InvalidPairingCode.
PairingCode ParsePairingCode(std::string_view text);

}  // namespace lookhaven::remote
