// SPDX-License-Identifier: Apache-2.0
//
// A certificate with its chain and its private key, as an owner hands them over, judged before a web server gets them.
#pragma once

#include <cstdint>
#include <string>

#include "standalone/remote/certificate.h"

namespace lookhaven::remote {

constexpr std::size_t kMaxChainBytes = 32'768;
constexpr std::size_t kMaxKeyBytes = 8'192;

struct CertificatePair {
    std::string certificates;  // PEM, the server's own first; nothing else of what was given is in it
    std::string key;           // PEM, without a password
    CertificateFacts facts;    // of the first
};

// chain_pem: the server's certificate, then each one's issuer, as far as they are given. now_s: UTC seconds. Throws
// InvalidCertificate, whose sentence says what is wrong and quotes nothing of either text, for more bytes than above;
// damaged or missing certificates; more than eight; one not valid now, or that does not follow from the next; one for
// no host, or not for a server; a key that is damaged, encrypted, of another certificate, or one that not all browsers
// know: those are RSA with 2,048 to 8,192 bits, and the elliptic curves P-256 and P-384.
CertificatePair ReadCertificatePair(const std::string& chain_pem, const std::string& key_pem, std::int64_t now_s);

// Whether who was given the certificates known_pem, and trusts them alone, takes a server that shows chain_pem for the
// same host: when one of them is still shown, or has issued what is. False where either cannot be read.
bool IsTrustedThrough(const std::string& known_pem, const std::string& chain_pem);

}  // namespace lookhaven::remote
