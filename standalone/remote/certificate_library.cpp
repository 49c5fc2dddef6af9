// SPDX-License-Identifier: Apache-2.0
//
// A part of the shared library liblookhaven-remote.so: what it knows of certificates.
#include "standalone/remote/certificate_library.h"

using namespace lookhaven;

void LookhavenReadCertificate(const std::string& pem, remote::CertificateFacts& facts) {
    facts = remote::ReadCertificate(pem);
}

void LookhavenReadCertificatePair(const std::string& chain_pem, const std::string& key_pem, std::int64_t now_s,
                                  remote::CertificatePair& pair) {
    pair = remote::ReadCertificatePair(chain_pem, key_pem, now_s);
}

bool LookhavenFindTrust(const std::string& known_pem, const std::string& chain_pem) {
    return remote::IsTrustedThrough(known_pem, chain_pem);
}
