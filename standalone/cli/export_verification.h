// SPDX-License-Identifier: Apache-2.0
//
// Compares an exported ZIP file with the hashes that it carries, and these with their signature.
#pragma once

#include <string>
#include <vector>

namespace lookhaven::cli {

struct ExportVerification {
    int files = 0;                    // that are as the manifest says
    std::vector<std::string> faults;  // a sentence each
    // The fingerprint of the key that signed the manifest: 64 hexadecimal digits. Empty without a valid signature.
    std::string fingerprint;
};

// Throws Failure when there is no file, or one that is no export at all or cut.
ExportVerification VerifyExport(const std::string& file);

}  // namespace lookhaven::cli
