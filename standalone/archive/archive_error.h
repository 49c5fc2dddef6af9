// SPDX-License-Identifier: Apache-2.0
//
// Why a file of the archive cannot be used.
#pragma once

#include <stdexcept>

namespace lookhaven::archive {

// The file is damaged, empty or none of ours; what() is one sentence. A file that cannot be opened or read at all is a
// std::system_error instead.
class ArchiveError : public std::runtime_error {
  public:
    using std::runtime_error::runtime_error;
};

}  // namespace lookhaven::archive
