// SPDX-License-Identifier: Apache-2.0
//
// What the shared library gives to certificate_loader.cpp, which alone calls it.
#include "standalone/remote/certificate.h"

extern "C" __attribute__((visibility("default"))) void
LookhavenReadCertificate(const std::string& pem, lookhaven::remote::CertificateFacts& facts);

void LookhavenReadCertificate(const std::string& pem, lookhaven::remote::CertificateFacts& facts) {
    facts = lookhaven::remote::ReadCertificate(pem);
}
