// SPDX-License-Identifier: Apache-2.0
//
// The key by which a host signs what is exported, and nothing else.
//
// Why so        The key of the web server's certificate is replaced with it, and is at hand wherever TLS is spoken.
// Invariants    (1) A key that is there is never replaced. (2) Nobody but the owner may read its file. (3) It is in
//               memory only while SignBy runs: whoever exports calls it once the footage has been read, so that a fault
//               in what reads footage cannot copy the key into an export.
#pragma once

#include <filesystem>
#include <string_view>

#include "standalone/evidence/signature_library.h"

namespace lookhaven::evidence {

// Makes the key where there is none, whoever else does the same at that time. Throws std::system_error when it cannot
// be made or read, std::runtime_error.
void RequireSigningKey(const std::filesystem::path& key_file);

// Throws as SignatureLibrary::Sign.
Signature SignBy(const std::filesystem::path& key_file, std::string_view text);

}  // namespace lookhaven::evidence
