// SPDX-License-Identifier: Apache-2.0
#include "standalone/remote/certificate_loader.h"

#include "standalone/remote/certificate_library.h"
#include "standalone/remote/library.h"

namespace lookhaven::remote {

namespace {

template <typename Function>
Function* Find(const char* name) {
    return reinterpret_cast<Function*>(FindInLibrary(name));
}

}  // namespace

CertificateFacts LoadAndReadCertificate(const std::string& pem) {
    CertificateFacts facts;
    Find<decltype(LookhavenReadCertificate)>("LookhavenReadCertificate")(pem, facts);
    return facts;
}

CertificatePair LoadAndReadCertificatePair(const std::string& chain_pem, const std::string& key_pem,
                                           std::int64_t now_s) {
    CertificatePair pair;
    Find<decltype(LookhavenReadCertificatePair)>("LookhavenReadCertificatePair")(chain_pem, key_pem, now_s, pair);
    return pair;
}

bool LoadAndFindTrust(const std::string& known_pem, const std::string& chain_pem) {
    return Find<decltype(LookhavenFindTrust)>("LookhavenFindTrust")(known_pem, chain_pem);
}

}  // namespace lookhaven::remote
