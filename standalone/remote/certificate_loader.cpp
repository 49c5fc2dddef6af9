// SPDX-License-Identifier: Apache-2.0
#include "standalone/remote/certificate_loader.h"

#include "standalone/remote/library.h"

namespace lookhaven::remote {

CertificateFacts LoadAndReadCertificate(const std::string& pem) {
    CertificateFacts facts;
    reinterpret_cast<void (*)(const std::string&, CertificateFacts&)>(FindInLibrary("LookhavenReadCertificate"))(pem,
                                                                                                                 facts);
    return facts;
}

}  // namespace lookhaven::remote
