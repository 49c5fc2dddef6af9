// SPDX-License-Identifier: Apache-2.0
//
// Files that a command makes for the operator: exports and backups.
#pragma once

#include <functional>
#include <string>

namespace lookhaven::cli {

// Makes a file that only its owner may read, and has the function write it to the borrowed descriptor; returns once it
// is on the disk. Made at once, as whoever runs the command: the function may change to the installation's owner, who
// may not write there. Leaves none behind when this throws: what the function throws, std::system_error, or Failure
// where there is such a file already.
void WriteNewFile(const std::string& file, const std::function<void(int descriptor)>& write);

}  // namespace lookhaven::cli
