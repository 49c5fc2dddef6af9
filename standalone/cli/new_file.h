// SPDX-License-Identifier: Apache-2.0
//
// Files that a command makes for the operator: exports and backups.
#pragma once

#include <cstdint>
#include <functional>
#include <string>

namespace lookhaven::cli {

// Makes a file that only its owner may read, and has the function write it to the borrowed descriptor; returns its size
// in bytes once it is on the disk. Until then it has another name in the same folder, which goes when the function
// throws, when the file cannot be written (std::system_error), and when the process is ended, be it by SIGKILL. The
// file belongs to the user who runs the command: the function may change to the installation's owner, who may not be
// allowed to write there, so the function is where the store is opened. Throws Failure where there is a file already.
// Call it before the process has a second thread.
std::int64_t WriteNewFile(const std::string& file, const std::function<void(int descriptor)>& write);

}  // namespace lookhaven::cli
