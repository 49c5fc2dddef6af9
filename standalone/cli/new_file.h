// SPDX-License-Identifier: Apache-2.0
//
// Files that a command makes for the operator: exports and backups.
#pragma once

#include <cstdint>
#include <functional>
#include <string>

namespace lookhaven::cli {

// Makes a file that only its owner may read, and has the function write it to the borrowed descriptor; returns its size
// in bytes once it is on the disk. Made at once, as whoever runs the command: the function may change to the
// installation's owner, who may not write there, so opening the store belongs in it. When the function throws, or the
// file cannot be written (std::system_error), it leaves none behind, or, where removing it is not allowed any more, an
// empty one. Throws Failure where there is a file already, even an empty one: another command may be about to fill
// it.
std::int64_t WriteNewFile(const std::string& file, const std::function<void(int descriptor)>& write);

}  // namespace lookhaven::cli
