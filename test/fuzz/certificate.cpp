// SPDX-License-Identifier: Apache-2.0
//
// Reads certificates out of any text, and out of any bytes in PEM: what is taken over is only certificates, and the
// name fits into a URL.
#include "standalone/remote/certificate_pair.h"

#include "standalone/base/text.h"
#include "test/fuzz/fuzz.h"

using namespace lookhaven;

namespace {

std::string Pem(std::string_view der) {
    const std::string text = base::ToBase64(der);
    std::string pem = "-----BEGIN CERTIFICATE-----\n";
    for (std::size_t at = 0; at < text.size(); at += 64) {
        pem += text.substr(at, 64) + '\n';
    }
    return pem + "-----END CERTIFICATE-----\n";
}

}  // namespace

extern "C" int LLVMFuzzerTestOneInput(const std::uint8_t* data, std::size_t size) {
    const std::string_view text = fuzz::Text({data, size});
    for (const std::string& pem : {std::string(text), Pem(text)}) {
        try {
            const std::string certificates = remote::CertificatesIn(pem);
            fuzz::Require(remote::CertificatesIn(certificates) == certificates);
            const std::string name = remote::CertificateName(pem);
            fuzz::Require(remote::ReadCertificate(pem).fingerprint.size() == 95);
            fuzz::Require(!name.empty() && name.find_first_of(" \t\r\n\"';{}$\\#") == name.npos);
        } catch (const remote::InvalidCertificate&) {
        }
        remote::IsTrustedThrough(pem, pem);
        try {
            const std::int64_t now_s = 1'800'000'000;
            const remote::CertificatePair pair = remote::ReadCertificatePair(pem, pem, now_s);
            fuzz::Require(remote::ReadCertificatePair(pair.certificates, pair.key, now_s).key == pair.key);
        } catch (const remote::InvalidCertificate&) {
        }
    }
    return 0;
}
