// SPDX-License-Identifier: Apache-2.0
//
// ReadCertificate for programs that must stay small: what reads it is loaded when it is first needed.
#pragma once

#include "standalone/remote/certificate.h"

namespace lookhaven::remote {

// As ReadCertificate; throws std::runtime_error, too, when the library cannot be loaded.
CertificateFacts LoadAndReadCertificate(const std::string& pem);

}  // namespace lookhaven::remote
