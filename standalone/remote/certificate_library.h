// SPDX-License-Identifier: Apache-2.0
//
// What the shared library gives to certificate_loader.cpp, which alone calls it.
#pragma once

#include "standalone/remote/certificate_pair.h"

#define LOOKHAVEN_OF_THE_LIBRARY extern "C" __attribute__((visibility("default")))

LOOKHAVEN_OF_THE_LIBRARY void LookhavenReadCertificate(const std::string& pem,
                                                       lookhaven::remote::CertificateFacts& facts);
LOOKHAVEN_OF_THE_LIBRARY void LookhavenReadCertificatePair(const std::string& chain_pem, const std::string& key_pem,
                                                           std::int64_t now_s,
                                                           lookhaven::remote::CertificatePair& pair);
LOOKHAVEN_OF_THE_LIBRARY bool LookhavenFindTrust(const std::string& known_pem, const std::string& chain_pem);

#undef LOOKHAVEN_OF_THE_LIBRARY
