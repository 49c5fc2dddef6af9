// SPDX-License-Identifier: Apache-2.0
//
// What is known of certificates for programs that must stay small: what reads them is loaded when it is first needed.
#pragma once

#include "standalone/remote/certificate.h"
#include "standalone/remote/certificate_pair.h"

namespace lookhaven::remote {

// As ReadCertificate, ReadCertificatePair and IsTrustedThrough; each throws std::runtime_error, too,
// when the library cannot be loaded.
CertificateFacts LoadAndReadCertificate(const std::string& pem);
CertificatePair LoadAndReadCertificatePair(const std::string& chain_pem, const std::string& key_pem,
                                           std::int64_t now_s);
bool LoadAndFindTrust(const std::string& known_pem, const std::string& chain_pem);

}  // namespace lookhaven::remote
