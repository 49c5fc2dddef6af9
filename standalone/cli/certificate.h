// SPDX-License-Identifier: Apache-2.0
//
// What a web server's certificate says of itself.
#pragma once

#include <string>

namespace lookhaven::cli {

// The certificates of a PEM file, its own first, in their normal form and without anything else. Throws Failure kDataError
// for what holds none.
std::string CertificatesIn(const std::string& pem);

// A name that the certificate is for: its first DNS name, else its common name. Throws Failure kDataError when it has none
// that a host can have.
std::string CertificateName(const std::string& pem);

}  // namespace lookhaven::cli
