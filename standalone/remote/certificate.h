// SPDX-License-Identifier: Apache-2.0
//
// Reads a web server's certificate.
#pragma once

#include <cstdint>
#include <stdexcept>
#include <string>
#include <vector>

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

// Facts about the first certificate.
struct CertificateFacts {
    std::string subject;      // "CN=nvr", as RFC 4514 writes it
    std::string fingerprint;  // SHA-256 of its DER form, as browsers show it: "AB:0C:…"
    std::int64_t end_s = 0;   // UTC seconds when it expires
    bool is_self_signed = false;
    // The hosts that it is valid for, DNS names before addresses; those alone that are printable ASCII.
    std::vector<std::string> names = {};
};

// Throws InvalidCertificate when there is none, or one without an end.
CertificateFacts ReadCertificate(const std::string& pem);

}  // namespace lookhaven::remote
