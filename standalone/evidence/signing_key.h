// SPDX-License-Identifier: Apache-2.0
//
// The key by which a host signs what is exported, and nothing else.
//
// Why so        The web server's key changes with its certificate, and every part that uses TLS holds it in memory.
// Invariants    (1) A key that is there is never replaced. (2) Nobody but the owner may read its file. (3) It is in
//               memory only while SignBy runs. An export calls it after all footage has been read, so that a fault in
//               the code that reads footage cannot copy the key into an export.
#pragma once

#include <filesystem>
#include <string_view>

#include "standalone/evidence/signature_library.h"

namespace lookhaven::evidence {

// Makes the key where there is none; several processes may do so at once. Throws std::system_error when it cannot be
// made or read, std::runtime_error.
void RequireSigningKey(const std::filesystem::path& key_file);

// Throws as SignatureLibrary::Sign.
Signature SignBy(const std::filesystem::path& key_file, std::string_view text);

}  // namespace lookhaven::evidence
