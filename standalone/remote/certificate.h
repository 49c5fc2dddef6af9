// SPDX-License-Identifier: Apache-2.0
//
// Reads a web server's certificate.
#pragma once

#include <cstdint>
#include <stdexcept>
#include <string>

namespace lookhaven::remote {

// The text holds no certificate that this host could use.
struct InvalidCertificate : std::runtime_error {
    using std::runtime_error::runtime_error;
};

// The certificates of a PEM file in their order, re-encoded and without anything else, such as a key. Throws
// InvalidCertificate when there is none.
std::string CertificatesIn(const std::string& pem);

// A host name that the certificate is valid for: its first DNS name, else its common name. Throws
// InvalidCertificate when that is no valid host name.
std::string CertificateName(const std::string& pem);

// UTC seconds when the first certificate expires. Throws InvalidCertificate when there is none.
std::int64_t CertificateEnd(const std::string& pem);

}  // namespace lookhaven::remote
